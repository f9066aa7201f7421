# SPDX-License-Identifier: Apache-2.0
"""Poses an armature joint by joint, and puts everything back afterwards.

The angles of a joint are quarn's: from the rest pose, about the joint's own axes, x first. A joint's matrix in its
parent is then REST * Z * Y * X (column vectors), which is what Blender makes of a pose bone's own rotation.
"""

from __future__ import annotations

from contextlib import contextmanager
from typing import Any, Callable, Dict, Iterator, List, Mapping, Sequence, Tuple

import bpy
import numpy as np
from mathutils import Euler, Matrix

from .character import Joint
from .refused import Refused

Angles = Tuple[float, float, float]  # radians, about x, y and z

CHAIN = {"IK", "SPLINE_IK"}  # constraints that move bones above theirs, too
CHANNELS = ("location", "rotation_quaternion", "rotation_euler", "rotation_axis_angle", "scale")
CLOSE = 1e-4  # of a rotation matrix: what single precision leaves along a chain of bones


def is_follower(armature: Any, bone: str, holding: Sequence[str]) -> bool:
    """Whether a pose bone follows others by a driver or by a constraint on a bone that holds vertices, as twist bones
    do: it is not posed."""
    data = armature.animation_data
    path = armature.pose.bones[bone].path_from_id() + ".rotation"
    if data and any(curve.data_path.startswith(path) and not curve.mute for curve in data.drivers):
        return True
    return any(getattr(constraint, "target", None) == armature and constraint.subtarget in holding
               for constraint in acting(armature.pose.bones[bone]) if constraint.type not in CHAIN)


def acting(bone: Any) -> List[Any]:
    """Constraints of a pose bone that move it to somewhere, and do not only limit it."""
    return [constraint for constraint in bone.constraints
            if not constraint.mute and constraint.influence > 0.0 and not constraint.type.startswith("LIMIT_")]


class Restorer:
    """Sets attributes, and in the end (`with`) sets them back, the last first."""

    def __init__(self) -> None:
        self._undo: List[Callable[[], None]] = []

    def __enter__(self) -> "Restorer":
        return self

    def __exit__(self, *_: object) -> None:
        problems = []
        while self._undo:
            try:
                self._undo.pop()()
            except (ReferenceError, AttributeError, RuntimeError, TypeError) as error:
                problems.append(str(error))  # the rest is put back all the same
        bpy.context.view_layer.update()
        if problems:
            raise Refused("not all could be put back as it was: " + "; ".join(problems))

    def set(self, owner: Any, name: str, value: Any) -> None:
        self.keep(owner, name)
        setattr(owner, name, value)

    def keep(self, owner: Any, name: str) -> None:
        value = getattr(owner, name)
        if hasattr(value, "__len__") and not isinstance(value, str):
            value = tuple(value)
        self._undo.append(lambda: setattr(owner, name, value))

    def then(self, undo: Callable[[], None]) -> None:
        self._undo.append(undo)


def keep_frame(restorer: Restorer, scene: Any) -> None:
    """After keep_pose(): the frame is put back before the pose, which it would change."""
    frame, part = scene.frame_current, scene.frame_subframe
    restorer.then(lambda: scene.frame_set(frame, subframe=part))


def keep_pose(restorer: Restorer, armature: Any) -> None:
    """The pose, the action and what else plays on the armature."""
    data = armature.animation_data
    if data and data.use_tweak_mode:
        raise Refused(f"{armature.name} is in the tweak mode of an NLA strip: leave it first")
    for bone in armature.pose.bones:
        for name in CHANNELS:
            restorer.keep(bone, name)
        restorer.keep(bone, "rotation_mode")  # put back before the rotation, which it would convert
    # an action that comes back plays first, and then bones go to where a hand had moved them
    restorer.then(bpy.context.view_layer.update)
    if data:
        restorer.keep(data, "use_nla")
        restorer.keep(data, "action")


def keep_path(restorer: Restorer, owner: Any, path: str) -> None:
    """What an f-curve's path leads to; nothing where it leads nowhere."""
    try:
        if path.endswith('"]'):  # a custom property
            base, _, name = path[:-2].rpartition('["')
            holder, name = owner.path_resolve(base) if base else owner, bpy.utils.unescape_identifier(name)
            value = holder[name]
            restorer.then(lambda: holder.__setitem__(name, value))
        else:
            base, _, name = path.rpartition(".")
            restorer.keep(owner.path_resolve(base) if base else owner, name)
    except (ValueError, KeyError, AttributeError):
        return


@contextmanager
def playing(armature: Any, actions: Sequence[Any]) -> Iterator[Any]:
    """The armature's animation data, with the first of these actions in it; all of them may be played. What they move
    is put back afterwards, whatever it is."""
    with Restorer() as restorer:
        if armature.animation_data is None:
            armature.animation_data_create()
            restorer.then(armature.animation_data_clear)
        for path in {curve.data_path for action in actions for curve in action.fcurves}:
            keep_path(restorer, armature, path)
        keep_pose(restorer, armature)
        keep_frame(restorer, bpy.context.scene)
        data: Any = armature.animation_data
        data.use_nla, data.action = False, actions[0]
        yield data


class Posing:
    """An armature at rest that takes poses: its action is off, and so is what else would move the posed bones."""

    def __init__(self, armature: Any, joints: Sequence[Joint], posed: Sequence[str]) -> None:
        """posed: names of joints."""
        self.armature, self.joints = armature, joints
        self.posed = [joint for joint in joints if joint.name in posed]
        self._restorer = Restorer()

    def __enter__(self) -> "Posing":
        try:
            self._begin()
        except BaseException:
            self._restorer.__exit__()
            raise
        return self

    def __exit__(self, *_: object) -> None:
        self._restorer.__exit__()

    def _begin(self) -> None:
        keep_pose(self._restorer, self.armature)
        keep_frame(self._restorer, bpy.context.scene)
        data = self.armature.animation_data
        bones = [self.armature.pose.bones[joint.bone] for joint in self.posed]
        if data:
            data.action, data.use_nla = None, False
            for curve in data.drivers:
                if any(curve.data_path.startswith(bone.path_from_id() + ".") for bone in bones):
                    self._restorer.set(curve, "mute", True)
        for bone in self.armature.pose.bones:
            for constraint in bone.constraints:
                if bone in bones or constraint.type in CHAIN:
                    self._restorer.set(constraint, "mute", True)
            bone.matrix_basis = Matrix()
        bpy.context.view_layer.update()

    def pose(self, angles: Mapping[str, Angles]) -> None:
        """Of joints by name; those that are not named are at rest."""
        places: Dict[str, Matrix] = {}  # of bones, as far as they are posed or at rest
        for joint in self.joints:
            bone = self.armature.pose.bones[joint.bone]
            turn = Euler(angles.get(joint.name, (0.0, 0.0, 0.0)), "XYZ").to_matrix().to_4x4()
            parent = bone.parent
            rest = bone.bone.matrix_local
            local = parent.bone.matrix_local.inverted() @ rest if parent else rest
            places[joint.bone] = (places[parent.name] if parent else Matrix()) @ local @ turn
            if joint not in self.posed:
                continue
            if bone.bone.use_inherit_rotation or parent is None:
                bone.matrix_basis = turn
            else:
                bone.matrix_basis = bone.bone.convert_local_to_pose(
                    places[joint.bone], rest, parent_matrix=places[parent.name],
                    parent_matrix_local=parent.bone.matrix_local, invert=True)
        bpy.context.view_layer.update()

    def check(self, angles: Mapping[str, Angles]) -> None:
        """Refused where a bone is not where pose() has put it."""
        evaluated = self.armature.evaluated_get(bpy.context.evaluated_depsgraph_get())
        for joint in self.posed:
            found = np.array(turned(evaluated.pose.bones[joint.bone]))
            wanted = np.array(Euler(angles.get(joint.name, (0.0, 0.0, 0.0)), "XYZ").to_matrix())
            if np.abs(found - wanted).max() > CLOSE:
                raise Refused(f"{self.armature.name}: the bone {joint.bone} does not stay where it is posed: something "
                              "else moves it")


def turned(bone: Any) -> Matrix:
    """[3, 3]: by how much a pose bone is turned from its rest in its parent."""
    rest, place = bone.bone.matrix_local, bone.matrix
    if bone.parent:
        rest = bone.parent.bone.matrix_local.inverted() @ rest
        place = bone.parent.matrix.inverted() @ place
    return rotation(rest).inverted() @ rotation(place)


def rotation(matrix: Matrix) -> Matrix:
    """[3, 3], without scale."""
    return matrix.to_3x3().normalized()
