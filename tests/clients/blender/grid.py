# SPDX-License-Identifier: Apache-2.0
"""What Blender does in the test of point caches: blender -b --factory-startup --python grid.py -- make|check FOLDER.

make: a grid that bends, twists and stretches over frames 1 to FRAMES; its scene for quarn, in centimetres; and what
Blender's own exporters make of the motion: in.pc2, which they turn to y up, and in.mdd, which they leave as it is.
check: the same grid at rest, moved by Mesh Cache modifiers that play out.pc2 and out.mdd, against the motion itself.
"""

import json
import sys
from pathlib import Path
from typing import Any, Dict

import bpy
import numpy

FRAMES = 6
TOLERANCE = 1e-5  # of the diagonal of the grid


def make_grid(name: str) -> bpy.types.Object:
    bpy.ops.mesh.primitive_grid_add(x_subdivisions=12, y_subdivisions=9, size=2.0, location=(0, 0, 0))
    grid = bpy.context.object
    grid.name = name
    for vertex in grid.data.vertices:  # no symmetry that could hide a wrong axis
        vertex.co.x *= 1.7
        vertex.co.z = 0.2 * vertex.co.x * vertex.co.y + 0.1 * vertex.co.y
    return grid


def make_moving_grid() -> bpy.types.Object:
    grid = make_grid("moving")
    for method, factor in (("BEND", 1.2), ("TWIST", 0.9), ("STRETCH", 0.4)):
        modifier = grid.modifiers.new(method, "SIMPLE_DEFORM")
        modifier.deform_method = method
        modifier.deform_axis = "X"
        path = "angle" if method != "STRETCH" else "factor"
        for frame, value in ((1, 0.0), (FRAMES, factor)):
            setattr(modifier, path, value)
            modifier.keyframe_insert(path, frame=frame)
    return grid


def points_at(thing: bpy.types.Object, frame: int) -> numpy.ndarray:
    bpy.context.scene.frame_set(frame)
    mesh = thing.evaluated_get(bpy.context.evaluated_depsgraph_get()).data
    points = numpy.empty(3 * len(mesh.vertices), dtype=numpy.float32)
    mesh.vertices.foreach_get("co", points)
    return points.reshape(-1, 3)


def to_y_up(points: numpy.ndarray) -> numpy.ndarray:
    return numpy.stack([points[:, 0], points[:, 2], -points[:, 1]], axis=1)


def scene_of(grid: bpy.types.Object) -> Dict[str, Any]:
    polygons = grid.data.polygons
    rest = 100.0 * to_y_up(points_at(grid, 1))  # centimetres
    mesh = {"points": [float(x) for x in rest.ravel()], "counts": [len(p.vertices) for p in polygons],
            "corners": [v for p in polygons for v in p.vertices]}
    nodes = [{"name": "grid", "type": "mesh", "values": {"inMesh": mesh}},
             {"name": "character", "type": "character", "values": {"framesPerSecond": 24.0}},
             {"name": "warp", "type": "neuralWarp", "values": {"exportEndFrame": FRAMES}}]
    return {"openquarnScene": 1, "nodes": nodes,
            "connections": [["grid.outMesh", "warp.input[0].inputGeometry"],
                            ["grid.outMesh", "warp.originalGeometry[0]"]]}


def select(thing: bpy.types.Object) -> None:
    bpy.ops.object.select_all(action="DESELECT")
    thing.select_set(True)
    bpy.context.view_layer.objects.active = thing


def make(folder: Path) -> None:
    for addon in ("io_shape_mdd", "io_export_pc2"):
        bpy.ops.preferences.addon_enable(module=addon)
    grid = make_moving_grid()
    (folder / "grid.json").write_text(json.dumps(scene_of(grid)), encoding="utf-8")
    select(grid)
    bpy.ops.export_shape.mdd(filepath=str(folder / "in.mdd"), fps=24, frame_start=1, frame_end=FRAMES)
    bpy.ops.export_shape.pc2(filepath=str(folder / "in.pc2"), range_start=1, range_end=FRAMES, apply_modifiers=True)


def add_cache(grid: bpy.types.Object, path: Path, forward: str, up: str) -> None:
    cache = grid.modifiers.new("cache", "MESH_CACHE")
    cache.cache_format = path.suffix[1:].upper()
    cache.filepath = str(path)
    cache.frame_start = 1  # 0 by default: every frame a frame late
    cache.forward_axis = forward
    cache.up_axis = up


def check(folder: Path) -> None:
    moving = make_moving_grid()
    diagonal = float(numpy.linalg.norm(numpy.ptp(points_at(moving, 1), axis=0)))
    for name, forward, up in (("out.pc2", "POS_Z", "NEG_Y"), ("out.mdd", "POS_Y", "POS_Z")):
        still = make_grid(name)
        add_cache(still, folder / name, forward, up)
        largest = 0.0
        for frame in range(1, FRAMES + 1):
            wanted = points_at(moving, frame)
            largest = max(largest, float(numpy.abs(points_at(still, frame) - wanted).max()) / diagonal)
        way = float(numpy.abs(wanted - points_at(moving, 1)).max()) / diagonal
        print(f"{name}: {largest:.2e} of the diagonal from Blender's own motion of {way:.2f}")
        if not largest <= TOLERANCE < way:
            sys.exit(1)


if __name__ == "__main__":
    WHAT, FOLDER = sys.argv[sys.argv.index("--") + 1:]
    {"make": make, "check": check}[WHAT](Path(FOLDER))
