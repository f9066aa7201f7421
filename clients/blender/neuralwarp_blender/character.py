# SPDX-License-Identifier: Apache-2.0
"""A mesh with its armature as a character for quarn: one file of glTF 2, in the object space of the mesh.

No axes are turned, and bones are brought into the mesh's object space, so that points of the scene that quarn makes of
it are the mesh's local coordinates as they stand. The file has all vertices in Blender's order, triangles, and all
influences. Matrices here are of column vectors, p' = M p, as Blender has them.
"""

from __future__ import annotations

import json
import re
import struct
from dataclasses import dataclass
from pathlib import Path
from typing import Any, Dict, List, Sequence, Tuple

import numpy as np
from numpy.typing import NDArray

from .refused import Refused
from .stack import Stack, Switches, evaluated_points

FLOAT, SHORT, INT = 5126, 5123, 5125  # component types
DTYPES = {FLOAT: "<f4", SHORT: "<u2", INT: "<u4"}
SET = 4  # influences in one attribute


@dataclass(frozen=True)
class Joint:
    bone: str
    name: str  # of the node
    parent: int  # index of a joint, or -1
    rest: NDArray[np.float64]  # [4, 4], to the mesh's object space


@dataclass(frozen=True)
class Character:
    mesh: str  # name of the mesh's node
    points: NDArray[np.float32]  # [vertices, 3], at rest
    triangles: NDArray[np.int32]  # [triangles, 3]
    joints: Sequence[Joint]  # parents first
    influences: NDArray[np.int32]  # [vertices, k], joints; 0 where the weight is 0
    weights: NDArray[np.float32]  # [vertices, k], largest first

    def moves_vertices(self, joint: int) -> bool:
        """By weights of its own."""
        return bool(((self.influences == joint) & (self.weights > 0.0)).any())


def node_names(names: Sequence[str], taken: Sequence[str] = ()) -> List[str]:
    """Names that nodes may have, each another one: "finger-tip.L" becomes finger_tip_L."""
    used, result = set(taken), []
    for name in names:
        plain = re.sub(r"[^A-Za-z0-9_]", "_", name)
        plain = "_" + plain if not plain or plain[0].isdigit() else plain
        unique, number = plain, 1
        while unique in used:
            unique, number = f"{plain}_{number}", number + 1
        used.add(unique)
        result.append(unique)
    return result


def to_mesh(thing: Any, armature: Any) -> NDArray[np.float64]:
    """[4, 4]: from the armature's object space into the mesh's."""
    return np.array(thing.matrix_world.inverted() @ armature.matrix_world)


def read_character(thing: Any, armature: Any, stack: Stack, switches: Switches) -> Character:
    """thing: a mesh object that read_stack() took; switches: of it. Raises Refused."""
    switches.rest(stack)
    points = evaluated_points(thing)
    if len(points) != len(thing.data.vertices):
        raise Refused(f"{thing.name} has {len(points)} vertices before its armature, and {len(thing.data.vertices)} of "
                      "its own")
    if not np.isfinite(points).all():
        raise Refused(f"{thing.name} has a vertex whose place is no number")
    bones, influences, weights = read_weights(thing, armature)
    mesh = node_names([thing.name])[0]
    place, names = to_mesh(thing, armature), node_names(bones, [mesh])
    joints = [Joint(bone, name, bones.index(parent.name) if (parent := armature.data.bones[bone].parent) else -1,
                    place @ np.array(armature.data.bones[bone].matrix_local)) for bone, name in zip(bones, names)]
    thing.data.calc_loop_triangles()
    triangles = np.empty(3 * len(thing.data.loop_triangles), dtype=np.int32)
    thing.data.loop_triangles.foreach_get("vertices", triangles)
    return Character(mesh, points, triangles.reshape(-1, 3), joints, influences, weights)


def read_weights(thing: Any, armature: Any) -> Tuple[List[str], NDArray[np.int32], NDArray[np.float32]]:
    """Names of the bones that hold vertices and of all above them, parents first; and per vertex their numbers and
    weights, [vertices, k]."""
    deforming = {bone.name for bone in armature.data.bones if bone.use_deform}
    group_names = {group.index: group.name for group in thing.vertex_groups if group.name in deforming}
    held: List[List[Tuple[float, str]]] = [
        sorted(((one.weight, group_names[one.group]) for one in vertex.groups
                if one.weight > 0.0 and one.group in group_names), key=lambda pair: -pair[0])
        for vertex in thing.data.vertices]
    holding = {name for pairs in held for _, name in pairs}
    if not holding:
        raise Refused(f"{thing.name} has no vertex in a group of a deforming bone of {armature.name}")
    chosen = holding | {bone.name for name in holding for bone in armature.data.bones[name].parent_recursive}
    bones = [bone.name for bone in sorted((armature.data.bones[name] for name in chosen),
                                          key=lambda bone: (len(bone.parent_recursive), bone.name))]
    number = {name: index for index, name in enumerate(bones)}
    width = -(-max(len(pairs) for pairs in held) // SET) * SET
    influences = np.zeros((len(held), width), dtype=np.int32)
    weights = np.zeros((len(held), width), dtype=np.float32)
    for vertex, pairs in enumerate(held):
        for column, (weight, name) in enumerate(pairs):
            influences[vertex, column], weights[vertex, column] = number[name], weight
    return bones, influences, weights


class Buffer:
    """The binary chunk of the file, with what describes it."""

    def __init__(self) -> None:
        self.parts: List[bytes] = []
        self.length = 0
        self.views: List[Dict[str, Any]] = []
        self.accessors: List[Dict[str, Any]] = []

    def add(self, array: Any, kind: str, component: int = FLOAT) -> int:
        """The number of a new accessor: rows of the array are its elements."""
        array = np.ascontiguousarray(array, dtype=DTYPES[component])
        rows = array.reshape(len(array), -1)
        self.views.append({"buffer": 0, "byteOffset": self.length, "byteLength": array.nbytes})
        self.parts.append(array.tobytes() + b"\0" * (-array.nbytes % 4))
        self.length += len(self.parts[-1])
        self.accessors.append({"bufferView": len(self.views) - 1, "componentType": component, "count": len(array),
                               "type": kind, "min": rows.min(axis=0).tolist(), "max": rows.max(axis=0).tolist()})
        return len(self.accessors) - 1


def write_character(character: Character, path: Path) -> None:
    """As a .glb file."""
    buffer = Buffer()
    attributes = {"POSITION": buffer.add(character.points, "VEC3")}
    for first in range(0, character.weights.shape[1], SET):
        columns = slice(first, first + SET)
        attributes[f"JOINTS_{first // SET}"] = buffer.add(character.influences[:, columns], "VEC4", SHORT)
        attributes[f"WEIGHTS_{first // SET}"] = buffer.add(character.weights[:, columns], "VEC4")
    indices = buffer.add(character.triangles.reshape(-1, 1), "SCALAR", INT)
    # matrices of column vectors, column by column
    inverses = np.stack([np.linalg.inv(joint.rest).T for joint in character.joints])
    skin = {"inverseBindMatrices": buffer.add(inverses, "MAT4"),
            "joints": [1 + index for index in range(len(character.joints))]}
    roots = [1 + index for index, joint in enumerate(character.joints) if joint.parent < 0]
    description = {
        "asset": {"version": "2.0", "generator": "neuralWarp for Blender"}, "scene": 0,
        "scenes": [{"nodes": [0, *roots]}],
        "nodes": [{"name": character.mesh, "mesh": 0, "skin": 0}, *joint_nodes(character.joints)],
        "meshes": [{"name": character.mesh, "primitives": [{"attributes": attributes, "indices": indices}]}],
        "skins": [skin], "accessors": buffer.accessors, "bufferViews": buffer.views,
        "buffers": [{"byteLength": buffer.length}]}
    body = chunk(b"JSON", json.dumps(description).encode(), b" ") + chunk(b"BIN\0", b"".join(buffer.parts), b"\0")
    path.write_bytes(struct.pack("<4sII", b"glTF", 2, 12 + len(body)) + body)


def joint_nodes(joints: Sequence[Joint]) -> List[Dict[str, Any]]:
    nodes = []
    for index, joint in enumerate(joints):
        local = np.linalg.inv(joints[joint.parent].rest) @ joint.rest if joint.parent >= 0 else joint.rest
        node: Dict[str, Any] = {"name": joint.name, "matrix": local.T.ravel().tolist()}
        children = [1 + other for other, child in enumerate(joints) if child.parent == index]
        if children:
            node["children"] = children
        nodes.append(node)
    return nodes


def chunk(kind: bytes, content: bytes, padding: bytes) -> bytes:
    content += padding * (-len(content) % 4)
    return struct.pack("<I4s", len(content), kind) + content
