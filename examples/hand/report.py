# SPDX-License-Identifier: Apache-2.0
"""report.py FOLDER: the report of a demo, from what its commands have written below FOLDER.

Writes report.json (the numbers), report.html (one file that shows them with the pictures, to be sent as it is) and
preview.webp (the moving picture), prints the table, and ends with status 1 when the limits are not kept.
"""

import argparse
import base64
import html
import json
import sys
from pathlib import Path

from PIL import Image

ROWS = [(mode, kind) for mode in ("surface", "offset") for kind in ("principal", "direct")]
STAGES = ("skin", "base", "basis", "network")
# what a correction has to achieve on the held-out motion, against the mesh without one
MEAN_LIMIT, MAX_LIMIT = 1 / 5, 1 / 2


def read_json(path):
    with open(path, encoding="utf-8") as file:
        return json.load(file)


def row_of_report(results, mode, kind):
    """One line of the table: the errors that `quarn play` and the trainer measured, and the time of a frame."""
    folder = results / f"{mode}_{kind}"
    played, judged = read_json(folder / "play.json"), read_json(folder / "evaluate.json")
    errors = {
        "skin": played["against"]["before"],
        "base": judged["base"],
        "basis": judged["basis"],
        "network": played["against"]["after"],
    }
    reference = {name: min(errors["skin"][name], errors["base"][name]) for name in ("mean_mm", "max_mm")}
    return {
        "mode": mode,
        "kind": kind,
        **errors,
        "ratio": {
            "mean": errors["network"]["mean_mm"] / reference["mean_mm"],
            "max": errors["network"]["max_mm"] / reference["max_mm"],
        },
        "jitter_mm": played["against"]["jitter_mm"],
        "cpu": {name: played["timing"][name] for name in ("median_us", "p99_us")},
    }


def make_report(folder):
    rows = [row_of_report(folder / "data" / "results", mode, kind) for mode, kind in ROWS]
    kept = all(row["ratio"]["mean"] <= MEAN_LIMIT and row["ratio"]["max"] <= MAX_LIMIT for row in rows)
    return {"version": 1, "rows": rows, "limits": {"mean": MEAN_LIMIT, "max": MAX_LIMIT, "kept": kept}}
