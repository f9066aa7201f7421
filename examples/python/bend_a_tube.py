#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""A neural deformation in Python alone: trains what linear blend skinning loses of a tube, applies it and plots it.

usage: bend_a_tube.py FOLDER [EPOCHS]
    FOLDER  for the training data, the model and tube.png; made when it is missing

Two bones bend and twist the tube. Skinned linearly, it collapses at the joint; what it should be turns smoothly from
one bone to the other. The network learns the difference, as offsets, from 400 poses that are drawn at random.
"""

import json
import sys
from pathlib import Path

import numpy as np

import neuralwarp

RINGS, SIDES, RADIUS = 32, 16, 0.5
CONTROLS, LIMIT = ["bend", "twist"], np.radians(100)
POSES = 400


def tube() -> tuple[np.ndarray, np.ndarray]:
    """Points along x, from -2 to 2, and quads."""
    x, angle = np.meshgrid(np.linspace(-2, 2, RINGS), np.arange(SIDES) * 2 * np.pi / SIDES, indexing="ij")
    points = np.stack([x, RADIUS * np.cos(angle), RADIUS * np.sin(angle)], axis=2).reshape(-1, 3)
    ring, side = np.meshgrid(np.arange(RINGS - 1), np.arange(SIDES), indexing="ij")
    quads = np.stack([ring * SIDES + side, ring * SIDES + (side + 1) % SIDES,
                      (ring + 1) * SIDES + (side + 1) % SIDES, (ring + 1) * SIDES + side], axis=2)
    return points.astype(np.float32), quads.reshape(-1, 4)


REST, QUADS = tube()
WEIGHTS = np.clip(REST[:, 0] / 1.5 + 0.5, 0, 1).astype(float)  # of the second bone


def turned(points: np.ndarray, bend: np.ndarray, twist: np.ndarray) -> np.ndarray:
    """By `twist` about x, and by `bend` about z; one angle for each point, or for all."""
    x, y, z = points.T.astype(float)
    y, z = np.cos(twist) * y - np.sin(twist) * z, np.sin(twist) * y + np.cos(twist) * z
    return np.stack([np.cos(bend) * x - np.sin(bend) * y, np.sin(bend) * x + np.cos(bend) * y, z], axis=1)


def skinned(controls: np.ndarray) -> np.ndarray:
    """What a rig gives: the mean of what each bone makes of a point."""
    second = turned(REST, *controls)
    return (REST + WEIGHTS[:, None] * (second - REST)).astype(np.float32)


def wanted(controls: np.ndarray) -> np.ndarray:
    """What it should be: each point turned by its part of the angles."""
    return turned(REST, *(WEIGHTS * angle for angle in controls)).astype(np.float32)


def write_training_data(folder: Path) -> Path:
    """As `quarn export` writes it (docs/dataset.md)."""
    controls = np.random.default_rng(1).uniform(-LIMIT, LIMIT, (POSES, 2)).astype("<f4")
    folder.mkdir(parents=True, exist_ok=True)
    np.save(folder / "controls.npy", controls)
    np.save(folder / "deltas.npy", np.stack([wanted(c) - skinned(c) for c in controls]).astype("<f4"))
    np.save(folder / "frames.npy", np.arange(POSES, dtype="<i4"))
    (folder / "dataset.json").write_text(json.dumps({
        "format": "neuralWarp training data", "version": 1, "writtenBy": "bend_a_tube.py", "scene": "none",
        "deformer": "warp", "geometry": "tube", "geometryIndex": 0, "frameCount": POSES, "controlCount": 2,
        "controlNames": CONTROLS, "controlRanges": [[-float(LIMIT), float(LIMIT)]] * 2, "deltaCount": len(REST),
        "deltaType": "dbp", "deltaMode": 0, "smoothingIterations": 0, "subsetState": "complete",
        "affectCount": len(REST), "fullCount": len(REST), "componentTagExpression": "*", "metersPerUnit": 0.1,
        "boundingBoxDiagonal": float(np.linalg.norm(np.ptp(REST, axis=0))),
        "train": {"outputModelName": "tube", "batchSize": 32, "learningRate": 0.003, "neuronsPerLayer": 64,
                  "principalShapesEnabled": False},
        "files": {name: f"{name}.npy" for name in ("controls", "deltas", "frames")}}))
    return folder


def plot(path: Path, shapes: dict[str, np.ndarray]) -> None:
    import matplotlib
    matplotlib.use("Agg")  # no screen
    from matplotlib import pyplot

    figure = pyplot.figure(figsize=(4 * len(shapes), 4))
    for place, (title, points) in enumerate(shapes.items()):
        axes = figure.add_subplot(1, len(shapes), place + 1, projection="3d")
        axes.set_title(title, y=0.9)
        rings = points.reshape(RINGS, SIDES, 3)[:, [*range(SIDES), 0]]
        axes.plot_surface(*rings.transpose(2, 0, 1), rstride=1, cstride=1, color="lightsteelblue", edgecolor="grey",
                          linewidth=0.2)
        axes.set_box_aspect(np.ptp(rings, axis=(0, 1)))
        axes.view_init(elev=50, azim=-70)
        axes.set_axis_off()
    figure.tight_layout()
    figure.savefig(path, dpi=100)


def main() -> None:
    folder = Path(sys.argv[1])
    epochs = int(sys.argv[2]) if len(sys.argv) > 2 else 100
    neuralwarp.train(write_training_data(folder / "data"), folder / "tube.nwrp", epochs=epochs,
                     options=["--activation", "SiLU", "--quarn", "none", "--quiet"])

    model = neuralwarp.Model.load(folder / "tube.nwrp")
    deformer = neuralwarp.Deformer(model, QUADS, REST)
    controls = np.random.default_rng(2).uniform(-LIMIT, LIMIT, (100, 2)).astype(np.float32)
    skin = np.stack([skinned(c) for c in controls])
    goal = np.stack([wanted(c) for c in controls])
    neural = deformer.evaluate_batch(skin, controls)
    errors = {name: 100 * float(np.linalg.norm(points - goal, axis=2).mean())  # a unit is 0.1 m
              for name, points in (("skin", skin), ("neural", neural))}
    print("mean error over 100 other poses: " + ", ".join(f"{name} {mm:.2f} mm" for name, mm in errors.items()))
    print(f"expected at bend 1, twist 0: {model.expected_error([1, 0])} mm; "
          f"distance from the training at bend 3: {model.distance([3, 0]):.2f}")

    pose = np.radians([90, 80]).astype(np.float32)
    plot(folder / "tube.png", {"linear blend skinning": skinned(pose),
                               "with the model": deformer.evaluate(skinned(pose), pose),
                               "as it should be": wanted(pose)})
    print(f"{folder / 'tube.png'}")


if __name__ == "__main__":
    main()
