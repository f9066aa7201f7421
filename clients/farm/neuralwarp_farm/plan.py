# SPDX-License-Identifier: Apache-2.0
"""What is to be done, cut into tasks: plan.json in a folder of its own, written once and not changed."""

import json
import os
import re
import tempfile
from dataclasses import asdict, dataclass, replace
from pathlib import Path, PurePosixPath
from typing import Any, Optional, Union

from .errors import FarmError
from .fields import Fields, shown

FILE, FORMAT, VERSION = "plan.json", "neuralWarp farm plan", 1
LARGEST_FILE = 256 << 20
LARGEST_COUNT = 100_000  # tasks, and whatever else there is a list of
RESULT_KINDS = ("dataset", "cache", "frames", "model")
ID = re.compile(r"[A-Za-z0-9][A-Za-z0-9._-]{0,99}")  # it names files and jobs
VARIABLE = re.compile(r"[A-Za-z_][A-Za-z0-9_]*")
SUM = re.compile(r"sha256:[0-9a-f]{64}|missing")


@dataclass(frozen=True)
class Result:
    """What a task leaves behind; its presence is what says that the task is done."""

    kind: str                    # one of RESULT_KINDS
    path: str                    # from the plan's folder, or absolute; of frames the folder that they lie in
    files: tuple[str, ...] = ()  # of frames: their names in that folder


@dataclass(frozen=True)
class Resources:
    """What a task is to be given."""

    cpus: int = 2
    memory_mb: int = 4000
    gpus: int = 0
    minutes: float = 0  # an estimate without a margin; 0 where there is none


@dataclass(frozen=True)
class Task:
    id: str
    command: tuple[str, ...]  # words; task.py says what {quarn} and the like stand for
    needs: tuple[str, ...]    # ids of the tasks whose results it reads
    result: Result
    resources: Resources
    frames: Optional[str] = None


@dataclass(frozen=True)
class SourceFile:
    """A file that tasks read."""

    path: str   # absolute
    bytes: int
    sum: str    # "sha256:...", or "missing" for one that is not there and must not appear between two tasks


@dataclass(frozen=True)
class Plan:
    folder: Path                 # absolute
    kind: str
    name: str
    quarn: str                   # its version
    build: str                   # and its commit
    programs: dict[str, str]     # absolute paths by the names that commands have for them
    files: tuple[SourceFile, ...]
    frames: Optional[str]
    seconds_a_frame: Optional[float]  # None where nothing was timed
    start_seconds: Optional[float]
    environment: dict[str, str]
    tasks: tuple[Task, ...]

    def task(self, identifier: str) -> Task:
        for task in self.tasks:
            if task.id == identifier:
                return task
        raise FarmError(f"{self.folder / FILE} has no task {identifier!r}; the first of its {len(self.tasks)} is "
                        f"{self.tasks[0].id}, the last {self.tasks[-1].id}")

    def absolute(self, path: str) -> Path:
        """A path as plan.json has it."""
        return self.folder / path

    def log(self, task: Task) -> Path:
        return self.folder / "logs" / f"{task.id}.log"

    @property
    def state(self) -> Path:
        """The folder of what changes: job ids, locks, sums that are known."""
        return self.folder / "state"


# --- reading ---

def read(place: Union[str, Path]) -> Plan:
    """The plan in a folder, or of its file. Raises FarmError, naming the entry, for anything that is none."""
    path = Path(place)
    if path.is_dir():
        path = path / FILE
    return from_json(read_json(path), path)


def read_json(path: Path) -> Any:
    try:
        if path.stat().st_size > LARGEST_FILE:
            raise FarmError(f"{path} has {path.stat().st_size} bytes, and a plan at most {LARGEST_FILE}")
        text = path.read_bytes().decode()
    except (FileNotFoundError, NotADirectoryError):
        raise FarmError(f"there is no plan at {path}: neuralwarp-farm plan makes one") from None
    except UnicodeDecodeError as error:
        raise FarmError(f"{path} is no plan: {error}") from None
    except OSError as error:
        raise FarmError(f"{path} could not be read: {error.strerror}") from None
    try:
        return json.loads(text, object_pairs_hook=without_doubles)
    except RecursionError:
        raise FarmError(f"{path} is no plan: it is nested too deeply") from None
    except ValueError as error:
        raise FarmError(f"{path} is no plan: {error}") from None


def without_doubles(pairs: list[tuple[str, Any]]) -> dict[str, Any]:
    result = dict(pairs)
    if len(result) < len(pairs):
        names = [name for name, _ in pairs]
        raise ValueError(f"an object has {next(name for name in names if names.count(name) > 1)!r} twice")
    return result


def from_json(content: Any, path: Path) -> Plan:
    """`path`: of plan.json, for errors, and for the folder that its paths count from."""
    entries = Fields(content, str(path))
    if entries.text("format") != FORMAT:
        raise FarmError(f"{path} is no plan: its format is {entries.text('format')!r}, not {FORMAT!r}")
    if entries.whole("version", 0, 10**9) != VERSION:
        raise FarmError(f"{path} has version {entries.whole('version', 0, 10**9)}, and this program reads {VERSION}")
    result = Plan(
        folder=Path(os.path.abspath(path.parent)), kind=entries.text("kind"), name=entries.text("name", ID),
        quarn=entries.text("quarn"), build=entries.text("build"), programs=entries.texts_by_name("programs"),
        files=tuple(file_from_json(file) for file in entries.objects("files", LARGEST_COUNT)),
        frames=entries.optional("frames", entries.text),
        seconds_a_frame=entries.optional("secondsAFrame", entries.number),
        start_seconds=entries.optional("startSeconds", entries.number),
        environment=entries.texts_by_name("environment", VARIABLE),
        tasks=tuple(task_from_json(task) for task in entries.objects("tasks", LARGEST_COUNT)))
    entries.check_all_taken()
    check_tasks(result.tasks, path)
    return result


def file_from_json(entries: Fields) -> SourceFile:
    file = SourceFile(entries.text("path"), entries.whole("bytes", 0, 2**63), entries.text("sum", SUM))
    if not os.path.isabs(file.path):
        raise entries.error("path", f"is {file.path!r}, not an absolute path")
    entries.check_all_taken()
    return file


def task_from_json(entries: Fields) -> Task:
    identifier = entries.text("id", ID)
    entries.where = f"{entries.where} ({identifier})"
    task = Task(identifier, entries.texts("command", LARGEST_COUNT), entries.texts("needs", LARGEST_COUNT),
                result_from_json(entries.object("result")), resources_from_json(entries.object("resources")),
                entries.optional("frames", entries.text))
    if not task.command:
        raise entries.error("command", "is empty")
    entries.check_all_taken()
    return task


def result_from_json(entries: Fields) -> Result:
    result = Result(entries.text("kind"), entries.text("path"),
                    entries.texts("files", LARGEST_COUNT * 100) if entries.has("files") else ())
    if result.kind not in RESULT_KINDS:
        raise entries.error("kind", f"is {result.kind!r}, not one of {', '.join(RESULT_KINDS)}")
    if not result.path or ".." in PurePosixPath(result.path).parts:
        raise entries.error("path", f"is {result.path!r}, which leads out of the plan's folder: an absolute path may")
    if bool(result.files) != (result.kind == "frames"):
        raise entries.error("files", f"has {len(result.files)} names, of a result of kind {result.kind!r}")
    for name in result.files:
        if name in ("", ".", "..") or "/" in name:
            raise entries.error("files", f"has {name!r}, which is no name of a file")
    entries.check_all_taken()
    return result


def resources_from_json(entries: Fields) -> Resources:
    resources = Resources(entries.whole("cpus", 1, 65_536), entries.whole("memoryMb", 1, 2**40),
                          entries.whole("gpus", 0, 65_536), entries.number("minutes"))
    entries.check_all_taken()
    return resources


def check_tasks(tasks: tuple[Task, ...], path: Path) -> None:
    """Raises FarmError unless ids are different, and each task comes behind those that it needs."""
    if not tasks:
        raise FarmError(f"{path} has no tasks")
    every = {task.id for task in tasks}
    before: set[str] = set()
    for task in tasks:
        if task.id in before:
            raise FarmError(f"{path} has the task {task.id} twice")
        for need in task.needs:
            if need not in before:
                raise FarmError(f"{path}: the task {task.id} needs {shown(need)}, which "
                                f"{'does not come before it' if need in every else 'is no task'}")
        before.add(task.id)


# --- writing ---

def to_json(plan: Plan) -> dict[str, Any]:
    return {"format": FORMAT, "version": VERSION, "kind": plan.kind, "name": plan.name, "quarn": plan.quarn,
            "build": plan.build, "programs": plan.programs, "files": [asdict(file) for file in plan.files],
            "frames": plan.frames, "secondsAFrame": plan.seconds_a_frame, "startSeconds": plan.start_seconds,
            "environment": plan.environment, "tasks": [task_to_json(task) for task in plan.tasks]}


def task_to_json(task: Task) -> dict[str, Any]:
    result: dict[str, Any] = {"kind": task.result.kind, "path": task.result.path}
    if task.result.files:
        result["files"] = list(task.result.files)
    resources = task.resources
    return {"id": task.id, "command": list(task.command), "needs": list(task.needs), "result": result,
            "frames": task.frames, "resources": {"cpus": resources.cpus, "memoryMb": resources.memory_mb,
                                                 "gpus": resources.gpus, "minutes": resources.minutes}}


def untimed(plan: Plan) -> Plan:
    """The plan without what comes out otherwise each time that it is made."""
    tasks = tuple(replace(task, resources=replace(task.resources, minutes=0, memory_mb=0)) for task in plan.tasks)
    return replace(plan, seconds_a_frame=None, start_seconds=None, tasks=tasks)


def is_there(plan: Plan) -> bool:
    """Whether the folder has this plan already; what was timed may differ. False for another, and for none."""
    try:
        return untimed(read(plan.folder / FILE)) == untimed(plan)
    except FarmError:
        return False


def check_replaceable(plan: Plan, overwrite: bool) -> None:
    path = plan.folder / FILE
    if path.exists() and not overwrite:
        raise FarmError(f"{path} is another plan: give another folder, or --overwrite")


def write(plan: Plan, overwrite: bool = False) -> Path:
    """Writes plan.json, as a whole, unless it is there already. Raises FarmError for another one that is there.

    Returns its path.
    """
    path = plan.folder / FILE
    if is_there(plan):
        return path
    check_replaceable(plan, overwrite)
    written = json.dumps(to_json(plan), indent=1, ensure_ascii=False) + "\n"
    from_json(json.loads(written), path)  # what it refuses is not written either
    write_whole(path, written)
    return path


def write_whole(path: Path, text: str) -> None:
    """Writes a file as a whole or not at all, for all who may write its folder."""
    try:
        path.parent.mkdir(parents=True, exist_ok=True)
        handle, name = tempfile.mkstemp(prefix=f".{path.name}.", dir=path.parent)
        try:
            with open(handle, "w", encoding="utf-8") as file:
                file.write(text)
                file.flush()
                os.fsync(file.fileno())
            os.chmod(name, 0o664)
            os.replace(name, path)
        except BaseException:
            os.unlink(name)
            raise
    except (OSError, UnicodeEncodeError) as error:
        raise FarmError(f"{path} could not be written: {getattr(error, 'strerror', error)}") from None
