# SPDX-License-Identifier: Apache-2.0
"""What Blender does in the test of clips: blender -b --factory-startup --python clip.py -- make|swell|check|look
FOLDER.

make: arm.gltf, a bar of two parts that share one skin, with a picture beside it, and a second mesh that follows the
same joints, with an animation. swell: swollen.npy, from skin.npy, a motion of the bar that no skin makes.
check: clip.glb, imported: the points of both meshes in every frame against bar.npy and hat.npy. look: the same, and
whether a rendered picture has the colours.
"""

import json
import struct
import sys
import zlib
from pathlib import Path
from typing import Any, Dict, List

import bpy
import numpy

FRAMES = 5
TOLERANCE = 1e-5  # of the diagonal
WHAT = sys.argv[-2]
FOLDER = Path(sys.argv[-1])
RED, BLUE = (230, 20, 20), (20, 20, 230)


def png(width: int, height: int) -> bytes:
    """A picture whose left half is red, and whose right half is blue."""
    row = b"\0" + bytes(RED) * (width // 2) + bytes(BLUE) * (width // 2)

    def chunk(kind: bytes, data: bytes) -> bytes:
        return struct.pack(">I", len(data)) + kind + data + struct.pack(">I", zlib.crc32(kind + data))

    head = struct.pack(">IIBBBBB", width, height, 8, 2, 0, 0, 0)
    return (b"\x89PNG\r\n\x1a\n" + chunk(b"IHDR", head) + chunk(b"IDAT", zlib.compress(row * height))
            + chunk(b"IEND", b""))


class File:
    """A glTF file that grows."""

    def __init__(self) -> None:
        self.data = b""
        self.views: List[Dict[str, Any]] = []
        self.accessors: List[Dict[str, Any]] = []

    def add(self, values: numpy.ndarray, kind: str, component: int) -> int:
        raw = values.tobytes()
        self.views.append({"buffer": 0, "byteOffset": len(self.data), "byteLength": len(raw)})
        self.data += raw + bytes(-len(raw) % 4)
        accessor = {"bufferView": len(self.views) - 1, "componentType": component, "type": kind,
                    "count": len(values)}
        if kind in ("VEC3", "SCALAR") and component == 5126:
            flat = values.reshape(len(values), -1)
            accessor.update(min=flat.min(0).tolist(), max=flat.max(0).tolist())
        self.accessors.append(accessor)
        return len(self.accessors) - 1

    def floats(self, values: Any, kind: str) -> int:
        return self.add(numpy.asarray(values, dtype="<f4"), kind, 5126)

    def part(self, offset: numpy.ndarray) -> Dict[str, Any]:
        """A strip of 2 x 9 points along x, from 0 to 2 in the mesh's own space; the joints share it along the way."""
        x = numpy.repeat(numpy.linspace(0.0, 2.0, 9), 2)
        points = numpy.stack([x, numpy.tile([-0.3, 0.3], 9), 0.0 * x], axis=1) + offset
        weight = numpy.clip((x - 0.5), 0.0, 1.0)
        zero = 0.0 * x
        corners = [c for i in range(0, 16, 2) for c in (i, i + 2, i + 1, i + 1, i + 2, i + 3)]
        attributes = {
            "POSITION": self.floats(points, "VEC3"),
            "NORMAL": self.floats(numpy.tile([0.0, 0.0, 1.0], (18, 1)), "VEC3"),
            "TEXCOORD_0": self.floats(numpy.stack([x / 2.0, zero + 0.5], axis=1), "VEC2"),
            "JOINTS_0": self.add(numpy.tile(numpy.array([0, 1, 0, 0], dtype="u1"), (18, 1)), "VEC4", 5121),
            "WEIGHTS_0": self.floats(numpy.stack([1.0 - weight, weight, zero, zero], axis=1), "VEC4")}
        return {"attributes": attributes, "indices": self.add(numpy.array(corners, dtype="<u2"), "SCALAR", 5123),
                "material": 0}


def quaternions(axis: Any, degrees: Any) -> numpy.ndarray:
    half = numpy.radians(numpy.asarray(degrees, dtype=float)) / 2.0
    return numpy.concatenate([numpy.sin(half)[:, None] * numpy.asarray(axis), numpy.cos(half)[:, None]], axis=1)


def make() -> None:
    file = File()
    bar = [file.part(numpy.array([0.0, 0.0, 0.0])), file.part(numpy.array([0.0, 0.6, 0.0]))]  # one seam
    hat = [file.part(numpy.array([0.0, 2.0, 0.0]))]
    binds = numpy.tile(numpy.eye(4), (2, 1, 1))
    binds[1, 3, 0] = -1.0  # column by column
    times = file.floats(numpy.arange(FRAMES) / 24.0, "SCALAR")
    bend = file.floats(quaternions([0, 0, 1], numpy.linspace(0, 80, FRAMES)), "VEC4")
    lift = file.floats([[0.1 * i, 0.05 * i, 0.0] for i in range(FRAMES)], "VEC3")
    channels = [{"sampler": 0, "target": {"node": 2, "path": "rotation"}},
                {"sampler": 1, "target": {"node": 1, "path": "translation"}}]
    document = {
        "asset": {"version": "2.0"}, "scene": 0, "scenes": [{"nodes": [0, 3, 4]}],
        "nodes": [{"name": "place", "children": [1], "translation": [0.3, 0.1, 0.2]},
                  {"name": "upper", "children": [2]},
                  {"name": "lower", "translation": [1, 0, 0]},
                  {"name": "bar", "mesh": 0, "skin": 0, "translation": [5, 5, 5]},
                  {"name": "hat", "mesh": 1, "skin": 0}],
        "meshes": [{"name": "barShape", "primitives": bar}, {"name": "hatShape", "primitives": hat}],
        "skins": [{"joints": [1, 2], "inverseBindMatrices": file.floats(binds.reshape(2, 16), "MAT4")}],
        "animations": [{"name": "bend", "channels": channels,
                        "samplers": [{"input": times, "output": bend}, {"input": times, "output": lift}]}],
        "materials": [{"name": "paint", "doubleSided": True,
                       "pbrMetallicRoughness": {"baseColorTexture": {"index": 0}, "metallicFactor": 0.0}}],
        "textures": [{"source": 0}], "images": [{"uri": "two%20colours.png"}],
        "accessors": file.accessors, "bufferViews": file.views,
        "buffers": [{"byteLength": len(file.data), "uri": "arm.bin"}]}
    (FOLDER / "arm.bin").write_bytes(file.data)
    (FOLDER / "two colours.png").write_bytes(png(64, 16))
    (FOLDER / "arm.gltf").write_text(json.dumps(document), encoding="utf-8")


def swell() -> None:
    """A cache of what the skin makes of the bar, and a bulge that turns with nothing."""
    points = numpy.load(FOLDER / "skin.npy")
    way = numpy.arange(len(points))[:, None] / len(points)
    points[:, :, 2] += 0.3 * way * numpy.sin(3.0 * points[:, :, 0])
    points[:, :, 1] += 0.2 * way * points[:, :, 0]
    numpy.save(FOLDER / "swollen.npy", points)


def points_at(thing: bpy.types.Object, frame: int) -> numpy.ndarray:
    """In the world, with y up."""
    bpy.context.scene.frame_set(frame)
    evaluated = thing.evaluated_get(bpy.context.evaluated_depsgraph_get())
    points = numpy.array([evaluated.matrix_world @ vertex.co for vertex in evaluated.data.vertices])
    return numpy.stack([points[:, 0], points[:, 2], -points[:, 1]], axis=1)


def check_points(thing: bpy.types.Object, wanted: numpy.ndarray) -> None:
    diagonal = float(numpy.linalg.norm(numpy.ptp(wanted[0], axis=0)))
    largest = max(float(numpy.abs(points_at(thing, frame) - wanted[frame]).max()) for frame in range(len(wanted)))
    way = float(numpy.abs(wanted - wanted[0]).max())
    print(f"{thing.name}: {largest / diagonal:.2e} of the diagonal from quarn's, in a motion of {way / diagonal:.2f}")
    if not largest / diagonal <= TOLERANCE < way:
        sys.exit(1)


def check_colours() -> None:
    scene = bpy.context.scene
    camera = bpy.data.objects.new("camera", bpy.data.cameras.new("camera"))
    scene.collection.objects.link(camera)
    camera.location = (1.0, -8.0, 1.0)
    camera.rotation_euler = (numpy.pi / 2.0, 0.0, 0.0)
    scene.camera = camera
    scene.world.node_tree.nodes["Background"].inputs[0].default_value = (1.0, 1.0, 1.0, 1.0)
    scene.render.engine = "CYCLES"
    scene.cycles.samples = 4
    scene.cycles.use_denoising = False
    scene.view_settings.view_transform = "Standard"
    scene.render.resolution_x, scene.render.resolution_y = 64, 48
    scene.render.filepath = str(FOLDER / "clip.png")
    bpy.ops.render.render(write_still=True)
    picture = bpy.data.images.load(str(FOLDER / "clip.png"))
    pixels = numpy.array(picture.pixels[:]).reshape(-1, 4)[:, :3]
    red = int(((pixels[:, 0] > 2 * pixels[:, 1]) & (pixels[:, 0] > 2 * pixels[:, 2])).sum())
    blue = int(((pixels[:, 2] > 2 * pixels[:, 0]) & (pixels[:, 2] > 2 * pixels[:, 1])).sum())
    print(f"{red} pixels are red, {blue} blue")
    if min(red, blue) < 20:
        sys.exit(1)


def check() -> None:
    numpy.bool = bool  # type: ignore[attr-defined] # Blender's importer is older than its NumPy
    bpy.ops.object.select_all(action="SELECT")
    bpy.ops.object.delete()
    bpy.context.scene.render.fps = 24
    bpy.ops.import_scene.gltf(filepath=str(FOLDER / "clip.glb"))
    for name in ("bar", "hat"):
        thing = next(o for o in bpy.data.objects if o.type == "MESH" and o.data.name == f"{name}Shape")
        check_points(thing, numpy.load(FOLDER / f"{name}.npy"))
    if WHAT == "look":
        check_colours()


if __name__ == "__main__":
    {"make": make, "swell": swell, "check": check, "look": check}[WHAT]()
