# SPDX-License-Identifier: Apache-2.0
"""Folders that appear as a whole or not at all (decision 0085)."""

import ctypes
import errno
import fcntl
import os
import shutil
from contextlib import contextmanager, suppress
from pathlib import Path
from typing import Iterable, Iterator

from .errors import LockedByAnother, TrainerError

AT_FDCWD, RENAME_EXCHANGE = -100, 2  # linux/fcntl.h, linux/fs.h
LOCK = "lock"  # in a folder that is written, as quarn has it


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
    claim, place = Claim(part, target), part
    try:
        empty(part)
        yield part
        check_replaceable(target, own_names)
        sync(part)
        replace(part, target, old)
        place = target
    finally:
        if place is part:
            with suppress(OSError):
                empty(part)
        claim.release(place)


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
    if not os.access(target, os.W_OK):
        raise TrainerError(f"{target} cannot be replaced, as it may only be read: give another name")
    others = sorted(name for name in set(os.listdir(target)) - {LOCK, *own_names}
                    if not name.startswith(".nfs"))  # what NFS keeps of a file that somebody still reads
    if others:
        raise TrainerError(f"{target} holds {others[0]}, which would be lost: move it away, or give another name")


class Claim:
    """A folder that no other process writes, by a lock on a file in it; the system takes the lock from a process that
    dies. It is a file, and open for writing, as NFS locks nothing else."""

    def __init__(self, folder: Path, target: Path) -> None:
        """Makes the folder where there is none. `target` is what the user calls it."""
        taken = LockedByAnother(f"another process is writing {target}: wait for it, or give another name")
        for _ in range(100):  # another one may finish with the folder between two of these steps
            folder.mkdir(exist_ok=True)
            try:
                self.handle = os.open(folder / LOCK, os.O_RDWR | os.O_CREAT | os.O_NOFOLLOW, 0o666)
            except FileNotFoundError:
                continue
            try:
                with naming(folder / LOCK):
                    fcntl.flock(self.handle, fcntl.LOCK_EX | fcntl.LOCK_NB)
                if is_at(folder / LOCK, self.handle):
                    return
            except BlockingIOError:
                os.close(self.handle)
                raise taken from None
            os.close(self.handle)
        raise taken

    def release(self, folder: Path) -> None:
        """`folder`: its name by now. It goes where nothing else is in it."""
        with suppress(OSError):
            (folder / LOCK).unlink()
        os.close(self.handle)  # before the folder goes, as NFS keeps an open file in it
        with suppress(OSError):
            folder.rmdir()


def is_claimed(folder: Path) -> bool:
    """Whether another process writes it. A shared lock tells, which also who may only read is given."""
    try:
        handle = os.open(folder / LOCK, os.O_RDONLY | os.O_NOFOLLOW | os.O_NONBLOCK)
    except OSError:
        return False
    try:
        fcntl.flock(handle, fcntl.LOCK_SH | fcntl.LOCK_NB)
    except BlockingIOError:
        return True
    except OSError:
        return False  # no locks here, so nobody has one
    finally:
        os.close(handle)
    return False


def is_at(path: Path, handle: int) -> bool:
    try:
        return os.path.samestat(os.stat(path, follow_symlinks=False), os.fstat(handle))
    except FileNotFoundError:
        return False


def empty(folder: Path) -> None:
    """But for the lock, without which another process would begin in it."""
    for entry in folder.iterdir():
        if entry.is_dir() and not entry.is_symlink():
            shutil.rmtree(entry)
        elif entry.name != LOCK and not entry.name.startswith(".nfs"):
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
        return
    claim, place = Claim(target, target), target  # of what will be TARGET.part, where another process would begin
    try:
        if exchange(part, target):
            place = part
        else:  # this file system cannot: for a moment there is no folder of that name
            os.rename(target, old)
            place = old
            os.rename(part, target)
        with suppress(OSError):
            empty(place)
    finally:
        claim.release(place)


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
