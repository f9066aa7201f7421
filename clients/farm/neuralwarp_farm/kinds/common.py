# SPDX-License-Identifier: Apache-2.0
"""Arguments that several kinds of plans have, and what is made of them."""

import argparse
import math
import os
import re
from pathlib import Path
from typing import Optional

from ..counts import above_zero, megabytes, positive, whole
from ..errors import FarmError, UsageError
from ..facts import Build, Timing, say
from ..parts import Frames, count_for, cut, frames_of
from ..plan import ID, VARIABLE, Resources, SourceFile, read

MINUTES = 15.0           # of a part, where nothing was said
ROOM, SPARE_MB = 1.5, 500  # memory of a task: so many times what was seen, and that much more
MERGING = Resources(cpus=1, memory_mb=2000)


def add_folder(parser: argparse.ArgumentParser) -> None:
    parser.add_argument("-o", "--output", required=True, metavar="FOLDER", help="the folder of the plan, to be made")
    parser.add_argument("--name", help="how queues show it, if not as SCENE.KIND")
    parser.add_argument("--overwrite", action="store_true",
                        help="replace another plan, and remove what it has made in its folder")
    parser.add_argument("--quarn", metavar="PATH", help="the quarn of all nodes; if not given: $QUARN, "
                        "build/release/quarn/quarn of this checkout, the PATH")


def add_resources(parser: argparse.ArgumentParser) -> None:
    parser.add_argument("--cpus", type=positive, default=2, metavar="N", help="of a task, and its threads (default 2)")
    parser.add_argument("--memory", type=megabytes, dest="memory_mb", metavar="SIZE", help="of a task in MiB, or with "
                        "a unit as in 16G; if not given: half as much again as the timing took and 500, or 4000")
    parser.add_argument("--gpus", type=whole, default=0, metavar="N", help="of a task (default 0)")


def add_cutting(parser: argparse.ArgumentParser) -> None:
    parser.add_argument("--frames", metavar="A-B[xS]", help="the whole; if not given: the deformer's export range")
    how = parser.add_mutually_exclusive_group()
    how.add_argument("--minutes", type=above_zero, metavar="M", help="how long a part is to take, by the time of the "
                     f"first frames, which are run here for that (default {MINUTES:g})")
    how.add_argument("--parts", type=positive, metavar="N", help="how many parts; nothing is timed")
    parser.add_argument("--preroll", type=whole, default=0, metavar="N",
                        help="frames that are evaluated before each part, and not written (default 0)")


def add_environment(parser: argparse.ArgumentParser) -> None:
    parser.add_argument("--env", action="append", default=[], metavar="NAME[=VALUE]",
                        help="a variable that tasks get, with the value that it has here if none is given; may be "
                        "repeated")


# --- what they mean ---

def environment_of(arguments: argparse.Namespace) -> dict[str, str]:
    result: dict[str, str] = {}
    for text in arguments.env:
        name, equals, value = text.partition("=")
        if not VARIABLE.fullmatch(name):
            raise UsageError(f"--env is {text!r}, not NAME or NAME=VALUE")
        if not equals and name not in os.environ:
            raise UsageError(f"--env {name}: there is no such variable here, and no value was given")
        result[name] = value if equals else os.environ[name]
    return result


def folder_of(arguments: argparse.Namespace) -> Path:
    return Path(os.path.abspath(arguments.output))


def name_of(arguments: argparse.Namespace, default: str) -> str:
    """A name that can stand in a queue."""
    name: str = arguments.name or re.sub(r"[^A-Za-z0-9._-]+", "_", default).lstrip("._-")[:100]
    if not ID.fullmatch(name):
        raise UsageError(f"--name is {name!r}: it takes letters, digits, '.', '_' and '-', and begins with one of the "
                         "first two")
    return name


def path_in(folder: Path, wanted: Optional[str], default: str) -> str:
    """A path as plan.json has it: from the plan's folder where it lies in it, else absolute."""
    if wanted is None:
        return default
    path = os.path.abspath(wanted)
    return os.path.relpath(path, folder) if path.startswith(f"{folder}{os.sep}") else path


def whole_of(arguments: argparse.Namespace, export_range: Optional[str]) -> Frames:
    text = arguments.frames or export_range
    if not text:
        raise UsageError(f"{arguments.scene} has no deformer with an export range: say --frames A-B")
    return frames_of(text)


def parts_of(arguments: argparse.Namespace, whole: Frames, timing: Optional[Timing]) -> list[Frames]:
    """`timing` is there unless --parts is."""
    if timing is None:
        if arguments.parts > whole.count:
            raise UsageError(f"--parts is {arguments.parts}, and there are {whole.count} frames")
        return cut(whole, arguments.parts)
    # a part has to evaluate what rolls up to it, and the frame behind it
    before, minutes = timing.seconds(arguments.preroll + 1), arguments.minutes or MINUTES
    count = count_for(whole, minutes, before, timing.seconds_a_frame)
    if count > 1 and before > 30 * minutes:
        say(f"{before:.3g} s of the {60 * minutes:.3g} s of each part are spent before its first frame: longer parts "
            "would take less in all")
    return cut(whole, count)


def earlier(arguments: argparse.Namespace, build: Build, files: tuple[SourceFile, ...],
            whole: Frames) -> Optional[Timing]:
    """What was timed for the plan that is in the folder, if that is of the same: a command, given again, makes the
    same plan."""
    if arguments.overwrite:
        return None
    try:
        plan = read(folder_of(arguments))
    except FarmError:
        return None
    if (plan.kind, plan.build, plan.files, plan.frames) != (arguments.kind, build.build, files, str(whole)):
        return None
    if plan.start_seconds is None or plan.seconds_a_frame is None:
        return None
    return Timing(plan.start_seconds, plan.seconds_a_frame, plan.tasks[0].resources.memory_mb, 0)


def resources_of(arguments: argparse.Namespace, timing: Optional[Timing], frames: int) -> Resources:
    """`frames`: that are evaluated."""
    memory = arguments.memory_mb
    if memory is None:
        memory = 100 * math.ceil((timing.memory_mb * ROOM + SPARE_MB) / 100) if timing else Resources.memory_mb
    minutes = round(timing.seconds(frames) / 60, 3) if timing else 0
    return Resources(arguments.cpus, memory, arguments.gpus, minutes)
