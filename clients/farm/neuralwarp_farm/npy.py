# SPDX-License-Identifier: Apache-2.0
"""Point caches as NumPy arrays, read and written with the standard library: a node of a farm may have no NumPy."""

import ast
import hashlib
import math
import struct
import sys
from array import array
from pathlib import Path
from typing import BinaryIO, Iterator, NamedTuple

from .errors import FarmError

MAGIC = b"\x93NUMPY"
KINDS = {"<f4": "f", "<f8": "d"}  # of numbers, and what the module array calls them
LONGEST_HEAD = 1 << 16


class Cache(NamedTuple):
    """The head of an .npy of points whose file ends where its points end."""
    path: Path
    kind: str      # a key of KINDS
    frames: int
    vertices: int
    begin: int     # of the points, in bytes

    @property
    def row_bytes(self) -> int:
        return self.vertices * 3 * array(KINDS[self.kind]).itemsize


def read_head(path: Path) -> Cache:
    """Throws FarmError, naming the file and what is wrong with it, where it is no whole cache."""
    with path.open("rb") as file:
        text, begin = head_text(path, file)
    kind, shape = described(path, text)
    cache = Cache(path, kind, shape[0], shape[1], begin)
    wanted, size = begin + cache.frames * cache.row_bytes, path.stat().st_size
    if size != wanted:
        raise FarmError(f"{path} has {size} bytes, and its head says {wanted}")
    return cache


def head_text(path: Path, file: BinaryIO) -> tuple[str, int]:
    """The dictionary of the head, as text, and where the points begin."""
    start = file.read(8)
    if len(start) < 8 or start[:6] != MAGIC or start[6] not in (1, 2, 3):
        raise FarmError(f"{path} is no .npy file that can be read")
    width, form = (2, "<H") if start[6] == 1 else (4, "<I")
    size = file.read(width)
    length = struct.unpack(form, size)[0] if len(size) == width else LONGEST_HEAD + 1
    text = file.read(min(length, LONGEST_HEAD))
    if len(text) != length:
        raise FarmError(f"{path} is no .npy file that can be read: its head is cut off or too long")
    return text.decode("utf-8", "replace"), 8 + width + length


def described(path: Path, text: str) -> tuple[str, tuple[int, ...]]:
    """The kind of numbers and the shape that a head names."""
    try:
        head = ast.literal_eval(text.strip())
        kind, shape, is_fortran = head["descr"], head["shape"], head["fortran_order"]
    except (ValueError, SyntaxError, KeyError, TypeError, MemoryError, RecursionError):
        raise FarmError(f"{path} is no .npy file that can be read: its head is no description") from None
    if kind not in KINDS or is_fortran:
        raise FarmError(f"{path} holds numbers of the kind {kind!r}{' in Fortran order' if is_fortran else ''}; <f4 or "
                        "<f8 in C order is asked for")
    if not isinstance(shape, tuple) or len(shape) != 3 or shape[2] != 3 or \
            not all(type(size) is int and 0 <= size < 2**40 for size in shape):
        raise FarmError(f"{path} is an array of {shape}, and not of [frames, vertices, 3]")
    return kind, shape


def rows(cache: Cache) -> Iterator[bytes]:
    """Frame after frame as <f4. Throws FarmError where a coordinate is no finite number in single precision."""
    with cache.path.open("rb") as file:
        file.seek(cache.begin)
        for row in range(cache.frames):
            values: "array[float]" = array(KINDS[cache.kind])
            values.frombytes(file.read(cache.row_bytes))
            if sys.byteorder == "big":
                values.byteswap()
            if cache.kind != "<f4":
                values = array("f", values)
            if not math.isfinite(sum(values)):  # in double precision, which no sum of so many of these leaves
                raise FarmError(f"{cache.path} has a coordinate that is no finite number, in row {row}, of vertex "
                                f"{next(i for i, value in enumerate(values) if not math.isfinite(value)) // 3}")
            if sys.byteorder == "big":
                values.byteswap()
            yield values.tobytes()


def write_head(file: BinaryIO, frames: int, vertices: int) -> None:
    """The head of an array of <f4 [frames, vertices, 3], as NumPy writes it."""
    text = f"{{'descr': '<f4', 'fortran_order': False, 'shape': ({frames}, {vertices}, 3), }}"
    text += " " * (-(len(text) + 11) % 64) + "\n"
    file.write(MAGIC + b"\x01\x00" + struct.pack("<H", len(text)) + text.encode())


def sum_of(content: bytes) -> str:
    return "sha256:" + hashlib.sha256(content).hexdigest()
