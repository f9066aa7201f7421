# SPDX-License-Identifier: Apache-2.0
"""What every engine is, and what several of them need (decision 0214)."""

import fcntl
import hashlib
import os
import shutil
import sys
import time
from contextlib import contextmanager
from dataclasses import dataclass
from pathlib import Path
from typing import Iterator, Optional, Protocol, Sequence

from ..errors import FarmError, LockedByAnother, UsageError
from ..plan import Plan, Resources, Task

PACKAGE = Path(__file__).resolve().parents[1]
LOCK_PATIENCE = 60.0  # seconds that a second submit waits for the first, which may have hundreds of arrays to send


@dataclass(frozen=True)
class Options:
    """What the command line says of resources and place; None: as the plan says, or the farm's own default."""

    partition: Optional[str] = None
    cpus: Optional[int] = None
    memory_mb: Optional[int] = None
    gpus: Optional[int] = None
    constraint: Optional[str] = None
    time: Optional[float] = None  # minutes that a task may take
    account: Optional[str] = None
    dry_run: bool = False

    def over(self, resources: Resources) -> Resources:
        """The resources of a task with what was said on the command line in their place."""
        return Resources(
            cpus=resources.cpus if self.cpus is None else self.cpus,
            memory_mb=resources.memory_mb if self.memory_mb is None else self.memory_mb,
            gpus=resources.gpus if self.gpus is None else self.gpus,
            minutes=resources.minutes,
        )


class Engine(Protocol):
    """Carries a plan out, or writes down how another program can."""

    name: str
    options: tuple[str, ...]  # the fields of Options that mean something to it

    def submit(self, plan: Plan, tasks: Sequence[Task], options: Options) -> str:
        """Sends `tasks`, or prints them for another program; the answer is what to tell the user.

        `tasks` are those without a result that nobody is working on, each behind what it needs. The caller holds the
        plan's lock (see `locked`), unless options.dry_run is set: then nothing is written or sent.
        """

    def cancel(self, plan: Plan) -> str:
        """Takes back what this engine has sent for this plan and nothing else; the answer is what to tell the user."""

    def states(self, plan: Plan) -> dict[str, str]:
        """By task what this engine knows of it: "running", "pending", "held" (until `submit`), "failed" or "gone" (sent
        once, and heard of no more). A task that it was never given is left out."""


class Printer:
    """What engines have in common that write a plan down for another program: they have sent nothing themselves."""

    def cancel(self, plan: Plan) -> str:
        return ""

    def states(self, plan: Plan) -> dict[str, str]:
        return {}


@contextmanager
def locked(plan: Plan) -> Iterator[None]:
    """Holds FOLDER/state/lock: of two people who submit or cancel at one moment the second waits for the first."""
    plan.state.mkdir(parents=True, exist_ok=True)
    path = plan.state / "lock"
    try:
        descriptor = os.open(path, os.O_RDWR | os.O_CREAT, 0o664)
    except OSError as error:
        raise FarmError(f"cannot lock the plan: {path}: {error.strerror}") from error
    try:
        give_up = time.monotonic() + LOCK_PATIENCE
        while True:
            try:
                fcntl.flock(descriptor, fcntl.LOCK_EX | fcntl.LOCK_NB)
                break
            except BlockingIOError:
                if time.monotonic() > give_up:
                    raise LockedByAnother(f"another submit or cancel of this plan holds {path}: try again") from None
                time.sleep(0.2)
        yield
    finally:
        os.close(descriptor)


def pin(plan: Plan) -> Path:
    """Copies this package into FOLDER/state, so that an update in the middle of a plan changes nothing of it.

    Answers the launcher of the copy. The folder is named by the sum of its content: the same package is copied once.
    """
    folder = pinned_folder(plan)
    if not folder.exists():
        whole = folder.with_name(f"{folder.name}.{os.getpid()}")
        shutil.rmtree(whole, ignore_errors=True)
        for path in package_files():
            copy = whole / PACKAGE.name / path.relative_to(PACKAGE)
            copy.parent.mkdir(parents=True, exist_ok=True)
            shutil.copyfile(path, copy)
        (whole / "neuralwarp-farm").write_text(LAUNCHER)
        os.rename(whole, folder)
    return folder / "neuralwarp-farm"


def pinned_folder(plan: Plan) -> Path:
    total = hashlib.sha256(LAUNCHER.encode())
    for path in package_files():
        total.update(str(path.relative_to(PACKAGE)).encode() + b"\0" + path.read_bytes() + b"\0")
    return plan.state / f"farm-{total.hexdigest()[:12]}"


LAUNCHER = '''#!/usr/bin/env python3
"""The neuralwarp-farm that a plan was submitted with."""

import runpy
import sys
from pathlib import Path

sys.dont_write_bytecode = True
sys.path.insert(0, str(Path(__file__).resolve().parent))
runpy.run_module("neuralwarp_farm", run_name="__main__")
'''


def package_files() -> list[Path]:
    return sorted(path for path in PACKAGE.rglob("*.py") if "__pycache__" not in path.parts)


def task_command(plan: Plan, options: Options) -> list[str]:
    """How a node runs a task of this plan; the id of the task comes behind it."""
    launcher = pinned_folder(plan) / "neuralwarp-farm" if options.dry_run else pin(plan)
    threads = [] if options.cpus is None else ["--threads", str(options.cpus)]
    return [sys.executable or "python3", str(launcher), "task", *threads, str(plan.folder)]


def stages(tasks: Sequence[Task]) -> list[list[Task]]:
    """The tasks in stages: each needs only tasks of earlier ones, or none that is among these."""
    stage_of: dict[str, int] = {}
    result: list[list[Task]] = []
    for task in tasks:
        stage = 1 + max((stage_of[need] for need in task.needs if need in stage_of), default=-1)
        stage_of[task.id] = stage
        if stage == len(result):
            result.append([])
        result[stage].append(task)
    return result


def at_once(tasks: Sequence[Task], options: Options) -> int:
    """How many of the tasks this machine runs side by side."""
    widest = max((options.over(task.resources).cpus for task in tasks), default=1)
    return max(1, (os.cpu_count() or 1) // max(1, widest))


def one_line(plan: Plan) -> None:
    """Refuses a folder whose name no list of lines can hold."""
    if "\n" in str(plan.folder):
        raise UsageError(f"the plan's folder has a line break in its name: {str(plan.folder)!r}")
