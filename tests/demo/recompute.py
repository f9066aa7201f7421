# SPDX-License-Identifier: Apache-2.0
"""recompute.py FOLDER QUARN: the figures of a report, of a demo or of quarn run, once more from what quarn plays and
the files it is about; differences end it."""

import json
import math
import subprocess
import sys
import tempfile
from pathlib import Path
from typing import Any

import numpy as np

folder, quarn = Path(sys.argv[1]), sys.argv[2]
report = json.loads((folder / "report.json").read_text())
is_run = (folder / "run.json").exists()


def points_of(scene: Path, row: dict[str, Any], *words: str) -> np.ndarray:
    """[frames, vertices, 3], as quarn play writes them."""
    with tempfile.TemporaryDirectory() as place:
        file = Path(place) / "points.npy"
        frames = f"{row['frames'][0]}-{row['frames'][-1]}"
        subprocess.run([quarn, "play", str(scene), "--geometry", row["mesh"], "--frames", frames, *words,
                        "-o", str(file)], check=True, stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
        return np.load(file).astype(float)


def compare(name: str, said: float, value: float, above: float) -> None:
    """`above`: how much more, in parts of it, may be said."""
    if not value - 1e-6 <= said <= value * (1 + above) + 1e-6:
        sys.exit(f"{name}: the report says {said}, the files {value}")


compared = 0
for row in report["rows"]:
    name = f"{row['mode']}_{row['kind']}"
    run = folder if is_run else folder / "data" / name
    data, model = run / "data" / row["mesh"], run / "models" / f"{row['mesh']}.nwrp"
    scene = run / row["scene"]
    made = data if is_run else folder / "data" / "surface_principal" / "data" / row["mesh"]
    target = np.load(made / f"{row['scene'].split('.')[0]}_target.npy").astype(float)
    target = target[row["frames"][0] - 1:row["frames"][-1]]
    mm = 1000 * json.loads((data / "heldOut" / "dataset.json").read_text())["metersPerUnit"]
    deltas = np.load(data / "heldOut" / "deltas.npy").astype(float)
    on_cpu = points_of(scene, row, "--model", row["mesh"])
    moved = {"skin": points_of(scene, row, "--no-model") - target, "base": deltas, "network": on_cpu - target}
    if row["kind"] == "principal":
        file = json.loads((model / "principal_shapes.json").read_text())
        shapes = np.array(file["principalShapes"]).T
        columns = deltas.reshape(len(deltas), -1).T
        moved["basis"] = (columns - shapes @ np.linalg.lstsq(shapes, columns, rcond=None)[0]).T.reshape(deltas.shape)
    for stage, vectors in moved.items():
        errors = np.sqrt(np.sum(np.square(vectors), axis=2)) * mm
        compared += 4
        compare(f"{name}: {stage} mean", row[stage]["mean_mm"], np.mean(errors), 0)
        compare(f"{name}: {stage} max", row[stage]["max_mm"], np.max(errors), 0)
        for figure, part in (("p99", 0.99), ("p9999", 0.9999)):
            if stage in ("skin", "network"):  # quarn counts, and says at most 0.1 % too much
                value, above = np.sort(errors, axis=None)[math.ceil(part * errors.size) - 1], 1 / 1024
            else:
                value, above = np.quantile(errors, part), 0
            compare(f"{name}: {stage} {figure}", row[stage][f"{figure}_mm"], float(value), above)
    if row["gpu"] and row["gpu"]["deformations"]:
        on_gpu = points_of(scene, row, "--model", row["mesh"], "--evaluator", "gpu")
        apart = np.sqrt(np.sum(np.square((on_gpu - on_cpu) * mm), axis=2)).max()
        compare(f"{name}: from CPU to GPU", row["gpu"]["difference"]["max_mm"], apart, 0)
        if not apart < 1e-2 or not row["gpu"]["deformations"] > 2.5 * len(deltas):
            sys.exit(f"{name}: {apart} mm from CPU to GPU, deformed {row['gpu']['deformations']} times")
    if row["kind"] == "direct" and row["basis"] is not None:
        sys.exit(f"{name}: a direct model has no basis, and the report has its error")
print(f"{compared} figures agree")
