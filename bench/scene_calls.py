#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""What a frame of a rig costs by neuralwarp.Scene, before its mesh: joints set, controls read. Medians.

usage: scene_calls.py BUILD
    BUILD   the build folder
"""

import json
import statistics
import sys
import tempfile
import time
from pathlib import Path
from typing import Any, Callable

import numpy as np

sys.path.insert(0, str(Path(sys.argv[1]).resolve() / "clients" / "python"))

import neuralwarp  # noqa: E402

JOINTS, ROUNDS = 25, 1000
ATTRIBUTES = [part + axis for part in ("rotate", "translate", "scale") for axis in "XYZ"] + ["jointOrientX"]


def rig(folder: Path) -> Path:
    """A chain of joints, whose rotations are the controls of a deformer without a mesh."""
    nodes: list[dict[str, Any]] = [{"name": f"joint{i}", "type": "joint"} for i in range(JOINTS)]
    wires = [[f"joint{i}.worldMatrix", f"joint{i + 1}.parentMatrix"] for i in range(JOINTS - 1)]
    wires += [[f"joint{i // 3}.rotate{'XYZ'[i % 3]}", f"controls.inputList[0].input[{i}]"] for i in range(3 * JOINTS)]
    wires.append(["controls.output", "warp.controlValues"])
    nodes += [{"name": "controls", "type": "controlCollector"}, {"name": "warp", "type": "neuralWarp"}]
    (folder / "rig.json").write_text(json.dumps({"openquarnScene": 1, "nodes": nodes, "connections": wires}))
    return folder / "rig.json"


def milliseconds(call: Callable[[], object]) -> float:
    times = []
    for _ in range(ROUNDS):
        begin = time.perf_counter()
        call()
        times.append(time.perf_counter() - begin)
    return 1000 * statistics.median(times)


def main() -> None:
    with tempfile.TemporaryDirectory() as folder:
        scene = neuralwarp.Scene.open(rig(Path(folder)))
    plugs = scene.plugs([f"joint{i}.{name}" for i in range(JOINTS) for name in ATTRIBUTES])
    random, values = np.random.default_rng(1), plugs.get()
    rotations = np.arange(JOINTS)[:, None] * len(ATTRIBUTES) + np.arange(3)

    def turn() -> None:
        values[rotations] = random.uniform(-90, 90, rotations.shape)
        plugs.set(values)

    def frame() -> None:
        turn()
        scene.controls()

    print(f"{len(plugs)} numbers set, {rotations.size} of them new: {milliseconds(turn):.3f} ms; "
          f"all of them new: {milliseconds(lambda: plugs.set(random.uniform(1, 2, len(plugs)))):.3f} ms")
    print(f"the {rotations.size} and {len(scene.controls())} controls: {milliseconds(frame):.3f} ms")


if __name__ == "__main__":
    main()
