# SPDX-License-Identifier: Apache-2.0
"""A limb of two bones for the test of target commands: blender -b --factory-startup --python arm.py -- FOLDER.

arm.glb is the character; arm.blend the same in a user's file, with its vertices the other way round, lifted by LIFT
behind the armature; other.blend is thicker.
"""

import sys
from math import cos, pi, sin
from pathlib import Path
from typing import List, Tuple

import bpy
import numpy

LIFT = 0.0625  # upwards
SIDES, RINGS, RADIUS, LENGTH = 7, 9, 0.3, 2.0

Point = Tuple[float, float, float]


def ring(width: float, height: float) -> List[Point]:
    return [(width * RADIUS * cos(2 * pi * side / SIDES), 0.7 * RADIUS * sin(2 * pi * side / SIDES), height)
            for side in range(SIDES)]


def make_mesh(is_reversed: bool, width: float) -> bpy.types.Object:
    points = [point for row in range(RINGS) for point in ring(width, LENGTH * row / (RINGS - 1))]
    quads = [[SIDES * (row + up) + (side + turn) % SIDES for up, turn in ((0, 0), (0, 1), (1, 1), (1, 0))]
             for row in range(RINGS - 1) for side in range(SIDES)]
    if is_reversed:
        points = points[::-1]
        quads = [[len(points) - 1 - corner for corner in quad] for quad in quads]
    mesh = bpy.data.meshes.new("limb")
    mesh.from_pydata(points, [], quads)
    thing = bpy.data.objects.new("limb", mesh)
    bpy.context.scene.collection.objects.link(thing)
    return thing


def make_armature() -> bpy.types.Object:
    bpy.ops.object.armature_add()
    armature = bpy.context.object
    bpy.ops.object.mode_set(mode="EDIT")
    upper = armature.data.edit_bones[0]
    upper.name, upper.head, upper.tail, upper.roll = "upper-arm.L", (0, 0, 0), (0.1, 0, 1), 0.4
    lower = armature.data.edit_bones.new("lower-arm.L")
    lower.head, lower.tail, lower.roll, lower.parent = (0.1, 0, 1), (0, 0.1, LENGTH), -1.0, upper
    bpy.ops.object.mode_set(mode="OBJECT")
    return armature


def make_arm(is_reversed: bool, width: float = 1.0) -> bpy.types.Object:
    bpy.ops.wm.read_factory_settings(use_empty=True)
    armature = make_armature()
    limb = make_mesh(is_reversed, width)
    limb.parent = armature
    lower, upper = (limb.vertex_groups.new(name=name + "-arm.L") for name in ("lower", "upper"))
    for vertex in limb.data.vertices:
        weight = min(max((vertex.co.z - 0.75) / 0.5, 0.0), 1.0)
        lower.add([vertex.index], weight, "REPLACE")
        upper.add([vertex.index], 1.0 - weight, "REPLACE")
    limb.modifiers.new("skin", "ARMATURE").object = armature
    return limb


def main(folder: Path) -> None:
    setattr(numpy, "bool", bool)  # Blender 3.4's glTF has it
    make_arm(False)
    bpy.ops.export_scene.gltf(filepath=str(folder / "arm.glb"), export_format="GLB")
    for name, width in (("arm", 1.0), ("other", 1.2)):
        limb = make_arm(True, width)
        lift = limb.modifiers.new("lift", "DISPLACE")
        lift.direction, lift.space, lift.mid_level, lift.strength = "Z", "GLOBAL", 0.0, LIFT
        bone = limb.parent.pose.bones[0]
        bone.location = (3, 0, 0)  # as it was left
        bone.driver_add("location", 1).driver.expression = "2"
        bone.constraints.new("LIMIT_ROTATION").use_limit_z = True
        bpy.ops.wm.save_as_mainfile(filepath=str(folder / f"{name}.blend"))


if __name__ == "__main__":
    main(Path(sys.argv[sys.argv.index("--") + 1]))
