# SPDX-License-Identifier: Apache-2.0
"""The strip of examples/wave, with variants of its model."""

import json
import shutil
from pathlib import Path

import numpy as np

WAVE = Path(__file__).resolve().parents[3] / "examples" / "wave"
COLUMNS, ROWS = 41, 9
N = COLUMNS * ROWS


def _mesh() -> tuple[np.ndarray, np.ndarray]:
    nodes = {node["name"]: node for node in json.loads((WAVE / "wave.json").read_text())["nodes"]}
    mesh = nodes["strip"]["values"]["inMesh"]
    return np.array(mesh["points"], np.float32).reshape(-1, 3), np.array(mesh["corners"]).reshape(-1, 4)


POINTS, FACES = _mesh()
CERTIFICATE = {"trainingFrames": 8, "controls": {"minima": [-1.0, 0.0], "maxima": [1.0, 2.0]},
               "errors": [{"frames": 3, "heldOut": "drawn at random", "poses": "drawn", "dataSet": "sha256:0",
                           "mm": {name: {"mean": 1.0, "p99": 2.0, "p9999": 3.0, "max": 4.0}
                                  for name in ("network", "skin")}}]}


def model_in(folder: Path, **metadata: object) -> Path:
    """A copy of the example's model, with other members of its metadata."""
    copy = folder / "strip.nwrp"
    shutil.rmtree(copy, ignore_errors=True)
    shutil.copytree(WAVE / "models" / "wave.nwrp", copy)
    path = copy / "metadata.json"
    path.write_text(json.dumps({**json.loads(path.read_text()), **metadata}))
    return copy
