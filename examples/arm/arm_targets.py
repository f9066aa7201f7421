#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""arm_targets.py REQUEST.json: the arm's shapes, for quarn run --target-command. Vertices may be in any order: which
one is which point of the arm is known by its place at rest."""

import json
import sys

import numpy as np
from arm_shape import arm_points, arm_triangles
from muscles import Arm

NEAREST = 1e-5  # metres within which a vertex at rest is a point of the arm


def triangles_between(rest: np.ndarray) -> np.ndarray:
    """The arm's triangles as indices of `rest`, [V, 3], in which every point of the arm has to be."""
    points = arm_points()
    nearest = np.array([np.argmin(((rest - point) ** 2).sum(axis=1)) for point in points])
    if np.abs(rest[nearest] - points).max() > NEAREST:
        sys.exit("arm_targets.py: the mesh is not the one of write_arm.py: a point of it has no vertex at rest")
    return nearest[arm_triangles()]


def main() -> None:
    if len(sys.argv) != 2:
        sys.exit(__doc__)
    with open(sys.argv[1], encoding="utf-8") as file:
        request = json.load(file)
    if request["version"] != 1:
        sys.exit(f"arm_targets.py: knows requests of version 1, not of version {request['version']}")
    skin = np.load(request["skin"]["file"], mmap_mode="r", allow_pickle=False)
    rest = np.load(request["skin"]["rest"], allow_pickle=False)[0].astype(float)
    arm = Arm(rest, triangles_between(rest))
    shapes = np.empty((len(request["frames"]), *rest.shape), dtype="<f4")
    for row, frame in enumerate(request["frames"]):
        shapes[row] = arm.pose(skin[frame - request["skin"]["firstFrame"]].astype(float))
        if row % 50 == 49 or row + 1 == len(shapes):
            print(f"{row + 1} of {len(shapes)}", flush=True)
    np.save(request["write"], shapes)


if __name__ == "__main__":
    main()
