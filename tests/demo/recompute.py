# SPDX-License-Identifier: Apache-2.0
"""recompute.py FOLDER: the table of a report, of a demo or of quarn run, once more from the files it is about;
differences end it."""

import json
import sys
from pathlib import Path
from typing import Any

import numpy as np

folder = Path(sys.argv[1])
report = json.loads((folder / "report.json").read_text())
rows_file = folder / "rows.json"
meshes = [row["mesh"] for row in json.loads(rows_file.read_text())["rows"]] if rows_file.exists() else None


def files_of(number: int, row: dict[str, Any]) -> dict[str, Path]:
    """The held-out set, the model, and the points of skin, target, CPU and GPU: in the folder of a quarn run, or in one
    that a demo has for each of its rows."""
    run = folder if meshes else folder / "data" / f"{row['mode']}_{row['kind']}"
    mesh = meshes[number] if meshes else "l_handMeshNode"
    data = run / "data" / mesh
    return {"set": data / "heldOut", "model": run / "models" / f"{mesh}.nwrp",
            **{what: data / f"heldOut_{what}.npy" for what in ("skin", "target", "cpu", "gpu")}}


compared = 0
for number, row in enumerate(report["rows"]):
    name, place = f"{row['mode']}_{row['kind']}", files_of(number, row)
    mm = 1000 * json.loads((place["set"] / "dataset.json").read_text())["metersPerUnit"]
    deltas = np.load(place["set"] / "deltas.npy").astype(float)
    target, on_cpu = np.load(place["target"]).astype(float), np.load(place["cpu"]).astype(float)
    moved = {"skin": np.load(place["skin"]) - target, "base": deltas, "network": on_cpu - target}
    if row["kind"] == "principal":
        file = json.loads((place["model"] / "principal_shapes.json").read_text())
        shapes = np.array(file["principalShapes"]).T
        rows = deltas.reshape(len(deltas), -1).T
        moved["basis"] = (rows - shapes @ np.linalg.lstsq(shapes, rows, rcond=None)[0]).T.reshape(deltas.shape)
    for stage, vectors in moved.items():
        errors = np.sqrt(np.sum(np.square(vectors), axis=2)) * mm
        for figure, value in (("mean", np.mean(errors)), ("p99", np.quantile(errors, 0.99)),
                              ("p9999", np.quantile(errors, 0.9999)), ("max", np.max(errors))):
            compared += 1
            if not abs(row[stage][f"{figure}_mm"] - value) <= 1e-6:
                sys.exit(f"{name}: {stage} {figure}: the report says {row[stage][f'{figure}_mm']}, the files {value}")
    apart = np.sqrt(np.sum(np.square((np.load(place["gpu"]) - on_cpu) * mm), axis=2)).max()
    if not abs(row["gpu"]["difference"]["max_mm"] - apart) <= 1e-6 or not apart < 1e-2:
        sys.exit(f"{name}: the report says {row['gpu']['difference']['max_mm']} mm from CPU to GPU, the files {apart}")
    if row["gpu"]["device"] and not row["gpu"]["deformations"] > 2.5 * len(deltas):
        sys.exit(f"{name}: the GPU deformed {row['gpu']['deformations']} times only")
    if row["kind"] == "direct" and row["basis"] is not None:
        sys.exit(f"{name}: a direct model has no basis, and the report has its error")
print(f"{compared} figures agree")
