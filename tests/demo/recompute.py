# SPDX-License-Identifier: Apache-2.0
"""recompute.py FOLDER: the table of a demo's report once more, from the files it is about; differences end it."""

import json
import sys
from pathlib import Path

import numpy as np

folder = Path(sys.argv[1])
report = json.loads((folder / "report.json").read_text())
compared = 0
for row in report["rows"]:
    name, mode = f"{row['mode']}_{row['kind']}", row["mode"]
    data, sets = folder / "data", folder / "data" / "sets" / f"motion_{mode}"
    mm = 1000 * json.loads((sets / "dataset.json").read_text())["metersPerUnit"]
    deltas = np.load(sets / "deltas.npy").astype(float)
    target = np.load(data / "motion_target.npy").astype(float)
    moved = {"skin": np.load(data / "motion_skin.npy") - target, "base": deltas,
             "network": np.load(data / f"motion_{name}_cpu.npy") - target}
    if row["kind"] == "principal":
        file = json.loads((data / "models" / f"{name}.nwrp" / "principal_shapes.json").read_text())
        shapes = np.array(file["principalShapes"]).T
        rows = deltas.reshape(len(deltas), -1).T
        moved["basis"] = (rows - shapes @ np.linalg.lstsq(shapes, rows, rcond=None)[0]).T.reshape(deltas.shape)
    for stage, vectors in moved.items():
        errors = np.sqrt(np.sum(np.square(vectors), axis=2)) * mm
        for figure, value in (("mean", np.mean(errors)), ("p99", np.quantile(errors, 0.99)), ("max", np.max(errors))):
            compared += 1
            if not abs(row[stage][f"{figure}_mm"] - value) <= 1e-6:
                sys.exit(f"{name}: {stage} {figure}: the report says {row[stage][f'{figure}_mm']}, the files {value}")
    apart = (np.load(data / f"motion_{name}_gpu.npy") - np.load(data / f"motion_{name}_cpu.npy").astype(float)) * mm
    apart = np.sqrt(np.sum(np.square(apart), axis=2)).max()
    if not abs(row["gpu"]["difference"]["max_mm"] - apart) <= 1e-6 or not apart < 1e-2:
        sys.exit(f"{name}: the report says {row['gpu']['difference']['max_mm']} mm from CPU to GPU, the files {apart}")
    if row["gpu"]["device"] and not row["gpu"]["deformations"] > 300:
        sys.exit(f"{name}: the GPU deformed {row['gpu']['deformations']} times only")
    if row["kind"] == "direct" and row["basis"] is not None:
        sys.exit(f"{name}: a direct model has no basis, and the report has its error")
print(f"{compared} figures agree")
