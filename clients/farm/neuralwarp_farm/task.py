# SPDX-License-Identifier: Apache-2.0
"""One task, run here: what engines call on a node, and whoever looks into a task by hand."""

import fcntl
import os
import re
import signal
import socket
import subprocess
import sys
import time
from contextlib import contextmanager, suppress
from pathlib import Path
from types import FrameType
from typing import BinaryIO, Iterator, Optional

from . import codes, facts, results, sums
from .errors import FarmError, LockedByAnother, UsageError
from .plan import Plan, Task
from .results import State

PLACEHOLDER = re.compile(r"\{(quarn|train|python|threads|folder)\}")
PACKAGES = Path(__file__).resolve().parents[1]  # where this package lies
MARK = "# "  # begins a line of the log that is the farm's, and not the program's
ENDED = MARK + "ended with "
ENDING_SIGNALS = (signal.SIGINT, signal.SIGTERM, signal.SIGHUP)


class Ended(BaseException):
    """A signal asks for the end, and no program is running to which it could be handed on."""

    def __init__(self, number: int) -> None:
        super().__init__(number)
        self.code = codes.INTERRUPTED if number == signal.SIGINT else codes.TERMINATED


def run(plan: Plan, task: Task, threads: Optional[int] = None) -> int:
    """Makes the result of a task, unless it is there. Returns the status of its program, which has gone into the log.

    Raises LockedByAnother where another process is at work on it, or on what it needs.
    """
    threads = threads_of(task, threads)
    if results.is_done(plan, task):
        return is_there(task)
    check_needs(plan, task)
    with claimed(plan, task) as number, Signals() as signals, log_of(plan, task) as log:
        if results.is_done(plan, task):
            return is_there(task)
        begin = time.monotonic()
        write_line(log, first_line(task, number))
        try:
            code = attempt(plan, task, threads, signals, log)
        except FarmError as error:
            code = codes.FAILED
            write_line(log, f"neuralwarp-farm: {error}")
            print(f"neuralwarp-farm: {task.id}: {error}", file=sys.stderr)
        except Ended as end:
            code = end.code
        write_line(log, f"{ENDED}{code} after {time.monotonic() - begin:.1f} s")
    print(f"{task.id} ended with {code}: {plan.log(task)}", flush=True)
    return code


def is_there(task: Task) -> int:
    print(f"{task.id} is done already", flush=True)
    return codes.DONE


def threads_of(task: Task, wanted: Optional[int]) -> int:
    """What was asked for, what the allocation has, what the plan says."""
    if wanted is None:
        allotted = os.environ.get("SLURM_CPUS_PER_TASK", "")
        wanted = int(allotted) if re.fullmatch("[0-9]{1,5}", allotted) else task.resources.cpus
    if not 1 <= wanted <= 1024:
        raise UsageError(f"--threads is {wanted}, not a whole number from 1 to 1024")
    return wanted


def check_needs(plan: Plan, task: Task) -> None:
    states = {need: results.state_of(plan, plan.task(need)) for need in task.needs}
    writing = [need for need, state in states.items() if state is State.WRITING]
    missing = [need for need, state in states.items() if state in (State.BEGUN, State.MISSING)]
    if missing:
        more = f" and {len(missing) - 5} more" if len(missing) > 5 else ""
        raise FarmError(f"{task.id} needs what is not there yet: {', '.join(missing[:5])}{more}")
    if writing:
        raise LockedByAnother(f"{task.id} needs {writing[0]}, which is being written")


@contextmanager
def claimed(plan: Plan, task: Task) -> Iterator[int]:
    """Keeps the task for this process; the system takes the lock from one that dies. Gives the number of the attempt,
    which the locked file holds."""
    path = results.lock_file(plan, task)
    path.parent.mkdir(parents=True, exist_ok=True)
    lock = os.open(path, os.O_RDWR | os.O_CREAT | os.O_NOFOLLOW | os.O_CLOEXEC, 0o664)
    try:
        try:
            fcntl.flock(lock, fcntl.LOCK_EX | fcntl.LOCK_NB)
        except BlockingIOError:
            raise LockedByAnother(f"another process is running {task.id} of {plan.folder}") from None
        except OSError:
            pass  # a file system without locks: programs have their own ways to notice one another
        before = os.pread(lock, 10, 0).decode(errors="replace")
        number = 1 + (int(before) if before.isascii() and before.isdigit() else 0)
        with suppress(OSError):  # a full disk
            os.pwrite(lock, str(number).encode(), 0)
        yield number
    finally:
        os.close(lock)


# --- the attempt ---

def attempt(plan: Plan, task: Task, threads: int, signals: "Signals", log: BinaryIO) -> int:
    check_program(plan, log)
    sums.check(plan)
    result = plan.absolute(task.result.path)
    result.parent.mkdir(parents=True, exist_ok=True)
    if task.result.kind == "frames":
        result.mkdir(exist_ok=True)
    code = signals.run(filled(plan, task, threads), plan.folder, environment_of(plan, threads), log)
    if code == codes.DONE and not results.is_done(plan, task):
        raise FarmError(f"the program ended with 0, and {result} is not there as it should be")
    return code


def check_program(plan: Plan, log: BinaryIO) -> None:
    """Parts that were made by different quarns do not make one whole."""
    quarn = plan.programs.get("quarn")
    if quarn is None:
        return
    here = facts.build_of(quarn)
    write_line(log, f"{MARK}{here}")
    if (here.version, here.build) != (plan.quarn, plan.build):
        raise FarmError(f"{quarn} on {socket.gethostname()} is quarn {here.version}, build {here.build}, and the plan "
                        f"was made with {plan.quarn}, build {plan.build}: install that, or make another plan")


def filled(plan: Plan, task: Task, threads: int) -> list[str]:
    values = {"threads": str(threads), "folder": str(plan.folder), "python": sys.executable, **plan.programs}

    def value(found: "re.Match[str]") -> str:
        if found[1] not in values:
            raise FarmError(f"{task.id} runs {found[0]}, and the plan has no program of that name")
        return values[found[1]]
    return [PLACEHOLDER.sub(value, word) for word in task.command]


def environment_of(plan: Plan, threads: int) -> dict[str, str]:
    paths = [str(PACKAGES), *filter(None, [os.environ.get("PYTHONPATH")])]
    return {**os.environ, "PYTHONPATH": os.pathsep.join(paths), "OMP_NUM_THREADS": str(threads),
            "OPENBLAS_NUM_THREADS": str(threads), **plan.environment}


class Signals:
    """Hands signals that ask for the end on to the program, which keeps what it has; without one they end the task."""

    def __init__(self) -> None:
        self.process: Optional["subprocess.Popen[bytes]"] = None
        self.starting = False
        self.waiting: Optional[int] = None

    def __enter__(self) -> "Signals":
        self.before = {number: signal.signal(number, self.take) for number in ENDING_SIGNALS}
        return self

    def __exit__(self, *_: object) -> None:
        for number, handler in self.before.items():
            signal.signal(number, handler)

    def take(self, number: int, _: Optional[FrameType]) -> None:
        if self.process is not None:
            self.hand_on(number)
        elif self.starting:
            self.waiting = number
        else:
            raise Ended(number)

    def hand_on(self, number: int) -> None:
        """To the program and what it has started: they are a group of their own, so that a key hits them once."""
        assert self.process is not None
        with suppress(ProcessLookupError):
            os.killpg(self.process.pid, signal.SIGINT if number == signal.SIGINT else signal.SIGTERM)

    def run(self, command: list[str], folder: Path, environment: dict[str, str], log: BinaryIO) -> int:
        self.starting = True
        try:
            self.process = subprocess.Popen(command, cwd=folder, env=environment, stdin=subprocess.DEVNULL, stdout=log,
                                            stderr=subprocess.STDOUT, start_new_session=True)
        except OSError as error:
            raise FarmError(f"{command[0]} could not be run: {error.strerror}") from None
        finally:
            self.starting = False
        if self.waiting is not None:
            self.hand_on(self.waiting)
        code = self.process.wait()
        self.process = None
        return code if code >= 0 else 128 - code


# --- the log ---

@contextmanager
def log_of(plan: Plan, task: Task) -> Iterator[BinaryIO]:
    path = plan.log(task)
    path.parent.mkdir(parents=True, exist_ok=True)
    with open(path, "a+b", buffering=0) as log:
        yield log


def write_line(log: BinaryIO, text: str) -> None:
    """A line of its own, whatever the program has written. A full disk takes nothing from the answer of a task."""
    try:
        if log.seek(0, os.SEEK_END):
            log.seek(-1, os.SEEK_END)
            text = text if log.read(1) == b"\n" else f"\n{text}"
        log.write(f"{text}\n".encode(errors="replace"))
    except OSError as error:
        print(f"neuralwarp-farm: {log.name} could not be written: {error.strerror}", file=sys.stderr)


def first_line(task: Task, number: int) -> str:
    job = os.environ.get("SLURM_ARRAY_JOB_ID", os.environ.get("SLURM_JOB_ID"))
    index = os.environ.get("SLURM_ARRAY_TASK_ID")
    return (f"{MARK}{time.strftime('%Y-%m-%d %H:%M:%S %z')}: {task.id} on {socket.gethostname()}"
            + (f", job {job}{f'_{index}' if index else ''}" if job else "") + f", attempt {number}")
