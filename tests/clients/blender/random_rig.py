# SPDX-License-Identifier: Apache-2.0
"""A rig whose numbers are drawn: bones in all directions, one that does not inherit rotation, names that no node may
have, six influences a vertex, polygons of any size, objects that are turned, moved and scaled; an action that moves all
of it; and a Displace modifier that lifts the mesh by LIFT behind the armature."""

from typing import Any, Tuple

import bpy
import numpy as np
from mathutils import Euler, Matrix

LIFT = 0.25  # along z in the mesh's object space
BONES, VERTICES, FRAMES = 6, 60, 7


def make_rig(seed: int) -> Tuple[Any, Any, Any]:
    """The objects of mesh and armature, and the action, in an empty file."""
    bpy.ops.wm.read_factory_settings(use_empty=True)
    draw = np.random.default_rng(seed)
    armature = bpy.data.objects.new("rig.1", bpy.data.armatures.new("rig"))
    bpy.context.scene.collection.objects.link(armature)
    bpy.context.view_layer.objects.active = armature
    bpy.ops.object.mode_set(mode="EDIT")
    parent = None
    for number in range(BONES):
        bone = armature.data.edit_bones.new(f"finger-{number}.L")
        bone.head, bone.tail = draw.uniform(-1, 1, 3), draw.uniform(-1, 1, 3) + [0, 0, 2]
        bone.roll, bone.parent = draw.uniform(-3, 3), parent
        parent = bone if number != 2 else parent  # the third has no child
    bpy.ops.object.mode_set(mode="OBJECT")
    armature.data.bones["finger-3.L"].use_inherit_rotation = False
    thing = make_mesh(draw, armature)
    for one, scale in ((thing, 0.5), (armature, 0.75)):
        turn = Euler(draw.uniform(-3, 3, 3))
        one.matrix_world = Matrix.LocRotScale(draw.uniform(-1, 1, 3), turn, (scale, scale, scale))
    bpy.context.view_layer.update()
    return thing, armature, make_action(draw, armature)


def make_mesh(draw: Any, armature: Any) -> Any:
    mesh = bpy.data.meshes.new("points")
    polygons = [[number, (number + 1) % VERTICES, (number + 7) % VERTICES] for number in range(VERTICES)]
    polygons += [draw.choice(VERTICES, count, replace=False).tolist() for count in (4, 5, 6, 7)]
    mesh.from_pydata(draw.uniform(-1, 1, (VERTICES, 3)).tolist(), [], polygons)
    thing = bpy.data.objects.new("1 mesh é", mesh)
    bpy.context.scene.collection.objects.link(thing)
    for bone in armature.data.bones:
        group = thing.vertex_groups.new(name=bone.name)
        for vertex in range(VERTICES):
            if draw.random() < 0.95:
                group.add([vertex], float(draw.random()), "REPLACE")
    thing.modifiers.new("Armature", "ARMATURE").object = armature
    lift = thing.modifiers.new("Lift", "DISPLACE")
    lift.direction, lift.mid_level, lift.strength = "Z", 0.0, LIFT
    return thing


def make_action(draw: Any, armature: Any) -> Any:
    action = bpy.data.actions.new("all of it")
    for number, bone in enumerate(armature.pose.bones):
        bone.rotation_mode = "QUATERNION" if number % 2 else "ZXY"
        channel, axes = ("rotation_quaternion", 4) if number % 2 else ("rotation_euler", 3)
        for path, count in ((channel, axes), ("location", 3), ("scale", 3)):
            if path != "scale" or number == BONES - 1:  # a joint below a scaled one would be sheared
                for axis in range(count):
                    curve = action.fcurves.new(f'{bone.path_from_id()}.{path}', index=axis)
                    for frame in range(1, FRAMES + 1):
                        value = draw.uniform(0.5, 2) if path == "scale" else draw.uniform(-1, 1)
                        curve.keyframe_points.insert(frame, value)
    return action
