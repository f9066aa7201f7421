# SPDX-License-Identifier: Apache-2.0
"""How far joints are turned for sampling: by Limit Rotation constraints, else as far as the file's actions turn them,
else by 30 degrees; in the form of quarn's limits.json (degrees, with 0 in every range)."""

from __future__ import annotations

import re
from math import degrees
from typing import Any, Dict, Iterator, List, Tuple

import bpy

from .character import Character, Joint
from .posing import is_follower, playing, turned
from .refused import Refused

Limits = Dict[str, Dict[str, List[float]]]  # joint, rotateX and so on, least and largest
Range = Tuple[float, float]

DEFAULT = 30.0
STILL = 0.1  # degrees that count for nothing
AXES = "XYZ"


def joints_to_pose(armature: Any, character: Character) -> List[Joint]:
    """All but those that follow others."""
    holding = [joint.bone for index, joint in enumerate(character.joints) if character.moves_vertices(index)]
    return [joint for joint in character.joints if not is_follower(armature, joint.bone, holding)]


def find_limits(armature: Any, character: Character) -> Tuple[Limits, str]:
    """The limits, and a sentence on where they come from. Refused where nothing turns."""
    joints = joints_to_pose(armature, character)
    limits = {joint.name: ranges for joint in joints
              if (ranges := limits_of_constraints(armature.pose.bones[joint.bone]))}
    source = [f"{len(limits)} bones by their Limit Rotation"] if limits else []
    root = placing_joint(character)
    free = [joint for joint in joints if joint.name not in limits and joint.name != root]
    moved = limits_of_actions(armature, free)
    if moved:
        source.append(f"{len(moved)} bones by the actions in the file")
    elif not limits:
        moved = default_limits(armature, character, free)
        source.append(f"{len(moved)} bones by {DEFAULT:g} degrees to both sides")
    limits.update(moved)
    if not limits:
        raise Refused(f"{armature.name} has no bone to pose: none holds vertices but the one that places them all")
    return limits, "posed are " + ", ".join(source)


def placing_joint(character: Character) -> str:
    """The joint that carries all others that hold vertices, if there are others: it places the character."""
    holding = [index for index in range(len(character.joints)) if character.moves_vertices(index)]
    first = holding[0]

    def is_below(index: int) -> bool:
        while index >= 0 and index != first:
            index = character.joints[index].parent
        return index == first
    return character.joints[first].name if len(holding) > 1 and all(map(is_below, holding)) else ""


def limits_of_constraints(bone: Any) -> Dict[str, List[float]]:
    for constraint in bone.constraints:
        if constraint.type == "LIMIT_ROTATION" and not constraint.mute and constraint.owner_space == "LOCAL":
            ranges = {axis: (degrees(getattr(constraint, f"min_{axis.lower()}")),
                             degrees(getattr(constraint, f"max_{axis.lower()}")))
                      for axis in AXES if getattr(constraint, f"use_limit_{axis.lower()}")}
            return as_limits(ranges)
    return {}


def as_limits(ranges: Dict[str, Range]) -> Dict[str, List[float]]:
    """With 0 in each; without those that are nearly nothing."""
    widened = {f"rotate{axis}": [min(least, 0.0), max(largest, 0.0)] for axis, (least, largest) in ranges.items()}
    return {axis: ends for axis, ends in widened.items() if ends[1] - ends[0] > STILL}


def default_limits(armature: Any, character: Character, joints: List[Joint]) -> Limits:
    holding = {joint.name for index, joint in enumerate(character.joints) if character.moves_vertices(index)}
    found = {}
    for joint in joints:
        locks = armature.pose.bones[joint.bone].lock_rotation
        axes = {f"rotate{axis}": [-DEFAULT, DEFAULT] for axis, is_locked in zip(AXES, locks) if not is_locked}
        if joint.name in holding and axes:
            found[joint.name] = axes
    return found


def actions_of(armature: Any) -> List[Any]:
    """Actions of the file that turn bones of this armature, and no bone that it does not have."""
    found = []
    for action in bpy.data.actions:
        bones = set(bones_of(action))
        if bones and all(bone in armature.pose.bones for bone in bones):
            found.append(action)
    return found


def bones_of(action: Any) -> Iterator[str]:
    for curve in action.fcurves:
        match = re.match(r'pose\.bones\["((?:[^"\\]|\\.)*)"\]\.', curve.data_path)
        if match:
            yield bpy.utils.unescape_identifier(match[1])


def limits_of_actions(armature: Any, joints: List[Joint]) -> Limits:
    """How far the actions turn these joints, constraints and drivers included."""
    ranges: Dict[str, Dict[str, Range]] = {joint.name: {} for joint in joints}
    actions = actions_of(armature)
    if not actions or not joints:
        return {}
    with playing(armature, actions) as data:
        for action in actions:
            data.action = action
            first, last = action.frame_range
            for frame in range(int(first), int(last) + 1):
                bpy.context.scene.frame_set(frame)
                evaluated = armature.evaluated_get(bpy.context.evaluated_depsgraph_get())
                for joint in joints:
                    widen(ranges[joint.name], turned(evaluated.pose.bones[joint.bone]).to_euler("XYZ"))
    return {name: limits for name, found in ranges.items() if (limits := as_limits(found))}


def widen(ranges: Dict[str, Range], angles: Any) -> None:
    for axis, angle in zip(AXES, angles):
        least, largest = ranges.get(axis, (0.0, 0.0))
        ranges[axis] = min(least, degrees(angle)), max(largest, degrees(angle))
