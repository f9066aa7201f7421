# SPDX-License-Identifier: Apache-2.0
"""A model for the rebuilt arm, published as the add-on does it, without sampling and training: its network is made by
hand. Two shapes, a bulge outwards and a shift along z, whose coefficients are sums of all controls."""

import json
import struct
import subprocess
import sys
from pathlib import Path
from typing import Any

import neuralwarp
import numpy as np

ROOT = Path(__file__).resolve().parents[3]
sys.path.insert(0, str(ROOT / "examples" / "wave"))

from make import block, number, vector  # noqa: E402
from neuralwarp_blender import character, stack  # noqa: E402

SHAPES = 2


def network(weights: np.ndarray) -> bytes:
    """[controls, SHAPES]: coefficients = controls * weights, as an ONNX file."""
    rows, columns = weights.shape
    tensor = number(1, rows) + number(1, columns) + number(2, 1) + block(8, "weights") + \
        block(9, struct.pack(f"<{weights.size}f", *weights.ravel()))
    product = block(1, "controls") + block(1, "weights") + block(2, "coefficients") + block(4, "MatMul")
    graph = block(1, product) + block(2, "arm") + block(5, tensor) + block(11, vector("controls", rows)) + \
        block(12, vector("coefficients", columns))
    return number(1, 7) + block(7, graph) + block(8, number(2, 13))


def publish_arm(thing: Any, folder: Path, quarn: str) -> None:
    """Writes folder, NAME.nwrp, for the object of rebuild_arm(), or what became of it."""
    looked = stack.read_stack(thing)
    armature = next(modifier.object for modifier in thing.modifiers if modifier.type == "ARMATURE")
    with stack.Switches(thing) as switches:
        made = character.read_character(thing, armature, looked, switches)
    (folder / "rig").mkdir(parents=True)
    character.write_character(made, folder / "arm.glb")
    subprocess.run([quarn, "import", str(folder / "arm.glb"), "-o", str(folder / "rig" / "scene.json"), "--quiet",
                    "--neural-warp", "--limits", str(ROOT / "examples" / "arm" / "limits.json")], check=True)
    (folder / "rig" / "blender.json").write_text(json.dumps({
        "format": "neuralWarp Blender rig", "version": 1, "mesh": thing.name, "armature": armature.name,
        "vertices": len(made.points), "topology": stack.topology(thing.data), "metersPerUnit": 1.0,
        "bones": [{"bone": joint.bone, "joint": joint.name} for joint in made.joints],
        "muted": {"modifiers": list(looked.muted_modifiers), "shapeKeys": list(looked.shape_keys)}}))
    with neuralwarp.Scene.open(folder / "rig" / "scene.json") as scene:
        controls, rest = len(scene.controls()), scene.points(f"{made.mesh}.outMesh")
    count = len(rest)  # without those that the scene has joined
    weights = np.full((controls, SHAPES), 0.25) * [1.0, -1.0]
    outwards = rest * [0.0, 0.2, 0.2]
    shapes = np.stack([outwards, np.tile([0.0, 0.0, 0.01], (count, 1))]).reshape(SHAPES, -1)
    (folder / "model.onnx").write_bytes(network(weights))
    (folder / "principal_shapes.json").write_text(json.dumps(
        {"principalShapeCount": SHAPES, "vertCount": count, "principalShapes": shapes.tolist()}))
    (folder / "metadata.json").write_text(json.dumps({
        "deltaMode": 0, "smoothingIterations": 0, "fullCount": count, "affectCount": count, "deltaCount": count,
        "subsetState": "complete", "componentTagExpression": "*", "geometry": made.mesh}))
