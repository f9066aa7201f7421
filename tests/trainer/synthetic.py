# SPDX-License-Identifier: Apache-2.0
"""Writes small training data sets whose deltas are a smooth function of the controls."""

import json
from pathlib import Path
from typing import Any, Optional, Sequence

import numpy as np

COLUMNS, ROWS = 8, 6


def make(folder: Path, frames: int = 160, seed: int = 7, affect: Optional[Sequence[int]] = None,
         train: Optional[dict[str, Any]] = None, constant_control: bool = False, motion: bool = False,
         skin: Optional[np.ndarray] = None, **changes: Any) -> Path:
    """A bulge and a twist on a grid of 48 vertices, for three controls. `affect`: vertices of a partial subset;
    `motion`: rows that follow each other, instead of drawn ones; `skin`: float32 [frames, vertices] distances."""
    folder.mkdir(parents=True)
    random = np.random.default_rng(seed)
    controls = random.uniform(-1, 1, (frames, 3))
    if motion:
        controls = np.sin(np.arange(frames)[:, None] / (5, 7, 11) + controls[0])
    deltas = deltas_of(controls)
    if constant_control:
        controls = np.hstack([controls, np.full((frames, 1), 5.0)])
    full = deltas.shape[1]
    if affect is not None:
        deltas = deltas[:, affect]
    count = controls.shape[1]
    description = {
        "format": "neuralWarp training data", "version": 1, "writtenBy": "quarn 0.1.0", "scene": "grid.json",
        "deformer": "warp", "geometry": "grid", "geometryIndex": 0, "frameCount": frames, "controlCount": count,
        "deltaCount": deltas.shape[1], "deltaType": "dos", "deltaMode": 1, "smoothingIterations": 2,
        "subsetState": "complete" if affect is None else "partial", "affectCount": deltas.shape[1], "fullCount": full,
        "componentTagExpression": "*", "controlNames": [f"joint{i}.rotateX" for i in range(count)],
        "controlRanges": [[float(c.min()), float(c.max())] for c in controls.T],
        "metersPerUnit": 0.01, "boundingBoxDiagonal": 10.0,
        "train": {"outputModelName": "grid", "batchSize": 16, "epochs": 40, "learningRate": 0.003,
                  "validationRatio": 0.2, "hiddenLayerCount": 2, "neuronsPerLayer": 32,
                  "activationFunction": "LeakyReLU", "dropoutRatio": 0.0, "principalShapesEnabled": False,
                  "principalShapesLimit": 20, "principalShapesAccuracy": 0.8, "preloadData": True, **(train or {})},
        "files": {"controls": "controls.npy", "deltas": "deltas.npy", "frames": "frames.npy"}}
    if affect is not None:
        description["affectMap"] = list(affect)
    np.save(folder / "controls.npy", controls.astype("<f4"))
    np.save(folder / "deltas.npy", np.ascontiguousarray(deltas, "<f4"))
    np.save(folder / "frames.npy", np.arange(101, 101 + frames, dtype="<i4"))
    if skin is not None:
        np.save(folder / "skin.npy", skin)
        changes = {"files": {"controls": "controls.npy", "deltas": "deltas.npy", "frames": "frames.npy",
                             "skin": "skin.npy"}, **changes}
    (folder / "dataset.json").write_text(json.dumps({**description, **changes}))
    return folder


def deltas_of(controls: np.ndarray) -> np.ndarray:
    u, v = (a.ravel() for a in np.meshgrid(np.linspace(-1, 1, COLUMNS), np.linspace(-1, 1, ROWS)))
    a, b, c = controls.T[:, :, None]
    bulge = np.maximum(a, 0) ** 2 * np.exp(-2 * (u**2 + v**2))
    twist = np.sin(1.5 * b) * u * v
    shift = a * c * (1 + 0.3 * u)
    return 0.2 * np.stack([bulge + 0.1, twist, shift], axis=2)
