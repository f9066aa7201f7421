# SPDX-License-Identifier: Apache-2.0
"""What a model says of itself: the ranges of its controls, its errors on rows that were held out, what error to expect
far from the poses that it was trained on, and of which mesh and data it is (decision 0193)."""

import io
import json
import os
from pathlib import Path
from typing import Any, Callable, Optional

import numpy as np
import xxhash

from .dataset import Dataset
from .errors import TrainerError
from .files import write_bytes
from .guard import units_of
from .measure import Measured
from .split import Split

POSES_NAME = "trained_poses.npy"
MOST_POSES = 1000
MOST_BYTES = 64 << 20  # of the file, which the C++ side reads
MOST_BINS, ROWS_OF_A_BIN = 10, 10
FEWEST_ROWS = 2 * ROWS_OF_A_BIN  # that a curve of expected errors is made of

STAGES = {"network": "network", "skin": "skin", "zeroDeltas": "base", "basis": "basis"}  # here: in the errors
FIGURES = ("mean", "p99", "p9999", "max")
WAYS = {"random": "drawn at random from all rows", "blocks": "blocks of consecutive frames",
        "random and blocks": "drawn at random, and of a motion blocks of consecutive frames",
        "none": "none was held out"}
PARTS = {"test": "they chose nothing", "validation": "they chose the epoch", "train": "they were trained on"}


def write(folder: Path, dataset: Dataset, split: Split, errors: Measured,
          measure: Callable[[np.ndarray], Measured]) -> dict[str, Any]:
    """Writes the file of trained poses into the model's folder. Returns the certificate.

    errors   over the rows that the split says are measured
    measure  gives the errors over other rows, ascending
    """
    trained = dataset.controls[split.train]
    units = units_of(trained.min(axis=0), trained.max(axis=0))
    poses = trained[representatives(trained / units, largest_count(dataset.control_count))]
    digits = write_poses(folder / POSES_NAME, poses)
    held = split.measured()[0] != "train"
    return {
        "trainingFrames": len(split.train),
        "controls": {"minima": numbers(trained.min(axis=0)), "maxima": numbers(trained.max(axis=0))},
        "errors": rows_of(dataset, f"{WAYS[split.how]}; {PARTS[split.measured()[0]]}", errors, measure),
        "expectedError": expected_error(distances(dataset.controls[errors.rows], poses, units),
                                        errors.by_frame[:, 0]) if held else None,
        "trainedPoses": {"count": len(poses), "xxh3_128": digits},
        "mesh": dataset.description.get("meshSum"),
        "dataSet": f"sha256:{dataset.digest}",
    }


def numbers(values: np.ndarray) -> list[float]:
    """That give the same float32 back, also where a reader errs in a double's last places."""
    return [float(f"{value:.9g}") for value in values.tolist()]


def write_poses(path: Path, poses: np.ndarray) -> str:
    """The sum of the file, by which the certificate names it."""
    content = io.BytesIO()
    np.save(content, np.ascontiguousarray(poses, "<f4"))
    write_bytes(path, content.getvalue())
    return xxhash.xxh3_128_hexdigest(content.getvalue())


# --- errors ---

def rows_of(dataset: Dataset, heldout: str, errors: Measured,
            measure: Callable[[np.ndarray], Measured]) -> list[dict[str, Any]]:
    """One row for each kind of frames that was measured: motions are harder than poses that are drawn."""
    drawn = dataset.drawn[errors.rows]
    if not drawn.any() or drawn.all():
        return [row_of("drawn" if drawn.any() else "motion", heldout, errors)]
    return [row_of(kind, heldout, measure(errors.rows[chosen]))
            for kind, chosen in (("drawn", drawn), ("motion", ~drawn))]


def row_of(kind: str, heldout: str, measured: Measured) -> dict[str, Any]:
    def figures(stage: Optional[dict[str, Any]]) -> Optional[dict[str, float]]:
        return {name: stage[name]["mm"] for name in FIGURES} if stage else None

    return {"frames": len(measured.rows), "poses": kind, "heldOut": heldout,
            "mm": {name: figures(measured.errors[stage]) for name, stage in STAGES.items()}}


def add_errors(folder: Path, dataset: Dataset, errors: Measured, measure: Callable[[np.ndarray], Measured]) -> None:
    """Into the certificate of a published model: its errors on all rows of another data set. Those that it has of the
    same one are replaced."""
    path, source = folder / "metadata.json", f"sha256:{dataset.digest}"
    metadata = json.loads(path.read_bytes())
    found = metadata.get("certificate") if isinstance(metadata, dict) else None
    if not isinstance(found, dict) or not isinstance(found.get("errors"), list):
        raise TrainerError(f"{folder} has no certificate that errors could be added to: train it again")
    if found.get("dataSet") == source:
        raise TrainerError(f"{folder} was trained on {dataset.folder}: its errors there promise nothing")
    rows = rows_of(dataset, f"all of the data set {dataset.folder.resolve().name}", errors, measure)
    found["errors"] = [row for row in found["errors"] if not isinstance(row, dict) or row.get("dataSet") != source]
    found["errors"] += [{**row, "dataSet": source} for row in rows]
    part = path.with_name("metadata.json.part")
    write_bytes(part, (json.dumps(metadata, indent=1, allow_nan=False) + "\n").encode())
    os.replace(part, path)


# --- how far from what is known ---

def largest_count(controls: int) -> int:
    return int(min(MOST_POSES, max(1, (MOST_BYTES - 4096) // (4 * controls))))


def representatives(scaled: np.ndarray, most: int) -> np.ndarray:
    """Rows of `scaled` [n, C], ascending, from which none of the others is far: the one that is nearest to the mean,
    and then, again and again, the one that is furthest from all that were chosen (T. F. Gonzalez, "Clustering to
    minimize the maximum intercluster distance", Theoretical Computer Science 38, 1985). The largest distance is at most
    twice the least that so many rows could have."""
    chosen = [int(np.argmin(squares(scaled, scaled.mean(axis=0))))]
    nearest = squares(scaled, scaled[chosen[0]])
    while len(chosen) < most and nearest.max() > 0:
        chosen.append(int(np.argmax(nearest)))
        np.minimum(nearest, squares(scaled, scaled[chosen[-1]]), out=nearest)
    return np.sort(chosen)


def squares(rows: np.ndarray, point: np.ndarray) -> np.ndarray:
    """Mean square of the differences, [n]."""
    return np.mean(np.square(rows - point), axis=1)


def distances(controls: np.ndarray, poses: np.ndarray, units: np.ndarray) -> np.ndarray:
    """Of each row of controls from the nearest pose, as TrainedPoses::distance() of the C++ side: float64 [n]."""
    scaled = poses / units
    return np.sqrt([squares(scaled, row).min() for row in controls / units])


def expected_error(distance: np.ndarray, error: np.ndarray) -> Optional[dict[str, list[float]]]:
    """The curve from distances to errors, which never falls: means of rows of about the same distance, those that are
    in the wrong order pooled (R. E. Barlow et al., "Statistical Inference under Order Restrictions", 1972, section
    1.2). It ends at the largest distance. None for too few rows."""
    if len(distance) < FEWEST_ROWS:
        return None
    order = np.argsort(distance, kind="stable")
    bins = np.array_split(order, min(MOST_BINS, len(order) // ROWS_OF_A_BIN))
    pools: list[tuple[float, float, int]] = []  # sums of distances and errors, and the number of rows
    for rows in bins:
        pool = (float(distance[rows].sum()), float(error[rows].sum()), len(rows))
        while pools and pools[-1][1] * pool[2] >= pool[1] * pools[-1][2]:
            last = pools.pop()
            pool = (last[0] + pool[0], last[1] + pool[1], last[2] + pool[2])
        pools.append(pool)
    knots = [(far / count, wrong / count) for far, wrong, count in pools]
    if distance.max() > knots[-1][0]:
        knots.append((float(distance.max()), knots[-1][1]))
    return {"distances": [knot[0] for knot in knots], "millimetres": [knot[1] for knot in knots]}
