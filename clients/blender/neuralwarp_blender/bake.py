# SPDX-License-Identifier: Apache-2.0
"""What an object in use shows, baked for somebody without this add-on: a PC2 file that a Mesh Cache modifier plays, or
shape keys on a copy of the object. Both only need Blender."""

import os
import struct
from pathlib import Path
from typing import Any, Iterator, Tuple

import bpy
import numpy as np
from numpy.typing import NDArray

from . import live, muting
from .refused import Refused

Points = NDArray[np.float32]

PC2_MAGIC, PC2_VERSION = b"POINTCACHE2\0", 1
MODIFIER = "neuralWarp bake"
# modifiers that change the number of vertices
GENERATORS = {"ARRAY", "BEVEL", "BOOLEAN", "DECIMATE", "EDGE_SPLIT", "MASK", "MIRROR", "MULTIRES", "REMESH", "SCREW",
              "SKIN", "SOLIDIFY", "SUBSURF", "TRIANGULATE", "WELD", "WIREFRAME"}


def played(thing: Any, first: int, last: int) -> Iterator[Tuple[int, Points]]:
    """Frames and points, [N, 3] in object space, as Blender shows them. The scene's frame is as it was afterwards.
    Refused where the object was not deformed in a frame."""
    if last < first:
        raise Refused(f"frames {first} to {last} are none")
    scene = bpy.context.scene
    before, subframe = scene.frame_current, scene.frame_subframe
    flat = np.empty(3 * len(thing.data.vertices), dtype=np.float32)
    try:
        for frame in range(first, last + 1):
            scene.frame_set(frame)
            mesh = thing.evaluated_get(bpy.context.evaluated_depsgraph_get()).data
            problem = live.problem(thing)
            if problem:
                raise Refused(f"frame {frame}: {problem}")
            mesh.vertices.foreach_get("co", flat)
            yield frame, flat.reshape(-1, 3)
    finally:
        scene.frame_set(before, subframe=subframe)


def write_pc2(path: Path, thing: Any, first: int, last: int) -> None:
    """A whole file, or the one that was there before."""
    part = path.with_name(path.name + ".part")
    try:
        with open(part, "wb") as file:
            file.write(struct.pack("<12siiffi", PC2_MAGIC, PC2_VERSION, len(thing.data.vertices), first, 1.0,
                                   last - first + 1))
            for _, points in played(thing, first, last):
                file.write(points.astype("<f4", copy=False).tobytes())
        os.replace(part, path)
    finally:
        part.unlink(missing_ok=True)


def to_mesh_cache(thing: Any, path: Path, first: int, last: int) -> None:
    """Bakes what the object in use shows, takes it out of use, and has it show the bake."""
    check(thing)
    write_pc2(path, thing, first, last)
    live.stop(thing)
    show_cache(thing, path, first)


def show_cache(thing: Any, path: Path, first: int) -> None:
    """Has a Mesh Cache modifier play a PC2 file with the vertices of the object, whose first frame is `first`. Blender
    says nothing where the numbers of vertices differ: Refused does."""
    count = vertices_of_pc2(path)
    if count != len(thing.data.vertices):
        raise Refused(f"{path.name} has {count} vertices, and {thing.name} has {len(thing.data.vertices)}")
    if thing.modifiers.get(MODIFIER):
        thing.modifiers.remove(thing.modifiers[MODIFIER])
    place = first_generator(thing)  # behind all that moves vertices; a Subdivision Surface stays on top
    modifier = thing.modifiers.new(MODIFIER, "MESH_CACHE")
    modifier.cache_format, modifier.frame_start = "PC2", first
    modifier.filepath = bpy.path.relpath(str(path)) if bpy.data.filepath else str(path)
    modifier.forward_axis, modifier.up_axis = "POS_Y", "POS_Z"  # as they are
    with bpy.context.temp_override(object=thing):
        bpy.ops.object.modifier_move_to_index(modifier=MODIFIER, index=place)


def vertices_of_pc2(path: Path) -> int:
    try:
        with open(path, "rb") as file:
            head = file.read(32)
            size = os.fstat(file.fileno()).st_size
    except OSError as error:
        raise Refused(f"{path}: {error.strerror}") from None
    if len(head) < 32 or head[:12] != PC2_MAGIC:
        raise Refused(f"{path} is no PC2 file")
    _, _, count, _, _, frames = struct.unpack("<12siiffi", head)
    if count < 1 or frames < 1 or size != 32 + 12 * count * frames:
        raise Refused(f"{path} is damaged: it says {frames} frames of {count} vertices, and has {size} bytes")
    return int(count)


def first_generator(thing: Any) -> int:
    """The index of the first modifier of those at the end that change the number of vertices."""
    index = len(thing.modifiers)
    while index > 0 and thing.modifiers[index - 1].type in GENERATORS:
        index -= 1
    return index


def to_shape_keys(thing: Any, first: int, last: int) -> Any:
    """A copy of the object, in the same collections, whose shape keys are the frames and follow one another. Of its
    modifiers it keeps those behind the ones that move vertices."""
    check(thing)
    poses = [(frame, points.copy()) for frame, points in played(thing, first, last)]
    baked = thing.copy()
    baked.name = f"{thing.name} baked"
    baked.data = thing.data.copy()
    baked.data.name = baked.name
    for collection in thing.users_collection:
        collection.objects.link(baked)
    baked.neuralwarp.in_use = False
    muting.restore(baked)
    for modifier in list(baked.modifiers)[:first_generator(baked)]:
        baked.modifiers.remove(modifier)
    baked.shape_key_clear()
    for frame, points in poses:
        key = baked.shape_key_add(name=f"frame {frame}", from_mix=False)
        key.data.foreach_set("co", points.reshape(-1))
        key.interpolation = "KEY_LINEAR"
    keys = baked.data.shape_keys
    keys.use_relative = False
    for (frame, _), key in zip(poses, keys.key_blocks):
        keys.eval_time = key.frame
        keys.keyframe_insert("eval_time", frame=frame)
    for point in keys.animation_data.action.fcurves[0].keyframe_points:
        point.interpolation = "LINEAR"
    return baked


def check(thing: Any) -> None:
    if thing is None or thing.type != "MESH" or not thing.neuralwarp.in_use:
        raise Refused((thing.name if thing else "no object") + " is not in use: nothing can be baked")
    if thing.neuralwarp.show != "NEURAL":
        raise Refused(f"{thing.name} shows {thing.neuralwarp.show.lower()}: switch it to Neural before baking")
