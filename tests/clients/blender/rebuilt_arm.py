# SPDX-License-Identifier: Apache-2.0
"""The arm of examples/arm as a rigger builds it in Blender: blender -b --factory-startup --python rebuilt_arm.py --
FILE.blend. Tests of the add-on import it and call rebuild_arm().

The mesh has y up in its own space, as one that was imported, and its object turns it; the armature stands elsewhere
and askew. Behind the armature a Corrective Smooth works, before it two shape keys do, which bones drive: "biceps" bends
with the elbow, "wrist" with the hand. The elbow and the hand have Limit Rotation constraints with the limits of
limits.json, and the action "motion" is motion.json.
"""

import json
import sys
from math import radians
from pathlib import Path
from typing import Any, Dict, Tuple

import bpy
import numpy as np
from mathutils import Matrix, Vector

EXAMPLE = Path(__file__).resolve().parents[3] / "examples" / "arm"
sys.path.insert(0, str(EXAMPLE))

from arm_shape import JOINTS, LAST, arm_points, arm_triangles, arm_weights, bump  # noqa: E402
from muscles import BULGE, OLECRANON, Arm  # noqa: E402

PLACE = Matrix.Translation((0.3, -0.2, 1.0)) @ Matrix.Rotation(radians(30), 4, "Z")
FROM_MESH = Matrix.Rotation(radians(90), 4, "X")  # y up becomes z up
# the example's axes of a joint, and those of a bone, whose Y runs along the arm and whose Z points up
AXES = {"rotateX": 1, "rotateY": 2, "rotateZ": 0}
DRIVERS = {"biceps": ("forearm", "pow(sin(0.75 * max(turn, 0)), 2)"), "wrist": ("hand", "abs(sin(turn))")}


def shapes() -> Dict[str, np.ndarray]:
    """By how much each shape key moves the points at rest, [V, 3]."""
    rest = arm_points()
    arm = Arm(rest, arm_triangles())
    outwards = np.stack([0.0 * rest[:, 0], rest[:, 1], rest[:, 2]], axis=1)
    return {"biceps": BULGE * arm.biceps + OLECRANON * arm.olecranon,
            "wrist": 0.25 * bump(rest[:, 0], JOINTS["hand"], 0.03)[:, None] * outwards}


def make_armature(name: str) -> Any:
    armature = bpy.data.objects.new(name, bpy.data.armatures.new(name))
    bpy.context.scene.collection.objects.link(armature)
    bpy.context.view_layer.objects.active = armature
    bpy.ops.object.mode_set(mode="EDIT")
    parent = None
    for (bone_name, head), tail in zip(JOINTS.items(), [*list(JOINTS.values())[1:], LAST]):
        bone = armature.data.edit_bones.new(bone_name)
        bone.head, bone.tail, bone.parent = (head, 0, 0), (tail, 0, 0), parent
        bone.align_roll(Vector((0, 0, 1)))
        parent = bone
    bpy.ops.object.mode_set(mode="OBJECT")
    for bone in armature.pose.bones:
        bone.rotation_mode = "XYZ"
    return armature


def make_mesh(name: str, armature: Any) -> Any:
    mesh = bpy.data.meshes.new(name)
    mesh.from_pydata(arm_points().tolist(), [], arm_triangles().tolist())
    mesh.polygons.foreach_set("use_smooth", np.ones(len(mesh.polygons), dtype=bool))
    thing = bpy.data.objects.new(name, mesh)
    bpy.context.scene.collection.objects.link(thing)
    for joint, weights in zip(JOINTS, arm_weights(arm_points()).T):
        group = thing.vertex_groups.new(name=joint)
        for vertex in np.flatnonzero(weights > 0.0):
            group.add([int(vertex)], float(weights[vertex]), "REPLACE")
    thing.parent = armature
    thing.matrix_local = FROM_MESH
    thing.modifiers.new("Armature", "ARMATURE").object = armature
    smooth = thing.modifiers.new("Corrective Smooth", "CORRECTIVE_SMOOTH")
    smooth.iterations, smooth.factor = 10, 0.5
    return thing


def add_shapes(thing: Any, armature: Any) -> None:
    thing.shape_key_add(name="Basis", from_mix=False)
    for name, deltas in shapes().items():
        key = thing.shape_key_add(name=name, from_mix=False)
        key.data.foreach_set("co", (arm_points() + deltas).astype(np.float32).ravel())
        bone, expression = DRIVERS[name]
        driver = key.driver_add("value").driver
        driver.type, driver.expression = "SCRIPTED", expression
        turn = driver.variables.new()
        turn.name, turn.type = "turn", "TRANSFORMS"
        target = turn.targets[0]
        target.id, target.bone_target = armature, bone
        target.transform_type, target.transform_space = "ROT_X", "LOCAL_SPACE"


def add_limits(armature: Any) -> None:
    with open(EXAMPLE / "limits.json", encoding="utf-8") as file:
        limits = json.load(file)
    for bone, ranges in limits.items():
        constraint = armature.pose.bones[bone].constraints.new("LIMIT_ROTATION")
        constraint.owner_space = "LOCAL"
        constraint.use_limit_x = constraint.use_limit_y = constraint.use_limit_z = True
        for axis, (least, largest) in ranges.items():
            letter = "xyz"[AXES[axis]]
            setattr(constraint, f"min_{letter}", radians(least))
            setattr(constraint, f"max_{letter}", radians(largest))


def add_motion(armature: Any) -> None:
    with open(EXAMPLE / "motion.json", encoding="utf-8") as file:
        motion = json.load(file)
    action = bpy.data.actions.new("motion")
    action.use_fake_user = True
    for plug, keys in motion["keys"].items():
        bone, axis = plug.split(".")
        path = f'pose.bones["{bone}"].rotation_euler'
        curve = action.fcurves.new(path, index=AXES[axis], action_group=bone)
        for frame, degrees in keys:
            curve.keyframe_points.insert(frame, radians(degrees))
    armature.animation_data_create().action = action


def rebuild_arm(name: str = "arm") -> Tuple[Any, Any]:
    """Adds it to the open scene: the objects of the mesh (NAME) and of the armature (NAMERig)."""
    armature = make_armature(name + "Rig")
    armature.matrix_world = PLACE
    thing = make_mesh(name, armature)
    add_shapes(thing, armature)
    add_limits(armature)
    add_motion(armature)
    bpy.context.scene.frame_start, bpy.context.scene.frame_end = 1, 96
    bpy.context.scene.frame_set(1)
    return thing, armature


def main(path: str) -> None:
    bpy.ops.wm.read_factory_settings(use_empty=True)
    rebuild_arm()
    bpy.ops.wm.save_as_mainfile(filepath=path)


if __name__ == "__main__":
    main(sys.argv[sys.argv.index("--") + 1])
