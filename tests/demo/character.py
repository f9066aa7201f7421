#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""character.py FILE.gltf: a small character of three meshes. A body of two joints, a head on the upper one with two
morph targets, and teeth that follow no joint and have one; its animation bends the body and opens the mouth.

character.py REQUEST.json: shapes for its poses, as quarn run --target-command asks for them: the skin, which bulges
where it is far from its rest."""

import base64
import json
import math
import sys
from typing import Any, Optional

import numpy as np

COLUMNS, ROWS = 8, 6
FLOAT, SHORT = 5126, 5123


class File:
    """The lists of a glTF file, and its numbers."""

    def __init__(self) -> None:
        self.data = b""
        self.views: list[dict[str, Any]] = []
        self.accessors: list[dict[str, Any]] = []
        self.meshes: list[dict[str, Any]] = []

    def add(self, numbers: Any, kind: str) -> int:
        array = np.ascontiguousarray(numbers, "<u2" if kind in ("SCALAR u2", "VEC4 u2") else "<f4")
        name, _, short = kind.partition(" ")
        self.views.append({"buffer": 0, "byteOffset": len(self.data), "byteLength": array.nbytes})
        self.data += array.tobytes() + bytes(-array.nbytes % 4)
        rows = array.reshape(array.size if name == "SCALAR" else len(array), -1)
        self.accessors.append({"bufferView": len(self.views) - 1, "componentType": SHORT if short else FLOAT,
                               "count": len(rows), "type": name, "min": rows.min(0).tolist(),
                               "max": rows.max(0).tolist()})
        return len(self.accessors) - 1

    def mesh(self, points: np.ndarray, targets: dict[str, np.ndarray], bend: Optional[np.ndarray]) -> int:
        """A grid; `bend` is the weight of the upper joint."""
        at = np.arange(COLUMNS * ROWS).reshape(ROWS, COLUMNS)
        a, b, c, d = at[:-1, :-1], at[:-1, 1:], at[1:, 1:], at[1:, :-1]
        triangles = np.stack([a, b, c, a, c, d], axis=2).ravel()
        attributes = {"POSITION": self.add(points, "VEC3")}
        if bend is not None:
            none = np.zeros_like(bend)
            attributes["JOINTS_0"] = self.add(np.tile([0, 1, 0, 0], (len(bend), 1)), "VEC4 u2")
            attributes["WEIGHTS_0"] = self.add(np.stack([1 - bend, bend, none, none], axis=1), "VEC4")
        primitive: dict[str, Any] = {"attributes": attributes, "indices": self.add(triangles, "SCALAR u2")}
        mesh: dict[str, Any] = {"primitives": [primitive]}
        if targets:
            primitive["targets"] = [{"POSITION": self.add(deltas, "VEC3")} for deltas in targets.values()]
            mesh["extras"] = {"targetNames": list(targets)}
        self.meshes.append(mesh)
        return len(self.meshes) - 1


def grid(bottom: float, top: float, depth: float) -> np.ndarray:
    u, v = (a.ravel() for a in np.meshgrid(np.linspace(-0.5, 0.5, COLUMNS), np.linspace(0, 1, ROWS)))
    return np.stack([u, bottom + (top - bottom) * v, depth * np.cos(math.pi * u)], axis=1)


def character() -> dict[str, Any]:
    file = File()
    body, head, teeth = grid(0, 2, 0.4), grid(2, 3, 0.5), grid(2.3, 2.5, 0.3)
    smile, jaw = np.zeros_like(head), np.zeros_like(head)
    smile[:, 0] = 0.2 * head[:, 0] * np.exp(-8 * (head[:, 1] - 2.4)**2)
    jaw[:, 1] = -0.3 * np.exp(-8 * (head[:, 1] - 2.2)**2)
    file.mesh(body, {}, np.clip(body[:, 1] - 0.5, 0, 1))
    file.mesh(head, {"smile": smile, "jawOpen": jaw}, np.ones(len(head)))
    file.mesh(teeth, {"jawOpen": np.tile([0, -0.2, 0], (len(teeth), 1))}, None)
    binds = np.tile(np.eye(4), (2, 1, 1))
    binds[1, 3, 1] = -1
    times = file.add([0, 0.5, 1], "SCALAR")
    turn = [[0, 0, 0, 1], [0, 0, math.sin(0.3), math.cos(0.3)], [math.sin(0.2), 0, 0, math.cos(0.2)]]
    samplers = [file.add(turn, "VEC4"), file.add([0, 0, 1, 0.2, 0, 1.4], "SCALAR"), file.add([0, 0.2, 1], "SCALAR")]
    paths = [(1, "rotation"), (3, "weights"), (4, "weights")]
    skin = {"joints": [0, 1], "inverseBindMatrices": file.add(binds.reshape(2, 16), "MAT4")}
    return {
        "asset": {"version": "2.0"}, "scene": 0, "scenes": [{"nodes": [0, 2, 3, 4]}],
        "nodes": [{"name": "hips", "children": [1]}, {"name": "chest", "translation": [0, 1, 0]},
                  {"name": "body", "mesh": 0, "skin": 0}, {"name": "head", "mesh": 1, "skin": 0},
                  {"name": "teeth", "mesh": 2}],
        "skins": [skin], "meshes": file.meshes, "accessors": file.accessors, "bufferViews": file.views,
        "animations": [{"name": "talk",
                        "samplers": [{"input": times, "output": output} for output in samplers],
                        "channels": [{"sampler": i, "target": {"node": node, "path": path}}
                                     for i, (node, path) in enumerate(paths)]}],
        "buffers": [{"byteLength": len(file.data), "uri": "data:application/octet-stream;base64,"
                     + base64.b64encode(file.data).decode()}]}


def shapes(request: dict[str, Any]) -> np.ndarray:
    skin, rest = np.load(request["skin"]["file"]), np.load(request["skin"]["rest"])
    moved = skin[[frame - request["skin"]["firstFrame"] for frame in request["frames"]]]
    far = np.linalg.norm(moved - rest.reshape(moved[0].shape), axis=2, keepdims=True)
    return (moved + far**2 * [0.0, 0.0, 0.3]).astype("<f4")


def main() -> None:
    if len(sys.argv) == 2 and sys.argv[1].endswith(".gltf"):
        with open(sys.argv[1], "w", encoding="utf-8") as file:
            json.dump(character(), file)
        return
    with open(sys.argv[1], encoding="utf-8") as file:
        request = json.load(file)
    np.save(request["write"], shapes(request))


if __name__ == "__main__":
    main()
