# SPDX-License-Identifier: Apache-2.0
"""What Blender does in the test of control points: blender -b --factory-startup --python limb.py -- FOLDER.

A limb of rings whose vertices are numbered without any order, with hard edges, a seam of texture coordinates at every
polygon and two materials, which a skeleton bends over frames 1 to FRAMES: limb.fbx, limb.dae, and the motion as Blender
itself has it in limb.pc2, in the space of the world with y up.
"""

import math
import random
import sys
from pathlib import Path

import bpy

FRAMES = 6
RINGS, SIDES = 7, 6


def make_limb() -> bpy.types.Object:
    number = list(range(RINGS * SIDES))
    random.Random(7).shuffle(number)
    places = [(0.0, 0.0, 0.0)] * len(number)
    for ring in range(RINGS):
        for side in range(SIDES):
            angle = math.tau * side / SIDES
            places[number[ring * SIDES + side]] = (0.3 * math.cos(angle), 0.2 * math.sin(angle), 0.4 * ring)
    polygons = [[number[a * SIDES + b] for a, b in
                 ((ring, side), (ring, (side + 1) % SIDES), (ring + 1, (side + 1) % SIDES), (ring + 1, side))]
                for ring in range(RINGS - 1) for side in range(SIDES)]
    mesh = bpy.data.meshes.new("limb")
    mesh.from_pydata(places, [], polygons)
    for name in ("skin", "cloth"):
        mesh.materials.append(bpy.data.materials.new(name))
    uvs = mesh.uv_layers.new()
    for polygon in mesh.polygons:
        polygon.material_index = polygon.index % 3 % 2
        for corner, loop in enumerate(polygon.loop_indices):
            uvs.data[loop].uv = (0.1 * corner, polygon.index / 100)
    limb = bpy.data.objects.new("limb", mesh)
    bpy.context.collection.objects.link(limb)
    return limb


def make_skeleton() -> bpy.types.Object:
    armature = bpy.data.armatures.new("skeleton")
    skeleton = bpy.data.objects.new("skeleton", armature)
    bpy.context.collection.objects.link(skeleton)
    bpy.context.view_layer.objects.active = skeleton
    bpy.ops.object.mode_set(mode="EDIT")
    upper, lower = armature.edit_bones.new("upper"), armature.edit_bones.new("lower")
    upper.head, upper.tail = (0, 0, 0), (0, 0, 1.2)
    lower.head, lower.tail = (0, 0, 1.2), (0, 0, 2.4)
    lower.parent = upper
    bpy.ops.object.mode_set(mode="OBJECT")
    return skeleton


def bind(limb: bpy.types.Object, skeleton: bpy.types.Object) -> None:
    groups = [limb.vertex_groups.new(name=name) for name in ("upper", "lower")]
    for vertex in limb.data.vertices:
        weight = min(1.0, max(0.0, (vertex.co.z - 0.4) / 1.6))
        for group, share in zip(groups, (1.0 - weight, weight)):
            if share > 0.0:
                group.add([vertex.index], share, "REPLACE")
    limb.parent = skeleton
    limb.modifiers.new("skin", "ARMATURE").object = skeleton


def bend(skeleton: bpy.types.Object) -> None:
    for name, axis in (("upper", 2), ("lower", 0)):
        bone = skeleton.pose.bones[name]
        bone.rotation_mode = "XYZ"
        for frame in range(1, FRAMES + 1):
            bone.rotation_euler[axis] = 0.15 * (frame - 1)
            bone.keyframe_insert("rotation_euler", frame=frame)


def main(folder: Path) -> None:
    bpy.ops.wm.read_factory_settings(use_empty=True)
    bpy.ops.preferences.addon_enable(module="io_export_pc2")
    bpy.ops.preferences.addon_enable(module="io_scene_fbx")
    bpy.context.scene.frame_end = FRAMES
    limb, skeleton = make_limb(), make_skeleton()
    bind(limb, skeleton)
    bend(skeleton)
    bpy.context.scene.frame_set(1)
    bpy.ops.export_scene.fbx(filepath=str(folder / "limb.fbx"), add_leaf_bones=False, bake_anim_simplify_factor=0.0)
    bpy.ops.wm.collada_export(filepath=str(folder / "limb.dae"), triangulate=False)
    bpy.context.view_layer.objects.active = limb
    bpy.ops.export_shape.pc2(filepath=str(folder / "limb.pc2"), range_start=1, range_end=FRAMES, world_space=True,
                             apply_modifiers=True)


if __name__ == "__main__":
    main(Path(sys.argv[sys.argv.index("--") + 1]))
