# SPDX-License-Identifier: Apache-2.0
"""blender -b --factory-startup --python armature.py -- ARM.glb SKIN.npy: imports the character, and compares its
armature at one second of its own animation with the skin of that pose, [1, vertices, 3] in the file's order, y up."""

import sys

import bpy
import numpy

TOLERANCE = 1e-5  # of the diagonal


def points_at(frame: int) -> numpy.ndarray:
    bpy.context.scene.frame_set(frame)
    thing = next(thing for thing in bpy.data.objects if thing.type == "MESH" and thing.find_armature())
    mesh = thing.evaluated_get(bpy.context.evaluated_depsgraph_get()).data
    points = numpy.empty(3 * len(mesh.vertices), dtype=numpy.float32)
    mesh.vertices.foreach_get("co", points)
    matrix = numpy.array(thing.matrix_world)
    x, y, z = (points.reshape(-1, 3) @ matrix[:3, :3].T + matrix[:3, 3]).T
    return numpy.stack([x, z, -y], axis=1)


def main(character: str, skin: str) -> None:
    setattr(numpy, "bool", bool)  # as Debian's importer of glTF still calls it
    bpy.ops.object.select_all(action="SELECT")
    bpy.ops.object.delete()
    bpy.ops.import_scene.gltf(filepath=character)
    rest, bent = points_at(0), points_at(bpy.context.scene.render.fps)
    diagonal = float(numpy.linalg.norm(numpy.ptp(rest, axis=0)))
    way = float(numpy.linalg.norm(bent - rest, axis=1).max()) / diagonal
    distance = float(numpy.abs(bent - numpy.load(skin)[0]).max()) / diagonal
    print(f"{len(bent)} vertices: {distance:.2e} of the diagonal from Blender's armature, which moved {way:.2f}")
    if not distance <= TOLERANCE or not way > 0.5:
        sys.exit(1)


if __name__ == "__main__":
    main(*sys.argv[sys.argv.index("--") + 1:])
