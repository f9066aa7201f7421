#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""write_arm.py ARM.glb: writes the arm as a character: one file of glTF 2 with the mesh, its texture coordinates and
material, a skeleton of three joints, the skin, and an animation that bends the elbow, to 90 degrees at 1 s."""

import json
import struct
import sys
from typing import Any

import numpy as np
from arm_shape import AROUND, JOINTS, RINGS, arm_points, arm_triangles, arm_weights

FLOAT, SHORT, BYTE = 5126, 5123, 5121  # component types, and a sampler's and a view's targets
FLEX = [(0.0, 0.0), (1.0, 90.0), (1.5, 120.0), (2.5, 0.0)]  # seconds, degrees of the elbow


class Buffer:
    """The binary chunk of the file, with what describes it."""

    def __init__(self) -> None:
        self.content = b""
        self.views: list[Any] = []
        self.accessors: list[Any] = []

    def add(self, array: np.ndarray, kind: str, component: int = FLOAT) -> int:
        """The number of a new accessor: rows of the array are its elements."""
        array = array.astype({FLOAT: "<f4", SHORT: "<u2", BYTE: "u1"}[component])
        self.content += b"\0" * (-len(self.content) % 4)
        self.views.append({"buffer": 0, "byteOffset": len(self.content), "byteLength": array.nbytes})
        self.content += array.tobytes()
        rows = array.reshape(len(array), -1)
        self.accessors.append({"bufferView": len(self.views) - 1, "componentType": component, "count": len(array),
                               "type": kind, "min": rows.min(axis=0).tolist(), "max": rows.max(axis=0).tolist()})
        return len(self.accessors) - 1


def with_seam() -> tuple[np.ndarray, np.ndarray]:
    """Of the file's vertices the number of the point, and of the triangles' corners, [T, 3], the number of the vertex.
    The texture ends along the arm's underside: these points are there twice, with the same place and skin."""
    points, corners = np.arange(len(arm_points())), arm_triangles().copy()
    seam = 1 + AROUND * np.arange(RINGS)
    doubles = np.full(len(points), -1)
    doubles[seam] = len(points) + np.arange(RINGS)
    # a triangle on the far side of the seam has a corner in the last column
    beyond = ((corners - 1) % AROUND == AROUND - 1) & (corners > 0) & (corners < len(points) - 1)
    twin = beyond.any(axis=1)[:, None] & (doubles[corners] >= 0)
    return np.concatenate([points, seam]), np.where(twin, doubles[corners], corners)


def texture_coordinates(of_vertex: np.ndarray) -> np.ndarray:
    """Along the arm and around it, 0 to 1."""
    rest = arm_points()
    along = (rest[:, 0] - rest[0, 0]) / np.ptp(rest[:, 0])
    around = ((np.arange(len(rest)) - 1) % AROUND) / AROUND
    around[[0, -1]] = 0.5
    pairs = np.stack([along, around], axis=1)[of_vertex]
    pairs[len(rest):, 1] = 1.0
    return pairs


def normals() -> np.ndarray:
    points, corners = arm_points(), arm_triangles()
    cross = np.cross(*(points[corners[:, k]] - points[corners[:, 0]] for k in (1, 2)))
    sums = np.stack([np.bincount(corners.ravel(), np.repeat(cross[:, k], 3), len(points)) for k in range(3)], axis=1)
    return sums / np.linalg.norm(sums, axis=1, keepdims=True)


def influences(weights: np.ndarray) -> tuple[np.ndarray, np.ndarray]:
    """Four joints and weights a vertex, the largest first; a joint without weight is joint 0."""
    joints = np.argsort(-weights, axis=1, kind="stable")
    values = np.take_along_axis(weights, joints, axis=1)
    pad = ((0, 0), (0, 1))
    return np.pad(np.where(values > 0.0, joints, 0), pad), np.pad(values, pad)


def character() -> tuple[dict[str, Any], bytes]:
    """The file's JSON, and its binary chunk."""
    of_vertex, corners = with_seam()
    rest, places, names = arm_points(), list(JOINTS.values()), list(JOINTS)
    joints, weights = influences(arm_weights(rest))
    buffer = Buffer()
    attributes = {"POSITION": buffer.add(rest[of_vertex], "VEC3"), "NORMAL": buffer.add(normals()[of_vertex], "VEC3"),
                  "TEXCOORD_0": buffer.add(texture_coordinates(of_vertex), "VEC2"),
                  "JOINTS_0": buffer.add(joints[of_vertex], "VEC4", BYTE),
                  "WEIGHTS_0": buffer.add(weights[of_vertex], "VEC4")}
    indices = buffer.add(corners.reshape(-1, 1), "SCALAR", SHORT)
    inverse_binds = np.repeat(np.eye(4)[None], len(places), axis=0)
    inverse_binds[:, 3, 0] = -np.array(places)  # columns follow each other in the file
    skin = {"inverseBindMatrices": buffer.add(inverse_binds, "MAT4"), "joints": [1, 2, 3], "skeleton": 1}
    seconds, degrees = np.array(FLEX).T
    half = np.radians(degrees) / 2.0
    quaternions = np.stack([0.0 * half, 0.0 * half, np.sin(half), np.cos(half)], axis=1)
    sampler = {"input": buffer.add(seconds[:, None], "SCALAR"), "output": buffer.add(quaternions, "VEC4")}
    bones: list[dict[str, Any]] = [
        {"name": name, "translation": [place - before, 0.0, 0.0], "children": [2 + number]}
        for number, (name, place, before) in enumerate(zip(names, places, [0.0, *places]))]
    del bones[-1]["children"]
    material = {"name": "skin", "pbrMetallicRoughness": {"baseColorFactor": [0.80, 0.52, 0.40, 1.0],
                                                         "metallicFactor": 0.0, "roughnessFactor": 0.6}}
    primitive = {"attributes": attributes, "indices": indices, "material": 0}
    return {"asset": {"version": "2.0", "generator": "neuralWarp examples/arm"}, "scene": 0,
            "scenes": [{"nodes": [0, 1]}], "nodes": [{"name": "arm", "mesh": 0, "skin": 0}, *bones],
            "meshes": [{"name": "arm", "primitives": [primitive]}], "materials": [material], "skins": [skin],
            "animations": [{"name": "flex", "samplers": [sampler],
                            "channels": [{"sampler": 0, "target": {"node": 2, "path": "rotation"}}]}],
            "accessors": buffer.accessors, "bufferViews": buffer.views,
            "buffers": [{"byteLength": len(buffer.content)}]}, buffer.content


def chunk(kind: bytes, content: bytes, padding: bytes) -> bytes:
    content += padding * (-len(content) % 4)
    return struct.pack("<I4s", len(content), kind) + content


def main() -> None:
    if len(sys.argv) != 2 or sys.argv[1].startswith("-"):
        sys.exit(__doc__)
    description, binary = character()
    body = chunk(b"JSON", json.dumps(description).encode(), b" ") + chunk(b"BIN\0", binary, b"\0")
    try:
        with open(sys.argv[1], "wb") as file:
            file.write(struct.pack("<4sII", b"glTF", 2, 12 + len(body)) + body)
    except OSError as error:
        sys.exit(f"write_arm.py: {sys.argv[1]}: {error.strerror}")


if __name__ == "__main__":
    main()
