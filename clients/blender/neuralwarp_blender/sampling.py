# SPDX-License-Identifier: Apache-2.0
"""Sample: poses drawn by quarn are played on the user's armature, and the mesh is evaluated as the armature alone makes
it (the skin) and with all that is learned (the targets).

The work is a generator, of which every step says how far it is: an operator takes a step at a time, and a script all of
them. However it ends, closed in the middle included, pose, frame, action, modifiers and keys are as they were.
"""

from __future__ import annotations

import contextlib
import json
import os
import shutil
import subprocess
import time
from dataclasses import dataclass
from pathlib import Path
from typing import Any, Callable, Dict, Iterator, List, Mapping, Sequence, Tuple

import bpy
import numpy as np
from mathutils import Euler
from numpy.typing import NDArray

from . import jobs, preferences
from .character import Character, read_character, to_mesh, write_character
from .limits import actions_of, find_limits
from .pose import KINDS, inverses, joint_values, unoriented
from .posing import Angles, Posing, playing
from .refused import Refused
from .run_folder import RunFolder, folder_of, write_json
from .stack import Stack, Switches, evaluated_points, read_stack, topology

Progress = Tuple[str, int, int]  # what is done, how much of it, of how much
Say = Callable[[str, str], None]  # "INFO" or "WARNING", and a sentence
Array = NDArray[np.float32]

STILL = 1e-6  # a joint's value that moves by less than this (radians, or parts of 1) has no keys
CHECKED = 3  # poses in which the bones are looked at


@dataclass(frozen=True)
class Settings:
    samples: int = 600
    held_out: int = 60  # drawn poses that are never trained; none with a motion
    motion: str = ""  # instead: the name of an action
    activation_rate: float = 0.5
    seed: int = 1
    hold: int = 24  # frames for which a pose is held, for modifiers with a memory


@dataclass(frozen=True)
class Rig:
    thing: Any
    armature: Any
    stack: Stack
    settings: Settings
    folder: RunFolder
    say: Say


def sample(thing: Any, settings: Settings, say: Say) -> Iterator[Progress]:
    """Samples a mesh object into its folder (run_folder.folder_of). say: gets sentences for the user. Raises
    Refused, before anything was changed or after it was put back."""
    if getattr(thing, "neuralwarp", None) is not None and thing.neuralwarp.in_use:
        raise Refused(f"{thing.name} uses a model: stop that first")
    stack = read_stack(thing)
    for note in stack.notes:
        say("WARNING", note)
    rig = Rig(thing, bpy.data.objects[stack.armature], stack, settings, folder_of(thing), say)
    check_settings(rig)
    yield "looking at the rig", 0, 1
    begin_folder(rig.folder)
    with Switches(thing) as switches:
        character = character_at_rest(rig, switches)
        limits, source = find_limits(rig.armature, character)
        rig.say("INFO", f"{thing.name}: {source}")
        write_character(character, rig.folder.character)
        rig.folder.limits.write_text(json.dumps(limits, indent=1) + "\n", encoding="utf-8")
        if settings.motion:
            yield from sample_motion(rig, character, switches)
        write_json(rig.folder.recipe, recipe(rig))
        yield from draw_poses(rig)
        yield from sample_poses(rig, character, list(limits), switches)
    targets = {"targets": "targets.npy", "skin": "skin.npy"}
    if settings.motion:
        targets.update({"motion-targets": "motion_targets.npy", "motion-skin": "motion_skin.npy"})
    write_json(rig.folder.recipe, {**recipe(rig), **targets})
    write_json(rig.folder.rig, rig_facts(rig, character))
    yield "sampled", 1, 1


def check_settings(rig: Rig) -> None:
    if not preferences.paths().quarn:
        raise Refused("the program quarn was not found: say where it is in the add-on's preferences")
    if jobs.status(rig.folder).state == "runs":
        raise Refused(f"the training of {rig.thing.name} runs: cancel it before sampling again")
    if rig.settings.motion:
        action = bpy.data.actions.get(rig.settings.motion)
        if action is None or action not in actions_of(rig.armature):
            raise Refused(f"{rig.settings.motion} is no action of {rig.armature.name}")
        if rig.stack.held:
            raise Refused(f"{rig.thing.name}: {rig.stack.held[0]} is learned at rest, pose by pose; a motion of it "
                          "would be another shape. Hold out drawn poses instead")
    for name in rig.stack.held:
        rig.say("INFO", f"{rig.thing.name}: {name} is learned as it comes to rest: each pose is held for "
                f"{rig.settings.hold} frames")


def begin_folder(folder: RunFolder) -> None:
    folder.path.mkdir(parents=True, exist_ok=True)
    # what is half sampled is not trained, and what was trained of other samples is not published
    for old in (folder.rig, folder.recipe, folder.motion, folder.job, folder.ended):
        old.unlink(missing_ok=True)


def character_at_rest(rig: Rig, switches: Switches) -> Character:
    with Posing(rig.armature, (), ()):
        return read_character(rig.thing, rig.armature, rig.stack, switches)


def recipe(rig: Rig) -> Dict[str, Any]:
    settings = rig.settings
    content: Dict[str, Any] = {
        "character": "character.glb", "limits": "limits.json", "samples": settings.samples, "seed": settings.seed,
        "activation-rate": settings.activation_rate, "order": "file",
        "import-option": ["--meters-per-unit", repr(meters_per_unit(rig.thing))]}
    if settings.motion:
        content["motion"] = "motion.json"
    else:
        content["held-out"] = settings.held_out
    return content


def meters_per_unit(thing: Any) -> float:
    """Of the mesh's object space."""
    scale = abs(thing.matrix_world.determinant()) ** (1 / 3)
    return float(np.float32(scale * bpy.context.scene.unit_settings.scale_length))


def rig_facts(rig: Rig, character: Character) -> Dict[str, Any]:
    """What a published model says of the mesh."""
    return {"format": "neuralWarp Blender rig", "version": 1, "mesh": rig.thing.name, "armature": rig.armature.name,
            "vertices": len(character.points), "topology": topology(rig.thing.data),
            "bones": [{"bone": joint.bone, "joint": joint.name} for joint in character.joints],
            "muted": {"modifiers": rig.stack.muted_modifiers, "shapeKeys": list(rig.stack.shape_keys)},
            "metersPerUnit": meters_per_unit(rig.thing)}


def draw_poses(rig: Rig) -> Iterator[Progress]:
    """By quarn, which also says which angles the joints have in them."""
    quarn, folder = preferences.paths().quarn, rig.folder
    yield from program([quarn, "run", "--recipe", str(folder.recipe), "-o", str(folder.run), "--until", "poses"],
                       "drawing poses")
    yield from program([quarn, "pose", str(folder.run / "poses.json"), "--write", str(folder.poses)], "drawing poses")


def program(words: Sequence[str], doing: str) -> Iterator[Progress]:
    """Runs one and waits, a step at a time. Refused with the end of what it said where it fails."""
    try:
        child = subprocess.Popen(words, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.STDOUT,
                                 text=True, errors="replace")
    except OSError as error:
        raise Refused(f"{words[0]} cannot be started: {error.strerror}") from None
    try:
        while True:
            with contextlib.suppress(subprocess.TimeoutExpired):
                said, _ = child.communicate(timeout=0.2)
                break
            yield doing, 0, 1
    finally:
        if child.poll() is None:
            child.terminate()
            child.communicate()
    if child.returncode != 0:
        raise Refused(f"quarn {words[1]}: " + " / ".join(said.strip().splitlines()[-3:]))


def read_poses(path: Path) -> List[Dict[str, Angles]]:
    """Of every frame the angles of the joints that move at all: what `quarn pose --write` made."""
    keys = json.loads(path.read_text(encoding="utf-8"))["keys"]
    count = max((len(values) for values in keys.values()), default=0)
    frames: List[Dict[str, List[float]]] = [{} for _ in range(count)]
    for plug, values in keys.items():
        joint, attribute = plug.split(".")
        for frame, (_, value) in zip(frames, values):
            frame.setdefault(joint, [0.0, 0.0, 0.0])["XYZ".index(attribute[-1])] = value
    return [{joint: (values[0], values[1], values[2]) for joint, values in frame.items()} for frame in frames]


class Caches:
    """A skin and its targets, frame by frame, [frames, vertices, 3]: files that are there when all is written."""

    def __init__(self, files: Sequence[Path], frames: int, vertices: int) -> None:
        self.files = files
        self.frames = frames
        self._parts = [file.with_name(file.name + ".part") for file in files]
        self._room(4 * 3 * frames * vertices * len(files))
        self._arrays = [np.lib.format.open_memmap(part, mode="w+", dtype="<f4", shape=(frames, vertices, 3))
                        for part in self._parts]

    def _room(self, wanted: int) -> None:
        free = shutil.disk_usage(self.files[0].parent).free
        if free < wanted:
            raise Refused(f"{self.files[0].parent} has room for {free >> 20} MiB, and the samples need "
                          f"{wanted >> 20} MiB")

    def __enter__(self) -> "Caches":
        return self

    def __exit__(self, kind: object, *_: object) -> None:
        for array in self._arrays:
            array.flush()
        self._arrays = []
        for part, file in zip(self._parts, self.files):
            if kind is None:
                os.replace(part, file)
            else:
                part.unlink(missing_ok=True)

    def take(self, frame: int, which: int, points: Array, rig: Rig) -> None:
        array = self._arrays[which]
        if points.shape != array.shape[1:]:
            raise Refused(f"{rig.thing.name}: in frame {frame + 1} the modifiers make {len(points)} vertices, and "
                          f"there are {array.shape[1]}: one that changes their number must be off")
        if not np.isfinite(points).all():
            vertex = int(np.flatnonzero(~np.isfinite(points).all(axis=1))[0])
            raise Refused(f"{rig.thing.name}: in frame {frame + 1} the place of vertex {vertex} is no number")
        array[frame] = points


def take_both(rig: Rig, caches: Caches, frame: int, switches: Switches) -> None:
    switches.skin(rig.stack)
    caches.take(frame, 0, evaluated_points(rig.thing), rig)
    switches.full(rig.stack)
    if rig.stack.held:
        come_to_rest(rig)
    caches.take(frame, 1, evaluated_points(rig.thing), rig)


def come_to_rest(rig: Rig) -> None:
    """Starts the memory of the modifiers anew, and holds the pose. At its first frame a simulation drops what it knows,
    as the pose is another."""
    start = min(rig.thing.modifiers[name].point_cache.frame_start for name in rig.stack.held)
    for frame in range(start, start + rig.settings.hold + 1):
        bpy.context.scene.frame_set(frame)


def sample_poses(rig: Rig, character: Character, posed: Sequence[str], switches: Switches) -> Iterator[Progress]:
    poses = read_poses(rig.folder.poses)
    files = (rig.folder.skin, rig.folder.targets)
    with Posing(rig.armature, character.joints, posed) as posing, \
            Caches(files, len(poses), len(character.points)) as caches:
        for frame, angles in enumerate(poses):
            posing.pose(angles)
            if frame < CHECKED:
                posing.check(angles)
            take_both(rig, caches, frame, switches)
            yield "sampling poses", frame + 1, len(poses)


def sample_motion(rig: Rig, character: Character, switches: Switches) -> Iterator[Progress]:
    """The action as it is, constraints and drivers included: skin, targets, and the joints as keys for quarn."""
    action = bpy.data.actions[rig.settings.motion]
    first, last = (int(frame) for frame in action.frame_range)
    count = last - first + 1
    files = (rig.folder.motion_skin, rig.folder.motion_targets)
    track = JointTrack(character)
    with playing(rig.armature, [action]), Caches(files, count, len(character.points)) as caches:
        for frame in range(count):
            bpy.context.scene.frame_set(first + frame)
            graph = bpy.context.evaluated_depsgraph_get()
            track.take(rig.thing.evaluated_get(graph), rig.armature.evaluated_get(graph))
            take_both(rig, caches, frame, switches)
            yield f"sampling {action.name}", frame + 1, count
    keys = track.keys()
    if not keys:
        raise Refused(f"the action {action.name} moves no bone that holds {rig.thing.name}")
    write_json(rig.folder.motion, {"unit": "radians", "interpolation": "linear", "keys": keys})


class JointTrack:
    """What joints do over frames, as quarn's attributes have it. Matrices here are of row vectors, as in pose.py."""

    def __init__(self, character: Character) -> None:
        self.joints = character.joints
        self._parents = np.array([joint.parent for joint in self.joints], dtype=np.intp)
        # one more for joints without a parent: the last, which -1 is
        self._worlds = np.stack([*(joint.rest.T for joint in self.joints), np.eye(4)])
        self._unoriented = unoriented(self._local())
        self._rest = self._values()
        self.frames: List[NDArray[np.float64]] = []  # [joints, 3, 3]: translate, rotate, scale

    def _local(self) -> NDArray[np.float64]:
        return np.asarray(self._worlds[:-1] @ inverses(self._worlds[self._parents]))

    def _values(self) -> NDArray[np.float64]:
        values = np.empty((len(self.joints), 3, 3))
        joint_values(self._local(), self._unoriented, ["xyz"] * len(self.joints), values)
        return values

    def take(self, thing: Any, armature: Any) -> None:
        """thing, armature: evaluated."""
        place = to_mesh(thing, armature).T
        for number, joint in enumerate(self.joints):
            self._worlds[number] = np.array(armature.pose.bones[joint.bone].matrix).T @ place
        values = self._values()
        if self.frames:
            bring_near(values[:, 1], self.frames[-1][:, 1])
        self.frames.append(values)

    def keys(self) -> Mapping[str, List[List[float]]]:
        values = np.stack(self.frames)
        found = {}
        for index, joint in enumerate(self.joints):
            still = STILL * max(1.0, float(np.abs(self._rest[index]).max()))
            for kind, axis in np.ndindex(3, 3):
                curve = values[:, index, kind, axis]
                if np.abs(curve - self._rest[index, kind, axis]).max() > still:
                    found[f"{joint.name}.{KINDS[kind]}{'XYZ'[axis]}"] = [[1.0 + frame, float(value)]
                                                                         for frame, value in enumerate(curve)]
        return found


def bring_near(angles: NDArray[np.float64], before: NDArray[np.float64]) -> None:
    """[joints, 3], x first: takes of the angles that turn alike those nearest to the ones of the frame before."""
    for angle, of_before in zip(angles, before):
        turn = Euler(angle, "XYZ")
        turn.make_compatible(Euler(of_before, "XYZ"))
        angle[:] = turn


def sample_all(thing: Any, settings: Settings, say: Say = print) -> None:
    """In one go, for scripts."""
    shown = time.monotonic()
    for doing, done, total in sample(thing, settings, say):
        if time.monotonic() - shown > 5.0:
            shown = time.monotonic()
            print(f"{doing}: {done} of {total}", flush=True)
