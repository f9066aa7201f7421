# SPDX-License-Identifier: Apache-2.0
"""Targets by a program of the user's: a part each, by target_part.py, and one cache of all in the end."""

import argparse
import os
import shutil
import sys
from dataclasses import dataclass
from pathlib import Path
from typing import Optional

from .. import facts, sums, task
from ..errors import FarmError, UsageError
from ..parts import Frames, names
from ..plan import Plan, Result, SourceFile, Task
from . import common
from .frames import check_result, merge_of
from .target_scene import read_scene


def add_arguments(parser: argparse.ArgumentParser) -> None:
    parser.add_argument("scene", metavar="SCENE", help="the scene file, with its poses")
    common.add_folder(parser)
    parser.add_argument("--result", metavar="FILE.npy",
                        help="what the parts are merged into; if not given: result.npy in the plan's folder")
    common.add_cutting(parser)
    parser.add_argument("--deformer", metavar="NAME", help="if not given: the only one")
    parser.add_argument("--geometry", metavar="NAME", help="one of the deformer's meshes; if not given: the only one")
    parser.add_argument("--order", choices=("scene", "file"), default="scene",
                        help="of the vertices of skin and targets: the scene's, or those of the character's file")
    parser.add_argument("--no-seam", dest="seam", action="store_false",
                        help="ask for no frame more in each part, by which the merge sees whether a part begins as the "
                        "one before went on: for a program that gives other bytes each time")
    common.add_resources(parser)
    common.add_environment(parser)
    parser.add_argument("program", nargs="+", metavar="PROGRAM ARG",
                        help="behind --: what docs/run.md calls a target command. A word that names a file is passed "
                        "with its whole path; {threads} is the number of cores that a task has")


def make_plan(arguments: argparse.Namespace) -> Plan:
    folder = common.folder_of(arguments)
    quarn = facts.find_quarn(arguments.quarn)
    build = facts.build_of(quarn)
    scene = facts.scene_of(quarn, arguments.scene, arguments.deformer)
    whole = common.whole_of(arguments, scene.frames)
    program, own_files = whole_words(arguments.program)
    work = work_of(arguments, scene, whole, program)
    result = common.path_in(folder, arguments.result, "result.npy")
    check_result("bake", result)
    files = scene.files + own_files
    timing = None
    if not arguments.parts:
        timing = common.earlier(arguments, build, files, whole) or facts.timed(
            lambda frames, place: timed_words(work, quarn, arguments, frames, place), whole)
    pieces = common.parts_of(arguments, whole, timing)
    tasks = [Task(f"part-{name}", work.words(piece, f"{{folder}}/parts/{name}.npy"), (),
                  Result("cache", f"parts/{name}.npy"),
                  common.resources_of(arguments, timing, work.asked(piece)), str(piece))
             for piece, name in zip(pieces, names(len(pieces)))]
    return Plan(folder, "targets", common.name_of(arguments, f"{Path(scene.path).stem}.targets"), build.version,
                build.build, {"quarn": quarn}, files, str(whole),
                timing.seconds_a_frame if timing else None, timing.start_seconds if timing else None,
                common.environment_of(arguments), (*tasks, merge_of("bake", tasks, result)))


@dataclass(frozen=True)
class Work:
    scene: str               # absolute
    deformer: str
    geometry: str
    order: str
    whole: Frames
    preroll: int
    seam: bool
    program: tuple[str, ...]

    def asked(self, frames: Frames) -> int:
        return frames.count + int(self.seam and frames.last != self.whole.last)

    def words(self, frames: Frames, output: str) -> tuple[str, ...]:
        return ("{python}", "-m", "neuralwarp_farm.kinds.target_part", "--quarn", "{quarn}", "--scene", self.scene,
                "--deformer", self.deformer, "--geometry", self.geometry, "--order", self.order,
                "--first", str(frames.first), "--last", str(frames.last),
                "--whole", str(self.whole.first), str(self.whole.last), "--preroll", str(self.preroll),
                *(["--seam"] if self.seam else []), "--threads", "{threads}", "--output", output, "--", *self.program)


def work_of(arguments: argparse.Namespace, scene: facts.Scene, whole: Frames, program: tuple[str, ...]) -> Work:
    if whole.step != 1:
        raise UsageError(f"--frames {whole} leaves frames out, and a cache of targets has one for each frame")
    if scene.deformer is None:
        raise FarmError(f"{scene.path} has no deformer, for whose mesh a program could make targets")
    geometry = chosen_geometry(scene, arguments.geometry)
    read_scene(Path(scene.path), scene.deformer, geometry)  # what every task would stumble over
    return Work(scene.path, scene.deformer, geometry, arguments.order, whole, arguments.preroll, arguments.seam,
                program)


def timed_words(work: Work, quarn: str, arguments: argparse.Namespace, frames: Frames, place: Path) -> list[str]:
    values = {"python": sys.executable, "quarn": quarn, "threads": str(min(arguments.cpus, os.cpu_count() or 1))}
    words = [task.PLACEHOLDER.sub(lambda found: values.get(found[1], found[0]), word)
             for word in work.words(frames, str(place / "targets.npy"))]
    variables = {"PYTHONPATH": str(task.PACKAGES), **common.environment_of(arguments)}
    return ["env", *(f"{name}={value}" for name, value in variables.items()), *words]


def chosen_geometry(scene: facts.Scene, wanted: Optional[str]) -> str:
    if wanted is None and len(scene.geometries) == 1:
        return scene.geometries[0]
    if wanted is None or wanted not in scene.geometries:
        raise UsageError(f"{scene.deformer} of {scene.path} deforms {', '.join(scene.geometries)}: name one of them "
                         "with --geometry" + (f", not {wanted}" if wanted else "") + ", and make a plan for each")
    return wanted


def whole_words(words: list[str]) -> tuple[tuple[str, ...], tuple[SourceFile, ...]]:
    """Words that name files with their whole paths; and these files, so that tasks notice when one is edited. What is
    installed is each node's own."""
    if shutil.which(words[0]) is None:
        raise FarmError(f"{words[0]} is no program that could be started here")
    paths = [os.path.abspath(word) if os.path.isfile(word) else word for word in words]
    own = paths[1:] if os.path.dirname(paths[0]) in os.get_exec_path() else paths
    return tuple(paths), tuple(sums.source_file(path) for path in own if os.path.isfile(path))
