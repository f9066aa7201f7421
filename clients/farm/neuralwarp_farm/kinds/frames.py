# SPDX-License-Identifier: Apache-2.0
"""What quarn makes frame by frame: data sets and caches in parts that are merged, and files a frame."""

import argparse
import os
import re
from dataclasses import dataclass
from pathlib import Path
from typing import Optional

from .. import facts, sums
from ..errors import UsageError
from ..parts import Frames, names
from ..plan import Plan, Result, SourceFile, Task
from . import common

OPTION = re.compile(r"([a-z][a-z-]*)(?:=(.*))?", re.DOTALL)
# what a plan says itself, or what would leave a task's result elsewhere
OWN = {"frames", "of", "preroll", "output", "threads", "overwrite", "skip-existing", "deformer", "geometry", "json",
       "progress", "repeat", "help"}
PATHS = {"plugin", "like"}  # options whose value is a path, which tasks read from another folder
MERGED = {"export": "dataset", "bake": "cache"}


def add_arguments(parser: argparse.ArgumentParser) -> None:
    """For the kind that is the parser's default: export, bake, play or render."""
    kind = parser.get_default("kind")
    parser.add_argument("scene", metavar="SCENE", help="the scene file")
    if kind == "bake":
        parser.add_argument("plug", metavar="PLUG", help="the mesh, as skin.outputGeom[0]")
    common.add_folder(parser)
    if kind in MERGED:
        parser.add_argument("--result", metavar={"export": "SET", "bake": "FILE.npy"}[kind],
                            help="what the parts are merged into; if not given: result in the plan's folder")
    else:
        example = {"play": "FILE.####.obj", "render": "FILE.####.png"}[kind]
        parser.add_argument("--result", required=True, metavar=example,
                            help="the files to write; #### is the number of the frame")
    common.add_cutting(parser)
    parser.add_argument("--deformer", metavar="NAME", help="if not given: the only one")
    if kind != "bake":
        parser.add_argument("--geometry", metavar="INDEX|NAME",
                            help="one of the deformer's; if not given: the only one")
    common.add_resources(parser)
    common.add_environment(parser)
    parser.add_argument("--pass", dest="passed", action="append", default=[], metavar="NAME[=VALUE]",
                        help=f"a further option of quarn {kind}, without its dashes; may be repeated")


def make_plan(arguments: argparse.Namespace) -> Plan:
    folder = common.folder_of(arguments)
    quarn = facts.find_quarn(arguments.quarn)
    build = facts.build_of(quarn)
    passed = passed_words(arguments.passed)
    scene = facts.scene_of(quarn, arguments.scene, arguments.deformer)
    check_geometry(arguments, scene)
    whole = common.whole_of(arguments, scene.frames)
    work = Work(arguments.kind, scene.path, getattr(arguments, "plug", None), whole, arguments.preroll,
                tuple(selection(arguments)) + tuple(passed))
    result = common.path_in(folder, arguments.result, "result.npy" if arguments.kind == "bake" else "result")
    check_result(arguments.kind, result)
    files = scene.files + plugins(passed)
    timing = None
    if not arguments.parts:
        timing = common.earlier(arguments, build, files, whole) or facts.timed(
            lambda frames, place: timed_words(work, quarn, arguments, frames, place, result), whole)
    pieces = common.parts_of(arguments, whole, timing)
    tasks = [task_of(work, piece, name, result, common.resources_of(arguments, timing, work.evaluated(piece)))
             for piece, name in zip(pieces, names(len(pieces)))]
    if work.is_merged:
        tasks.append(merge_of(work.kind, tasks, result))
    return Plan(folder, work.kind, common.name_of(arguments, f"{Path(scene.path).stem}.{work.kind}"), build.version,
                build.build, {"quarn": quarn}, files, str(whole),
                timing.seconds_a_frame if timing else None, timing.start_seconds if timing else None,
                common.environment_of(arguments), tuple(tasks))


# --- one command of quarn ---

@dataclass(frozen=True)
class Work:
    kind: str
    scene: str                 # absolute
    plug: Optional[str]
    whole: Frames
    preroll: int
    options: tuple[str, ...]

    @property
    def is_merged(self) -> bool:
        return self.kind in MERGED

    def before(self, frames: Frames) -> int:
        """Frames that are evaluated before these, and not written: of the whole, and of nothing before it."""
        return min(self.preroll, (frames.first - self.whole.first) // self.whole.step)

    def evaluated(self, frames: Frames) -> int:
        """With the frame behind the last, by which a part is held against the next."""
        seam = self.is_merged and frames.last != self.whole.last
        return self.before(frames) + frames.count + int(seam)

    def words(self, frames: Frames, output: str) -> tuple[str, ...]:
        plug = [self.plug] if self.plug else []
        which = [] if self.kind == "play" else ["--of", str(self.whole)]
        # of the whole, quarn itself rolls up to no frame before its first
        before = self.before(frames) if self.kind == "play" else self.preroll
        which += (["--preroll", str(before)] if before else []) + ([] if self.is_merged else ["--skip-existing"])
        return ("{quarn}", self.kind, self.scene, *plug, "-o", output, "--frames", str(frames), *which, *self.options,
                "--threads", "{threads}")


def timed_words(work: Work, quarn: str, arguments: argparse.Namespace, frames: Frames, place: Path,
                result: str) -> list[str]:
    """The command of these frames, into a folder that goes again."""
    output = {"export": "set", "bake": "cache.npy"}.get(work.kind, os.path.basename(result))
    threads = str(min(arguments.cpus, os.cpu_count() or 1))
    values = {"{quarn}": quarn, "{threads}": threads}
    return [values.get(word, word) for word in work.words(frames, str(place / output))]


def task_of(work: Work, frames: Frames, name: str, whole_result: str, resources: common.Resources) -> Task:
    if work.is_merged:
        result = Result(MERGED[work.kind], f"parts/{name}" + (".npy" if work.kind == "bake" else ""))
        output = result.path
    else:
        folder, pattern = os.path.split(whole_result)
        files = tuple(frame_file(pattern, frames.frame(number)) for number in range(frames.count))
        result, output = Result("frames", folder or ".", files), whole_result
    return Task(f"part-{name}", work.words(frames, output), (), result, resources, str(frames))


def merge_of(kind: str, parts: list[Task], result: str) -> Task:
    command = ("{quarn}", "merge", *(part.result.path for part in parts), "-o", result)
    return Task("merge", command, tuple(part.id for part in parts), Result(MERGED[kind], result), common.MERGING)


def frame_file(pattern: str, frame: int) -> str:
    """The number goes where the last # are, with as many digits at least."""
    head, places, rest = re.fullmatch(r"(.*?)(#+)([^#]*)", pattern, re.DOTALL).groups()  # type: ignore[union-attr]
    return f"{head}{'-' if frame < 0 else ''}{abs(frame):0{len(places)}d}{rest}"


# --- what was said ---

def selection(arguments: argparse.Namespace) -> list[str]:
    words = ["--deformer", arguments.deformer] if arguments.deformer and arguments.kind != "bake" else []
    geometry = getattr(arguments, "geometry", None)
    return words + (["--geometry", geometry] if geometry else [])


def check_geometry(arguments: argparse.Namespace, scene: facts.Scene) -> None:
    """A data set is of one geometry, and so is a plan of it; so is what is played."""
    if arguments.kind in ("export", "play") and arguments.geometry is None and len(scene.geometries) > 1:
        raise UsageError(f"{scene.deformer} of {scene.path} has {len(scene.geometries)} geometries, "
                         f"{', '.join(scene.geometries)}: make a plan for each, with --geometry")


def check_result(kind: str, result: str) -> None:
    name = os.path.basename(result)
    if kind == "bake" and not name.endswith(".npy"):
        raise UsageError(f"--result is {result}: the parts of a bake are merged into a file that ends in .npy")
    if kind not in MERGED and "#" not in name:
        raise UsageError(f"--result is {result}: put #### where the number of the frame goes. What takes all frames in "
                         "one file is for plan bake")


def passed_words(passed: list[str]) -> list[str]:
    words = []
    for text in passed:
        found = OPTION.fullmatch(text)
        if not found:
            raise UsageError(f"--pass is {text!r}, not NAME or NAME=VALUE, without dashes")
        name, value = found.groups()
        if name in OWN:
            raise UsageError(f"--pass {name} is the plan's own to say")
        value = os.path.abspath(value) if value and name in PATHS else value
        words.append(f"--{name}" if value is None else f"--{name}={value}")
    return words


def plugins(passed: list[str]) -> tuple[SourceFile, ...]:
    """Files that were passed on, and that tasks read: they are not to change either."""
    paths = [word.partition("=")[2] for word in passed if word.startswith("--plugin=")]
    return tuple(sums.source_file(path) for path in paths)
