# SPDX-License-Identifier: Apache-2.0
"""Blender makes the targets of quarn run (docs/run.md, "A program that makes targets"):

quarn run hand.glb -o hand --target-command blender -b --factory-startup --python-exit-code 1 \\
    --python blender_targets.py -- [--iterations N] [--factor F] [--blend FILE [--object NAME]]

The character that quarn has posed is opened, and a Corrective Smooth modifier works behind its armature. With --blend,
a file of the user's is opened instead; its armature follows the posed one, bone by bone of the same name, without what
else moves these; and the mesh (the object of the mesh's name, or NAME) is evaluated with all modifiers that it has
there.

First, Blender's skin alone is compared with quarn's: vertices that are in another order are matched, and a character
that is not the same is refused. Tried with Blender 3.4.
"""

import argparse
import json
import re
import sys
from typing import Any, Dict, List

import bpy
import numpy as np
from mathutils import Matrix, kdtree

LARGEST = 1e-3  # of the diagonal: what single precision and another way to write weights make of the same skin


def name_of(thing: Any) -> str:
    """As a scene of quarn names it: "finger-tip.L" is finger_tip_L there."""
    return re.sub(r"[^A-Za-z0-9_]", "_", thing.name)


class Stage:
    """A mesh in Blender that takes the poses of a request, frame by frame."""

    def __init__(self, request: Dict[str, Any], options: argparse.Namespace) -> None:
        if options.blend:
            bpy.ops.wm.open_mainfile(filepath=options.blend)
        else:
            bpy.ops.wm.read_factory_settings(use_empty=True)
        before = set(bpy.data.objects)
        if "bool" not in np.__dict__:
            setattr(np, "bool", bool)  # Blender 3.4 reads glTF by this name, which NumPy has given up
        bpy.ops.import_scene.gltf(filepath=request["skeleton"]["file"])
        posed = [thing for thing in bpy.data.objects if thing not in before]
        self.posed = next(thing for thing in posed if thing.type == "ARMATURE")
        self.times = self.times_of_frames(request["skin"])
        self.unit = request["skin"]["metersPerUnit"]
        name = options.object or request["mesh"]
        self.mesh = self.find_mesh(list(before) if options.blend else posed, name)
        armatures = [modifier.object for modifier in self.mesh.modifiers if modifier.type == "ARMATURE"]
        if len(armatures) != 1 or armatures[0] is None:
            sys.exit(f"{self.mesh.name} has {len(armatures)} armatures that move it, and needs one")
        self.armature = armatures[0]
        if not options.blend:
            smooth = self.mesh.modifiers.new("smooth", "CORRECTIVE_SMOOTH")
            smooth.iterations = options.iterations
            smooth.factor = options.factor
        for thing in (self.mesh, self.armature, self.posed):
            thing.hide_viewport = False  # what is hidden is not evaluated again
        self.bones = self.followers()

    @staticmethod
    def find_mesh(things: List[Any], name: str) -> Any:
        meshes = [thing for thing in things if thing.type == "MESH" and thing.find_armature()]
        for thing in meshes:
            if name in (thing.name, thing.data.name, name_of(thing), name_of(thing.data)):
                return thing
        if len(meshes) == 1:
            return meshes[0]
        sys.exit(f"there is no mesh {name} with an armature; there are {sorted(thing.name for thing in meshes)}")

    def times_of_frames(self, skin: Dict[str, Any]) -> Dict[int, float]:
        """Where in Blender's time the frames of the request lie: a key each, whatever the rate of either."""
        action = self.posed.animation_data and self.posed.animation_data.action
        keys = max((curve.keyframe_points for curve in action.fcurves), key=len) if action else []
        if len(keys) != skin["shape"][0]:
            sys.exit(f"the skeleton's file has {len(keys)} keys, and the skin {skin['shape'][0]} frames")
        return {skin["firstFrame"] + row: key.co.x for row, key in enumerate(keys)}

    def followers(self) -> List[Any]:
        """The bones of the user's armature that one of the posed armature leads, parents first."""
        if self.armature == self.posed:
            return []
        leaders = {name_of(bone): bone for bone in self.posed.pose.bones}
        self.leaders = {bone.name: leaders[name_of(bone)] for bone in self.armature.pose.bones
                        if name_of(bone) in leaders}
        led = [bone for bone in self.armature.pose.bones if bone.name in self.leaders]
        print(f"{len(led)} of {len(self.armature.pose.bones)} bones of {self.armature.name} follow the character's "
              f"{len(leaders)} joints", flush=True)
        moves = self.armature.animation_data
        if moves:
            moves.action, moves.use_nla = None, False
            for curve in moves.drivers:
                curve.mute = any(f'pose.bones["{bone.name}"]' in curve.data_path for bone in led)
        for bone in led:
            for constraint in bone.constraints:
                constraint.mute = True
        return sorted(led, key=lambda bone: len(bone.parent_recursive))

    def follow(self) -> None:
        """Each bone goes from its rest as the posed one goes from its own, in the world."""
        to_armature = self.armature.matrix_world.inverted()
        placed: Dict[str, Matrix] = {}
        for bone in self.bones:
            leader = self.leaders[bone.name]
            world = self.posed.matrix_world
            moved = (world @ leader.matrix) @ (world @ leader.bone.matrix_local).inverted()
            rest = bone.bone.matrix_local
            place = to_armature @ moved @ self.armature.matrix_world @ rest
            placed[bone.name] = place
            parent = bone.parent
            if parent is None:
                bone.matrix_basis = bone.bone.convert_local_to_pose(place, rest, invert=True)
            else:
                bone.matrix_basis = bone.bone.convert_local_to_pose(
                    place, rest, parent_matrix=placed.get(parent.name, parent.matrix),
                    parent_matrix_local=parent.bone.matrix_local, invert=True)

    def points(self, frame: int, only_skin: bool = False) -> np.ndarray:
        """The vertices in a frame, [vertices, 3], in the request's unit and axes."""
        for modifier in self.mesh.modifiers:
            if modifier.type != "ARMATURE":
                modifier.show_viewport = not only_skin
        time = self.times[frame]
        bpy.context.scene.frame_set(int(np.floor(time)), subframe=float(time - np.floor(time)))
        if self.bones:
            self.follow()
            bpy.context.view_layer.update()
        evaluated = self.mesh.evaluated_get(bpy.context.evaluated_depsgraph_get())
        flat = np.empty(3 * len(evaluated.data.vertices), dtype=np.float32)
        evaluated.data.vertices.foreach_get("co", flat)
        world = np.array(evaluated.matrix_world)
        placed = flat.reshape(-1, 3).astype(float) @ world[:3, :3].T + world[:3, 3]
        return np.stack([placed[:, 0], placed[:, 2], -placed[:, 1]], axis=1) / self.unit  # glTF has y up


def order_of(stage: Stage, skin: np.ndarray, frames: List[int], first: int) -> np.ndarray:
    """For each vertex of the request its vertex in Blender; ends when the two have not the same skin."""
    looked = sorted({frames[0], frames[len(frames) // 2], frames[-1]})
    ours = {frame: stage.points(frame, only_skin=True) for frame in looked}
    wanted = {frame: np.asarray(skin[frame - first], dtype=float) for frame in looked}
    diagonal = float(np.linalg.norm(np.ptp(wanted[looked[0]], axis=0)))

    def distance(order: np.ndarray) -> float:
        return max(float(np.abs(ours[frame][order] - wanted[frame]).max()) for frame in looked) / diagonal

    count = len(wanted[looked[0]])
    order = np.arange(count)
    if len(ours[looked[0]]) != count or distance(order) > LARGEST:
        tree = kdtree.KDTree(len(ours[looked[0]]))
        for index, point in enumerate(ours[looked[0]]):
            tree.insert(point, index)
        tree.balance()
        order = np.array([tree.find(point)[1] for point in wanted[looked[0]]])
    largest = distance(order)
    print(f"Blender's skin is {largest:.2g} of the diagonal from quarn's, at most", flush=True)
    if largest > LARGEST:
        sys.exit(f"this is another character than quarn's, or posed otherwise: {LARGEST:g} would be let pass")
    return order


def main() -> None:
    parser = argparse.ArgumentParser(prog="blender_targets.py", description=__doc__.splitlines()[0])
    parser.add_argument("--blend")
    parser.add_argument("--object")
    parser.add_argument("--iterations", type=int, default=10)
    parser.add_argument("--factor", type=float, default=0.5)
    parser.add_argument("request")
    options = parser.parse_args(sys.argv[sys.argv.index("--") + 1:])
    with open(options.request, encoding="utf-8") as file:
        request = json.load(file)
    if request["version"] != 1:
        sys.exit(f"blender_targets.py: knows requests of version 1, not of version {request['version']}")
    stage = Stage(request, options)
    skin = np.load(request["skin"]["file"], mmap_mode="r", allow_pickle=False)
    frames, first = request["frames"], request["skin"]["firstFrame"]
    order = order_of(stage, skin, frames, first)
    targets = np.empty((len(frames), len(order), 3), dtype="<f4")
    for row, frame in enumerate(frames):
        points = stage.points(frame)
        if len(points) <= int(order.max()):
            sys.exit(f"the modifiers leave {len(points)} vertices: a modifier that changes their number must be off")
        targets[row] = points[order]
        print(f"{row + 1} of {len(frames)}", flush=True)
    np.save(request["write"], targets)


if __name__ == "__main__":
    main()
