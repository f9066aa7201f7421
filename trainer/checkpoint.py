# SPDX-License-Identifier: Apache-2.0
"""Checkpoints: files from which a training goes on (decision 0191).

A line of JSON, then the arrays that it lists one after another (little-endian, C order), then the SHA-256 of all that.
The reader knows which arrays there have to be, and believes no size.
"""

import hashlib
import json
import math
import os
import time
from contextlib import contextmanager, suppress
from pathlib import Path
from typing import Any, Callable, Iterator

import numpy as np

from .dataset import BLOCK_BYTES
from .errors import TrainerError
from .files import naming, sibling
from .state import State

FORMAT, VERSION = "neuralWarp checkpoint", 1
HEAD = b'{"format": "' + FORMAT.encode() + b'"'
HEAD_LIMIT = 64 << 20  # bytes of the line: the losses of a hundred thousand epochs take a tenth
DIGEST_BYTES = 32
REST = 50              # after writing for a second the next one waits for so many: they take 2 % of the time at most


class Checkpoints:
    """Those of one training, each in the place of the one before."""

    def __init__(self, path: Path, identity: dict[str, Any], every: float, say: Callable[[str], None],
                 resumed: bool) -> None:
        """identity: what has to be the same where a training goes on, by names that errors call it by;
        every: seconds from one to the next; say: takes a line for the user; resumed: whether the training goes on from
        the one that is there."""
        self.path, self.identity, self.every, self.say, self.resumed = path, identity, every, say, resumed
        self.last, self.cost = time.monotonic(), 0.0

    def is_due(self) -> bool:
        return time.monotonic() - self.last >= max(self.every, REST * self.cost)

    def save(self, state: State) -> None:
        """What goes wrong is said only: a training does not end because what it might go on from finds no room."""
        start = time.monotonic()
        try:
            write(self.path, {"identity": self.identity, "state": state.numbers()},
                  state.arrays(state.best is not None))
        except OSError as error:
            self.say(f"no checkpoint was written: {error.filename or self.path}: {error.strerror}")
            with suppress(OSError):
                sibling(self.path, ".part").unlink()
        self.last = time.monotonic()
        self.cost = self.last - start

    def restore(self, state: State) -> None:
        """Puts `state`, which is that of a beginning, to where the checkpoint was written. TrainerError says why that
        cannot be; `state` may then be of no use."""
        description = read_description(self.path)
        check_identity(description.get("identity"), self.identity, self.path)
        with damage(self.path):
            numbers = description["state"]
            arrays = read_arrays(self.path, description, state.arrays(numbers["hasBest"] is True))
            state.restore(numbers, arrays)
        self.say(f"going on from {self.path}, after {state.epoch} epochs")


def is_there(path: Path) -> bool:
    """Whether there is a checkpoint. Anything else in its place is refused."""
    if not path.exists():
        return False
    if path.is_file():
        with open(path, "rb") as file:
            if file.read(len(HEAD)) == HEAD:
                return True
    raise TrainerError(f"{path}, where checkpoints go, is none: move it away, or give another name for the model")


def check_identity(found: Any, wanted: dict[str, Any], path: Path) -> None:
    if not isinstance(found, dict):
        raise damaged(path, "it does not say what it is of")
    for name, value in wanted.items():
        if found.get(name) != value:
            raise TrainerError(f"{path} is of another training: {name} {found.get(name)}, and not {value}")


# --- the file ---

def write(path: Path, description: dict[str, Any], arrays: dict[str, np.ndarray]) -> None:
    """The file is whole, or as it was before."""
    listed = [[name, kind_of(array), list(array.shape)] for name, array in arrays.items()]
    head = json.dumps({"format": FORMAT, "version": VERSION, **description, "arrays": listed}).encode() + b"\n"
    part = sibling(path, ".part")
    digest = hashlib.sha256(head)
    with naming(part), open(part, "wb") as file:
        file.write(head)
        for array in arrays.values():
            content = np.ascontiguousarray(array).reshape(-1).view(np.uint8).data
            digest.update(content)
            file.write(content)
        file.write(digest.digest())
        file.flush()
        os.fsync(file.fileno())
    os.replace(part, path)


def kind_of(array: np.ndarray) -> str:
    return array.dtype.newbyteorder("<").str


def read_description(path: Path) -> dict[str, Any]:
    """The line of JSON of a file that is whole, its `dataStart` added."""
    check_digest(path)
    with open(path, "rb") as file, damage(path):
        head = file.readline(HEAD_LIMIT)
        description = json.loads(head)
        if description["format"] != FORMAT:
            raise ValueError("it has no line that says what it is")
    if description.get("version") != VERSION:
        raise TrainerError(f"{path} is a checkpoint of version {description.get('version')}, and this trainer reads "
                           f"{VERSION}")
    return {**description, "dataStart": len(head)}


def check_digest(path: Path) -> None:
    left = path.stat().st_size - DIGEST_BYTES
    digest = hashlib.sha256()
    with open(path, "rb") as file:
        while left > 0:
            block = file.read(min(left, BLOCK_BYTES))
            if not block:
                break
            digest.update(block)
            left -= len(block)
        if left or file.read() != digest.digest():
            raise damaged(path, "its digest is another")


def read_arrays(path: Path, description: dict[str, Any], like: dict[str, np.ndarray]) -> dict[str, np.ndarray]:
    """Arrays of the names, kinds and shapes of `like`, and no others."""
    if description["arrays"] != [[name, kind_of(array), list(array.shape)] for name, array in like.items()]:
        raise TrainerError(f"{path} is of a network of another form")
    if path.stat().st_size - description["dataStart"] != sum(array.nbytes for array in like.values()) + DIGEST_BYTES:
        raise ValueError("it has another size than its arrays")
    arrays = {}
    with open(path, "rb") as file:
        file.seek(description["dataStart"])
        for name, array in like.items():
            arrays[name] = np.fromfile(file, array.dtype, math.prod(array.shape)).reshape(array.shape)
    return arrays


def damaged(path: Path, why: object) -> TrainerError:
    return TrainerError(f"{path} is damaged: {why}")


@contextmanager
def damage(path: Path) -> Iterator[None]:
    """What only a file of another form can bring about becomes an error that names it."""
    try:
        yield
    except (KeyError, TypeError, ValueError, OverflowError, RecursionError, RuntimeError) as error:
        raise damaged(path, f"{type(error).__name__}: {error}") from error
