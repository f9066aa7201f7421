# SPDX-License-Identifier: Apache-2.0
"""What is asked before a plan is made: which quarn this is, what a scene reads, how long a frame takes."""

import json
import os
import shutil
import subprocess
import sys
import tempfile
import time
from dataclasses import dataclass
from pathlib import Path
from typing import Any, Callable, Optional, Sequence

from . import sums
from .errors import FarmError
from .fields import Fields
from .parts import Frames
from .plan import SourceFile

CHECKOUT = Path(__file__).resolve().parents[3]
ENOUGH = 2.0           # seconds that frames are to take beyond the first, so that they can be told from the start-up
LONGEST_TIMING = 60.0  # seconds after which it is enough as well
MANY = 100_000         # files of a scene


@dataclass(frozen=True)
class Build:
    version: str
    build: str
    instruction_set: str

    def __str__(self) -> str:
        return f"quarn {self.version}, build {self.build}, {self.instruction_set}"


@dataclass(frozen=True)
class Scene:
    path: str                  # absolute
    files: tuple[SourceFile, ...]
    frames: Optional[str]      # the export range of its deformer
    deformer: Optional[str]
    geometries: tuple[str, ...]


@dataclass(frozen=True)
class Timing:
    start_seconds: float
    seconds_a_frame: float
    memory_mb: int  # most that was resident
    frames: int     # that were made for it

    def seconds(self, frames: int) -> float:
        return self.start_seconds + frames * self.seconds_a_frame


# --- programs ---

def find_quarn(wanted: Optional[str] = None) -> str:
    """Absolute path of quarn: `wanted`, $QUARN, the release build of a checkout, the PATH."""
    return find_program(wanted, "--quarn", "QUARN", CHECKOUT / "build" / "release" / "quarn" / "quarn", "quarn")


def find_trainer(wanted: Optional[str] = None) -> str:
    """Absolute path of the trainer: `wanted`, $NEURALWARP_TRAINER, that of a checkout, the PATH."""
    return find_program(wanted, "--trainer", "NEURALWARP_TRAINER", CHECKOUT / "scripts" / "neuralwarp-train",
                        "neuralwarp-train")


def find_program(wanted: Optional[str], flag: str, variable: str, built: Optional[Path], name: str) -> str:
    for given, called in ((wanted, flag), (os.environ.get(variable), f"${variable}")):
        if given:
            found = shutil.which(given)
            if not found:
                raise FarmError(f"{called} names {given}, which is not a program")
            return os.path.abspath(found)
    found = shutil.which(str(built)) if built else None
    found = found or shutil.which(name)
    if not found:
        raise FarmError(f"there is no {name} on the PATH: name it with {flag}, or in ${variable}")
    return os.path.abspath(found)


def answer_of(command: Sequence[str]) -> Any:
    """What a program prints as JSON."""
    try:
        done = subprocess.run(command, stdin=subprocess.DEVNULL, capture_output=True, text=True, errors="replace",
                              check=False)
    except OSError as error:
        raise FarmError(f"{command[0]} could not be run: {error.strerror}") from None
    if done.returncode:
        raise FarmError(f"{' '.join(command)} failed: {last_line(done.stderr or done.stdout)}")
    try:
        return json.loads(done.stdout)
    except (ValueError, RecursionError):
        raise FarmError(f"{' '.join(command)} gave no JSON, but {done.stdout[:60]!r}") from None


def last_line(said: str) -> str:
    return (said.strip().splitlines() or ["it said nothing"])[-1]


def build_of(quarn: str) -> Build:
    entries = Fields(answer_of([quarn, "info", "--build", "--json"]), f"{quarn} info --build")
    return Build(entries.text("version"), entries.text("build"), entries.text("instructionSet"))


def scene_of(quarn: str, scene: str, deformer: Optional[str] = None) -> Scene:
    """Asks what the scene reads, and takes the sums of these files."""
    path = os.path.abspath(scene)
    command = [quarn, "info", path, "--files", "--json", *(["--deformer", deformer] if deformer else [])]
    entries = Fields(answer_of(command), f"{quarn} info --files")
    missing = set(entries.texts("missing", MANY))
    files = [SourceFile(file, 0, "missing") if file in missing else sums.source_file(file)
             for file in entries.texts("files", MANY)]
    return Scene(path, tuple(files), entries.optional("frames", entries.text),
                 entries.optional("deformer", entries.text), entries.texts("geometries", MANY))


# --- how long it takes ---

def timed(command: Callable[[Frames, Path], Sequence[str]], frames: Frames) -> Timing:
    """Runs the first frame, and then more of the first ones until they can be told from the start-up.

    `command`: the words that make these frames, into a folder that is there and empty.
    """
    say(f"timing the frame {frames.first}")
    first = measure(command, frames.run(0, 1))
    seconds, memory, count, total = 0.0, first.memory_mb, 1, first.seconds
    while count < frames.count and seconds < ENOUGH and total < LONGEST_TIMING:
        count = min(4 * count, frames.count)
        say(f"timing the first {count} frames")
        more = measure(command, frames.run(0, count))
        seconds, memory, total = more.seconds - first.seconds, max(memory, more.memory_mb), total + more.seconds
    each = max(seconds, 1e-6) / (count - 1) if count > 1 else first.seconds
    return Timing(max(first.seconds - each, 0.0), each, memory, count)


@dataclass(frozen=True)
class Measured:
    seconds: float
    memory_mb: int


def measure(command: Callable[[Frames, Path], Sequence[str]], frames: Frames) -> Measured:
    with tempfile.TemporaryDirectory(prefix="neuralWarp-farm-") as folder, tempfile.TemporaryFile() as output:
        words = command(frames, Path(folder))
        begin = time.monotonic()
        process = subprocess.Popen(words, stdin=subprocess.DEVNULL, stdout=output, stderr=output)
        try:
            _, status, usage = os.wait4(process.pid, 0)
        except BaseException:  # Ctrl-C
            process.terminate()
            process.wait()
            raise
        seconds = time.monotonic() - begin
        process.returncode = os.WEXITSTATUS(status) if os.WIFEXITED(status) else -os.WTERMSIG(status)
        if process.returncode:
            output.seek(0)
            raise FarmError(f"{' '.join(words)} ended with {process.returncode}: "
                            f"{last_line(output.read().decode(errors='replace'))}")
        return Measured(seconds, usage.ru_maxrss // 1024)


def say(text: str) -> None:
    print(f"neuralwarp-farm: {text}", file=sys.stderr, flush=True)
