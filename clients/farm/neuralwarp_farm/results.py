# SPDX-License-Identifier: Apache-2.0
"""How far a task is, by what lies on the disk: that is the truth, whatever engines and logs say."""

import fcntl
import json
import math
import os
import shutil
import time
from contextlib import suppress
from enum import Enum
from pathlib import Path

from .errors import FarmError, LockedByAnother
from .plan import FILE, Plan, Task, read

FRESH = 1.0  # seconds: thousands of parts lie in a folder, which is listed once for all of them
listed: dict[Path, float] = {}  # when


class State(Enum):
    DONE = "done"        # the result is there
    WRITING = "writing"  # another process is at work on it
    BEGUN = "begun"      # something of it is there, and nobody is at work on it
    MISSING = "missing"


def state_of(plan: Plan, task: Task) -> State:
    if is_done(plan, task):
        return State.DONE
    parts = [path for path in unfinished(plan, task) if path.exists()]
    if is_held(lock_file(plan, task)) or any(is_held(part / "lock") for part in parts):
        # it may have ended between the two looks
        return State.DONE if has_result(plan, task) else State.WRITING
    return State.BEGUN if parts or has_some_frames(plan, task) else State.MISSING


def is_done(plan: Plan, task: Task) -> bool:
    if has_result(plan, task):
        return True
    forget_absence(plan, task)
    return has_result(plan, task)


def lock_file(plan: Plan, task: Task) -> Path:
    """Locked by the process that runs the task, as long as it does."""
    return plan.state / f"{task.id}.lock"


def has_result(plan: Plan, task: Task) -> bool:
    path = plan.absolute(task.result.path)
    if task.result.kind == "dataset":
        return (path / "dataset.json").is_file()
    if task.result.kind == "cache":
        return path.is_file()
    if task.result.kind == "model":
        return is_whole_model(path)
    return all((path / name).is_file() for name in task.result.files)


def is_whole_model(path: Path) -> bool:
    """One that a training has published because it was interrupted says so itself, and is to be trained to its end."""
    try:
        content = json.loads((path / "metadata.json").read_bytes())
    except (OSError, ValueError):
        return False
    return isinstance(content, dict) and not content.get("interruptedAfterEpochs")


def has_some_frames(plan: Plan, task: Task) -> bool:
    return any((plan.absolute(task.result.path) / name).is_file() for name in task.result.files)


def unfinished(plan: Plan, task: Task) -> list[Path]:
    """What a task that has begun may have left."""
    path = plan.absolute(task.result.path)
    if task.result.kind == "frames":
        return []
    beside = [path.with_name(path.name + ".part")]
    if task.result.kind == "model":
        beside += [path, path.with_suffix(".checkpoint")]
    return beside


def is_held(path: Path) -> bool:
    """Whether another process has locked a file, as writers of unfinished results do with the one in them. A lock that
    is shared for a moment hinders no other look, and a writer that begins in this very moment answers that it is to be
    tried again."""
    try:
        handle = os.open(path, os.O_RDONLY | os.O_NOFOLLOW | os.O_NONBLOCK)
    except OSError:
        return False
    try:
        fcntl.flock(handle, fcntl.LOCK_SH | fcntl.LOCK_NB)
    except BlockingIOError:
        return True
    except OSError:  # a file system without locks
        return False
    finally:
        os.close(handle)
    return False


def forget_absence(plan: Plan, task: Task) -> None:
    """A network file system remembers for a while that there was no such file. Listing the folder asks the server."""
    path = plan.absolute(task.result.path)
    for folder in (path.parent, path):
        if time.monotonic() - listed.get(folder, -math.inf) < FRESH:
            continue
        with suppress(OSError):
            os.listdir(folder)
            listed[folder] = time.monotonic()


# --- room for a new plan ---

def make_room(plan: Plan, overwrite: bool) -> None:
    """Sees to it that no result is there before a plan is: it would be taken for the plan's own.

    With `overwrite` those of the plan that is in the folder now, and lie in it, are removed. Raises FarmError, naming
    it, for what is left.
    """
    if overwrite and (plan.folder / FILE).exists():
        clear(read(plan.folder))
    for task in plan.tasks:
        state = state_of(plan, task)
        if state is not State.MISSING:
            raise FarmError(f"{found(plan, task)} is there already, and was not made by this plan: move it away, or "
                            "give another --result")


def found(plan: Plan, task: Task) -> Path:
    """What is there of a task that is not missing."""
    path = plan.absolute(task.result.path)
    candidates = [path / name for name in task.result.files] or [path, *unfinished(plan, task)]
    return next((candidate for candidate in candidates if candidate.exists()), lock_file(plan, task))


def clear(plan: Plan) -> None:
    for task in plan.tasks:
        if state_of(plan, task) is State.WRITING:
            raise LockedByAnother(f"{task.id} of {plan.folder} is being written: wait for it, or cancel it")
    for task in plan.tasks:
        path = plan.absolute(task.result.path)
        if os.path.isabs(task.result.path):
            continue
        record = path.with_name(path.name + ".part.json")
        files = [path / name for name in task.result.files] or [path, record, *unfinished(plan, task)]
        for file in [*files, plan.log(task)]:
            remove(file)


def remove(path: Path) -> None:
    try:
        if path.is_dir() and not path.is_symlink():
            shutil.rmtree(path)
        else:
            path.unlink()
    except FileNotFoundError:
        pass
    except OSError as error:
        raise FarmError(f"{path} could not be removed: {error.strerror}") from None
