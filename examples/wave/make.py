#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""Writes the example beside this script: the scene wave.json and the model directory models/wave.nwrp.

The model is constructed, not trained: two principal shapes, a wave along the strip and a fold across it, whose
coefficients are the two control values. Needs nothing but Python.
"""

import json
import math
import struct
from pathlib import Path
from typing import Any, Union

FOLDER = Path(__file__).resolve().parent
COLUMNS, ROWS = 41, 9  # vertices of the strip
SMOOTHING = 2


def strip() -> tuple[list[list[float]], list[tuple[int, int, int, int]]]:
    points = [[0.1 * c, 0.1 * r, 0.0] for r in range(ROWS) for c in range(COLUMNS)]
    quads = [(r * COLUMNS + c, r * COLUMNS + c + 1, (r + 1) * COLUMNS + c + 1, (r + 1) * COLUMNS + c)
             for r in range(ROWS - 1) for c in range(COLUMNS - 1)]
    return points, quads


def as_float(value: float) -> float:
    return struct.unpack("f", struct.pack("f", value))[0]


def shapes(points: list[list[float]]) -> list[list[float]]:
    """Offsets in the frame of the rest surface: here, along z."""
    length, width = points[-1][0], points[-1][1]
    wave = [0.4 * math.sin(2.0 * math.pi * x / length) for x, _, _ in points]
    fold = [0.3 * abs(2.0 * y / width - 1.0) for _, y, _ in points]
    return [[as_float(v) for z in shape for v in (0.0, 0.0, z)] for shape in (wave, fold)]


# --- the network, coefficients = controls * identity, in the wire format of an ONNX file ---

def varint(value: int) -> bytes:
    out = bytearray()
    while value >= 128:
        out.append(value & 127 | 128)
        value >>= 7
    return bytes(out + bytearray([value]))


def number(field: int, value: int) -> bytes:
    return varint(field << 3) + varint(value)


def block(field: int, content: Union[str, bytes]) -> bytes:
    content = content.encode() if isinstance(content, str) else content
    return varint(field << 3 | 2) + varint(len(content)) + content


def vector(name: str, size: int) -> bytes:
    shape = block(1, number(1, size))
    return block(1, name) + block(2, block(1, number(1, 1) + block(2, shape)))


def network() -> bytes:
    identity = struct.pack("<4f", 1, 0, 0, 1)
    weights = number(1, 2) + number(1, 2) + number(2, 1) + block(8, "weights") + block(9, identity)
    product = block(1, "controls") + block(1, "weights") + block(2, "coefficients") + block(4, "MatMul")
    graph = (block(1, product) + block(2, "wave") + block(5, weights) +
             block(11, vector("controls", 2)) + block(12, vector("coefficients", 2)))
    return number(1, 7) + block(7, graph) + block(8, number(2, 13))


def write_model(folder: Path, points: list[list[float]]) -> None:
    folder.mkdir(parents=True, exist_ok=True)
    count = len(points)
    metadata = {"deltaMode": 1, "smoothingIterations": SMOOTHING, "fullCount": count, "affectCount": count,
                "deltaCount": count, "subsetState": "complete", "componentTagExpression": "*", "geometry": "strip"}
    basis = shapes(points)
    (folder / "metadata.json").write_text(json.dumps(metadata, indent=1) + "\n")
    (folder / "principal_shapes.json").write_text(json.dumps(
        {"principalShapeCount": len(basis), "vertCount": count, "principalShapes": basis}) + "\n")
    (folder / "model.onnx").write_bytes(network())


def scene(points: list[list[float]], quads: list[tuple[int, int, int, int]]) -> dict[str, Any]:
    mesh = {"points": [v for point in points for v in point], "counts": [4] * len(quads),
            "corners": [v for quad in quads for v in quad]}
    nodes = [
        {"name": "strip", "type": "mesh", "values": {"inMesh": mesh}},
        {"name": "controls", "type": "controlCollector",
         "values": {"inputList[0].input": {"0": [0.0, 0.0]}}},
        {"name": "wave", "type": "neuralWarp",
         "values": {"modelRoot": "models", "models[0]": {"modelName": "wave", "modelActive": 1}}},
    ]
    connections = [["strip.outMesh", "wave.input[0].inputGeometry"], ["strip.outMesh", "wave.originalGeometry[0]"],
                   ["controls.output", "wave.controlValues"]]
    return {"openquarnScene": 1, "nodes": nodes, "connections": connections}


def main() -> None:
    points, quads = strip()
    write_model(FOLDER / "models" / "wave.nwrp", points)
    (FOLDER / "wave.json").write_text(json.dumps(scene(points, quads)) + "\n")


if __name__ == "__main__":
    main()
