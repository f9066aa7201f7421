# SPDX-License-Identifier: Apache-2.0
"""Folders that appear as a whole or not at all (decision 0085)."""

import ctypes
import errno
import fcntl
import os
import shutil
from contextlib import contextmanager
from pathlib import Path
from typing import Iterable, Iterator

from .errors import TrainerError

AT_FDCWD, RENAME_EXCHANGE = -100, 2  # linux/fcntl.h, linux/fs.h


@contextmanager
def whole_folder(target: Path, own_names: Iterable[str]) -> Iterator[Path]:
    """Gives TARGET.part to fill. On leaving without an exception it takes the place of `target`, else it goes.

    `own_names`: what a folder may hold that is replaced; one that holds anything else is refused. What a killed process
    has left behind is removed; two processes do not write the same target.
    """
    part, old = sibling(target, ".part"), sibling(target, ".old")
    check_replaceable(target, own_names)
    target.parent.mkdir(parents=True, exist_ok=True)
    if old.exists() and not target.exists():
        os.rename(old, target)  # killed between the two renames of replace()
    lock = claim(part, target)
    try:
        empty(part)
        yield part
        check_replaceable(target, own_names)
        sync(part)
        replace(part, target, old)
    finally:
        shutil.rmtree(part, ignore_errors=True)
        os.close(lock)


def write_bytes(path: Path, content: bytes) -> None:
    """Writes a file; an error, such as a full disk, names it."""
    with naming(path), open(path, "wb") as file:
        file.write(content)


@contextmanager
def naming(path: Path) -> Iterator[None]:
    """Puts the path into errors of writing and closing, which come from the system without one."""
    try:
        yield
    except OSError as error:
        raise OSError(error.errno, error.strerror, str(path)) from error


def sibling(target: Path, ending: str) -> Path:
    return target.with_name(target.name + ending)


def check_replaceable(target: Path, own_names: Iterable[str]) -> None:
    if not target.exists() and not target.is_symlink():
        return
    if not target.is_dir():
        raise TrainerError(f"{target} is a file: remove it, or give another name")
    others = sorted(set(os.listdir(target)) - set(own_names))
    if others:
        raise TrainerError(f"{target} holds {others[0]}, which would be lost: move it away, or give another name")


def claim(part: Path, target: Path) -> int:
    """Makes the folder and locks it; the system takes the lock from a process that dies."""
    part.mkdir(exist_ok=True)
    lock = os.open(part, os.O_RDONLY | os.O_DIRECTORY)
    try:
        fcntl.flock(lock, fcntl.LOCK_EX | fcntl.LOCK_NB)
    except BlockingIOError:
        os.close(lock)
        raise TrainerError(f"another process is writing {target}: wait for it, or give another name") from None
    return lock


def empty(folder: Path) -> None:
    for entry in folder.iterdir():
        if entry.is_dir() and not entry.is_symlink():
            shutil.rmtree(entry)
        else:
            entry.unlink()


def sync(folder: Path) -> None:
    """The bytes reach the disk before the name does."""
    for path in [*folder.iterdir(), folder]:
        handle = os.open(path, os.O_RDONLY)
        try:
            with naming(path):
                os.fsync(handle)
        finally:
            os.close(handle)


def replace(part: Path, target: Path, old: Path) -> None:
    if not target.exists():
        os.rename(part, target)
    elif not exchange(part, target):
        # this file system cannot exchange: for a moment there is no folder of that name
        os.rename(target, old)
        os.rename(part, target)
    shutil.rmtree(part, ignore_errors=True)
    shutil.rmtree(old, ignore_errors=True)


def exchange(first: Path, second: Path) -> bool:
    """Swaps two names in one step. False where the system does not offer that."""
    rename = getattr(ctypes.CDLL(None, use_errno=True), "renameat2", None)
    if rename is None:
        return False
    if rename(AT_FDCWD, os.fsencode(first), AT_FDCWD, os.fsencode(second), RENAME_EXCHANGE) == 0:
        return True
    error = ctypes.get_errno()
    if error in (errno.ENOSYS, errno.EINVAL):
        return False
    raise OSError(error, os.strerror(error), str(second))


def model_path(text: str) -> Path:
    """The path of a model directory: NAME.nwrp, with the ending added where it is missing."""
    path = Path(text)
    if not path.name or path.name == "..":
        raise TrainerError(f"{text!r} has no name for a model")
    return path if path.suffix == ".nwrp" else path.with_name(path.name + ".nwrp")
