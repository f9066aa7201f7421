# SPDX-License-Identifier: Apache-2.0
"""Rows of a report: for each model the distances that are left on frames that it was not trained on, in mm and in parts
of the character, and how long a frame takes. From the files that `quarn run`, or a script like it, has made."""

import json
from dataclasses import dataclass, replace
from pathlib import Path
from typing import Any, Optional

import numpy as np

from .errors import TrainerError
from .measure import FIGURES, PERCENTILES

Json = dict[str, Any]

FORMAT, VERSION = "neuralWarp report rows", 1
RATIOS = ("mean", "p9999", "max")
AGREEMENT = 1e-6  # mm: what the player and this module, which see the same files, may differ by


@dataclass(frozen=True)
class Played:
    """What `quarn play` has answered with --json, and the points that it has written: [frames, vertices, 3]."""

    answer: Path
    points: Path


@dataclass(frozen=True)
class Row:
    """The files of one model. `skin` and `target` are the points of the held-out frames, in the scene's order."""

    mesh: str       # empty where there is one alone
    set: Path       # folder: the data set that it was trained on
    held_out: Path  # folder: that of the held-out frames
    training: Path  # folder: the trainer's report
    evaluate: Path  # what `trainer evaluate --json` has answered
    skin: Path
    target: Path
    cpu: Played
    gpu: Optional[Played]


@dataclass(frozen=True)
class Report:
    """What a report is about."""

    title: str
    is_motion: bool  # of the held-out frames: they follow each other
    first_frame: int
    rows: list[Row]
    pictures: list[tuple[Path, str]]  # with their captions
    preview: list[Path]               # frames of a moving picture


def read_json(path: Path) -> Any:
    try:
        return json.loads(path.read_bytes())
    except ValueError as error:
        raise TrainerError(f"{path} is not JSON: {error}") from error


def read_report(path: Path) -> Report:
    """The file that `trainer report` is given. Paths in it count from its folder."""
    data, place = read_json(path), path.parent
    try:
        if (data["format"], data["version"]) != (FORMAT, VERSION):
            raise TrainerError(f"{path} is {data['format']!r}, version {data['version']!r}, not {FORMAT!r}, {VERSION}")
        rows = [read_row(row, place) for row in data["rows"]]
        if not rows:
            raise TrainerError(f"{path} has no rows")
        alone = len(rows) == 1
        return Report(str(data["title"]), bool(data["isMotion"]), int(data["firstFrame"]),
                      [replace(row, mesh="") if alone else row for row in rows],
                      [(place / picture["file"], str(picture["caption"])) for picture in data["pictures"]],
                      [place / name for name in data["preview"]])
    except (KeyError, TypeError, ValueError, AttributeError) as error:
        raise TrainerError(f"{path} does not say what a report is about ({type(error).__name__}: {error})") from error


def read_row(row: Json, place: Path) -> Row:
    played = {key: Played(place / row[key]["answer"], place / row[key]["points"]) if row.get(key) else None
              for key in ("cpu", "gpu")}
    if played["cpu"] is None:
        raise KeyError("cpu")
    return Row(row["mesh"], place / row["set"], place / row["heldOut"], place / row["training"],
               place / row["evaluate"], place / row["skin"], place / row["target"], played["cpu"], played["gpu"])


# --- the figures ---

def distances(points: np.ndarray, target: np.ndarray, scale: float) -> np.ndarray:
    """Of each vertex in each frame from the target, in mm: [frames, vertices]."""
    return np.linalg.norm(points.astype(np.float64) - target.astype(np.float64), axis=2) * scale


def statistics(errors: np.ndarray, diagonal_mm: float, first_frame: int) -> Json:
    """Mean, percentiles and largest of distances in mm, the same in % of the diagonal, and where the largest is."""
    values = {"mean": float(errors.mean()), "max": float(errors.max())}
    values.update({name: float(np.quantile(errors, part)) for name, part in PERCENTILES.items()})
    frame, vertex = np.unravel_index(np.argmax(errors), errors.shape)
    return {
        **{f"{name}_mm": value for name, value in values.items()},
        **{f"{name}_percent": percent(value, diagonal_mm) for name, value in values.items()},
        "worst": {"frame": int(frame) + first_frame, "vertex": int(vertex)},
    }


def percent(millimetres: float, diagonal_mm: float) -> Optional[float]:
    return 100 * millimetres / diagonal_mm if diagonal_mm > 0 else None


def second_differences(points: np.ndarray, scale: float) -> np.ndarray:
    """Lengths over the motion, in mm, of each vertex in each frame but the first and last: what shows as popping."""
    exact = points.astype(np.float64)
    return np.linalg.norm(exact[2:] - 2 * exact[1:-1] + exact[:-2], axis=2) * scale


def jitter(points: np.ndarray, scale: float) -> float:
    """The largest of them; 0 of a motion too short for any."""
    return float(second_differences(points, scale).max()) if len(points) > 2 else 0.0


def jitter_of_error(points: np.ndarray, target: np.ndarray, scale: float) -> Json:
    """Mean and largest second difference of what is left, in mm: how much a mesh trembles where the target does not."""
    if len(points) < 3:
        return {"mean": 0.0, "max": 0.0}
    second = second_differences(points.astype(np.float64) - target, scale)
    return {"mean": float(second.mean()), "max": float(second.max())}


def judged(stage: Optional[Json], path: Path) -> Optional[Json]:
    """The trainer's figures of one stage, with the names of the report; none where the stage does not exist."""
    if stage is None:
        return None
    missing = [name for name in FIGURES if name not in stage]
    if missing:
        raise TrainerError(f"{path} has no {missing[0]}: another version of the trainer wrote it, and it has to be "
                           "made again")
    numbers = {name: stage[name] for name in FIGURES}
    return {
        **{f"{name}_mm": value["mm"] for name, value in numbers.items()},
        **{f"{name}_percent": value["percentOfDiagonal"] for name, value in numbers.items()},
        "worst": {"frame": stage["worstFrame"], "vertex": stage["worstVertex"]},
    }


def require_agreement(name: str, measured: Json, by_quarn: Json) -> None:
    for figure in ("mean", "max"):
        difference = abs(measured[f"{figure}_mm"] - by_quarn["mm"][figure])
        if difference > AGREEMENT:
            raise TrainerError(f"{name}: {figure} differs by {difference:g} mm from what quarn play measured")


def times(played: Json) -> Json:
    return {"median_ms": played["medianMs"], "p99_ms": played["p99Ms"]}


def load(path: Path, like: Optional[np.ndarray] = None) -> np.ndarray:
    try:
        points = np.load(path, allow_pickle=False)
    except (ValueError, EOFError) as error:
        raise TrainerError(f"{path}: not a NumPy array file, or cut short ({error})") from error
    is_points = points.ndim == 3 and points.shape[2] == 3 and points.size > 0
    if not is_points or (like is not None and points.shape != like.shape):
        raise TrainerError(f"{path} has the shape {list(points.shape)}, not "
                           + ("[frames, vertices, 3]" if like is None else f"{list(like.shape)}"))
    return points


def figures_of_gpu(gpu: Played, on_cpu: np.ndarray, scale: float, diagonal_mm: float, first_frame: int) -> Json:
    """Where and how fast the OpenCL device played the frames, and how far it came out from the CPU."""
    played = read_json(gpu.answer)
    use = played["gpu"]
    return {
        "device": use["device"],
        "deformations": use["onGpu"],
        "fallbacks": use["fallbacks"],
        **times(played),
        "difference": statistics(distances(load(gpu.points, on_cpu), on_cpu, scale), diagonal_mm, first_frame),
    }


def figures(row: Row, is_motion: bool, first_frame: int) -> Json:
    """All that a report says of a model. What it is called comes from what it was trained on, and how."""
    played, evaluated = read_json(row.cpu.answer), read_json(row.evaluate)
    trained, learned = read_json(row.set / "dataset.json"), read_json(row.training / "report.json")
    scale = 1000 * read_json(row.held_out / "dataset.json")["metersPerUnit"]
    target = load(row.target)
    skin, network = load(row.skin, target), load(row.cpu.points, target)
    diagonal = played["boxDiagonalMm"]
    mode = "surface" if trained["deltaMode"] else "offset"
    kind = "principal" if learned["settings"]["principalShapesEnabled"] else "direct"
    errors: Json = {
        "skin": statistics(distances(skin, target, scale), diagonal, first_frame),
        "base": judged(evaluated["base"], row.evaluate),
        "basis": judged(evaluated.get("basis"), row.evaluate),
        "network": statistics(distances(network, target, scale), diagonal, first_frame),
    }
    name = " ".join(part for part in (row.mesh, mode, kind) if part)
    require_agreement(f"{name}, skin", errors["skin"], played["before"])
    require_agreement(f"{name}, network", errors["network"], played["distance"])
    best = {figure: min(errors[stage][f"{figure}_mm"] for stage in ("skin", "base")) for figure in RATIOS}
    return {
        "mesh": row.mesh,
        "mode": mode,
        "kind": kind,
        "vertices": trained["affectCount"],
        "controls": trained["controlCount"],
        "poses": trained["frameCount"],
        "epochs": learned["epochs"],
        "smoothingIterations": trained["smoothingIterations"],
        **errors,
        "ratio": {figure: ratio(errors["network"][f"{figure}_mm"], best[figure]) for figure in RATIOS},
        "jitter_mm": {what: jitter(points, scale) for what, points in
                      (("skin", skin), ("target", target), ("network", network))} if is_motion else None,
        "errorJitter_mm": {what: jitter_of_error(points, target, scale) for what, points in
                           (("skin", skin), ("network", network))} if is_motion else None,
        "cpu": times(played),
        "gpu": figures_of_gpu(row.gpu, network, scale, diagonal, first_frame) if row.gpu else None,
    }


def ratio(after: float, before: float) -> Optional[float]:
    """None where there was nothing to be corrected."""
    return after / before if before > 0 else None
