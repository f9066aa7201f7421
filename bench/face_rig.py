#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""A face with sliders, made by arithmetic, to measure what networks make of one (docs/quality.md).

usage: face_rig.py FACE.glb MOTION.json   writes the character, and a motion that no training sees
       face_rig.py REQUEST.json           makes its targets, for quarn run --target-command

The character has a rough shape for each slider. The targets have the sculpted one, which reaches further; a jaw that
turns about its hinge; and correctives on products of two and three sliders whose shapes meet.
"""

import itertools
import json
import struct
import sys
from pathlib import Path
from typing import Any

import numpy as np

ACROSS, DOWN = 60, 45      # vertices of the face, a part of an ellipsoid
RADII = np.array([0.075, 0.105, 0.085])  # metres
SIDES = 14                 # pairs of sliders, left and right; slider 0 is the jaw
FLOAT, SHORT = 5126, 5123  # component types of glTF
FRAMES = 240
HINGE = np.array([0.0, -0.01, 0.0])
JAW_ANGLE = 0.35           # radians


def rest_points() -> np.ndarray:
    along, down = np.meshgrid(np.linspace(-1.25, 1.25, ACROSS), np.linspace(1.1, -1.25, DOWN))
    unit = np.stack([np.sin(along) * np.cos(down), np.sin(down), np.cos(along) * np.cos(down)], axis=-1)
    return (unit * RADII).reshape(-1, 3)


def triangles() -> np.ndarray:
    first = (np.arange(DOWN - 1)[:, None] * ACROSS + np.arange(ACROSS - 1)).ravel()
    below = first + ACROSS
    return np.concatenate([np.stack([first, below, first + 1], 1), np.stack([first + 1, below, below + 1], 1)])


class Face:
    """Shapes of the sliders, [S, V, 3], and the correctives with the sliders that they belong to."""

    def __init__(self) -> None:
        self.rest = rest_points()
        random = np.random.default_rng(20)
        self.names = ["jawOpen"] + [f"part{number:02}{side}" for number in range(SIDES) for side in "LR"]
        places, sizes, ways = [self.rest[(DOWN * 4 // 5) * ACROSS + ACROSS // 2]], [0.045], [np.array([0, -0.01, 0.0])]
        for _ in range(SIDES):
            place = self.rest[random.integers(DOWN) * ACROSS + random.integers(ACROSS // 2)]
            size, way = random.uniform(0.018, 0.035), random.normal(0.0, 0.006, 3)
            for mirror in (1.0, -1.0):
                places.append(place * [mirror, 1, 1])
                sizes.append(size)
                ways.append(way * [mirror, 1, 1])
        self.rough = np.array([self.bump(*one, 0.8) for one in zip(places, sizes, ways)])
        self.sculpted = np.array([self.bump(*one, 1.0) for one in zip(places, sizes, ways)])
        self.rough[0] = self.jaw_weight()[:, None] * (self.turned(0.3 * JAW_ANGLE) - self.rest) / 0.3
        self.correctives: list[tuple[tuple[int, ...], np.ndarray]] = []
        for count, share in ((2, 1.0), (3, 0.35)):
            for group in itertools.combinations(range(len(places)), count):
                near = all(np.linalg.norm(places[a] - places[b]) < 0.9 * (sizes[a] + sizes[b])
                           for a, b in itertools.combinations(group, 2))
                if near and random.random() < share:
                    middle = np.mean([places[slider] for slider in group], axis=0)
                    size = float(np.mean([sizes[slider] for slider in group]))
                    self.correctives.append((group, self.bump(middle, size, random.normal(0.0, 0.004, 3), 0.7)))

    def bump(self, place: np.ndarray, size: float, way: np.ndarray, reach: float) -> np.ndarray:
        distance = np.linalg.norm(self.rest - place, axis=1) / (size * reach)
        return np.maximum(0.0, 1.0 - distance**2)[:, None]**2 * way

    def jaw_weight(self) -> np.ndarray:
        return np.clip((-0.02 - self.rest[:, 1]) / 0.05, 0.0, 1.0)

    def turned(self, angle: float) -> np.ndarray:
        """The face turned about the axis of the jaw."""
        c, s = np.cos(angle), np.sin(angle)
        return (self.rest - HINGE) @ np.array([[1, 0, 0], [0, c, s], [0, -s, c]]) + HINGE

    def weights_of(self, skin: np.ndarray, rest: np.ndarray) -> np.ndarray:
        """Sliders of skinned shapes [F, V, 3], from how vertices moved."""
        shapes = self.rough.reshape(len(self.rough), -1)
        moved = (skin.astype(float) - rest).reshape(len(skin), -1)
        return np.linalg.lstsq(shapes.T, moved.T, rcond=None)[0].T

    def target(self, weights: np.ndarray) -> np.ndarray:
        jaw = self.jaw_weight()[:, None] * (self.turned(JAW_ANGLE * weights[0]) - self.rest)
        shape = self.rest + jaw + np.tensordot(weights[1:], self.sculpted[1:], 1)
        for group, corrective in self.correctives:
            shape = shape + np.prod(weights[list(group)]) * corrective
        return shape


def write_character(face: Face, path: str) -> None:
    content, views, accessors = b"", [], []

    def add(array: np.ndarray, kind: str, component: int) -> int:
        nonlocal content
        rows = array.astype({FLOAT: "<f4", SHORT: "<u2"}[component])
        views.append({"buffer": 0, "byteOffset": len(content), "byteLength": rows.nbytes})
        content += rows.tobytes() + b"\0" * (-rows.nbytes % 4)
        flat = rows.reshape(len(rows), -1)
        accessors.append({"bufferView": len(views) - 1, "componentType": component, "count": len(rows), "type": kind,
                          "min": flat.min(axis=0).tolist(), "max": flat.max(axis=0).tolist()})
        return len(accessors) - 1

    primitive = {"attributes": {"POSITION": add(face.rest, "VEC3", FLOAT)},
                 "indices": add(triangles().reshape(-1, 1), "SCALAR", SHORT),
                 "targets": [{"POSITION": add(shape, "VEC3", FLOAT)} for shape in face.rough]}
    mesh = {"name": "face", "primitives": [primitive], "weights": [0.0] * len(face.names),
            "extras": {"targetNames": face.names}}
    description: dict[str, Any] = {
        "asset": {"version": "2.0", "generator": "neuralWarp bench"}, "scene": 0, "scenes": [{"nodes": [0]}],
        "nodes": [{"name": "face", "mesh": 0}], "meshes": [mesh], "accessors": accessors, "bufferViews": views,
        "buffers": [{"byteLength": len(content)}]}
    text = json.dumps(description).encode()
    text += b" " * (-len(text) % 4)
    Path(path).write_bytes(struct.pack("<4sII", b"glTF", 2, 28 + len(text) + len(content))
                           + struct.pack("<I4s", len(text), b"JSON") + text
                           + struct.pack("<I4s", len(content), b"BIN\0") + content)


def write_motion(face: Face, path: str) -> None:
    """Sliders that rise and fall, a few at once, as faces do."""
    random = np.random.default_rng(21)
    keys = {}
    for name in face.names:
        times = np.unique(np.concatenate([[1, FRAMES], random.integers(2, FRAMES, 12)]))
        values = np.where(random.random(len(times)) < 0.5, random.uniform(0.2, 1.0, len(times)), 0.0)
        values[[0, -1]] = 0.0
        keys[f"face_sliders.{name}"] = [[int(time), round(float(value), 3)] for time, value in zip(times, values)]
    Path(path).write_text(json.dumps({"unit": "degrees", "interpolation": "smooth", "keys": keys}, indent=1) + "\n")


def make_targets(face: Face, request: dict[str, Any]) -> None:
    skin = np.load(request["skin"]["file"], mmap_mode="r", allow_pickle=False)
    rest = np.load(request["skin"]["rest"], allow_pickle=False)[0].astype(float)
    if rest.shape != face.rest.shape or np.abs(rest - face.rest).max() > 1e-5:
        sys.exit("face_rig.py: the mesh is not the one that it writes")
    weights = face.weights_of(skin[np.array(request["frames"]) - request["skin"]["firstFrame"]], rest)
    np.save(request["write"], np.array([face.target(row) for row in weights], "<f4"))


def main() -> None:
    face = Face()
    if len(sys.argv) == 3:
        write_character(face, sys.argv[1])
        write_motion(face, sys.argv[2])
    elif len(sys.argv) == 2 and not sys.argv[1].startswith("-"):
        make_targets(face, json.loads(Path(sys.argv[1]).read_text()))
    else:
        sys.exit(__doc__)


if __name__ == "__main__":
    main()
