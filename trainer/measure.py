# SPDX-License-Identifier: Apache-2.0
"""How far vertices end from where they should: mean, percentiles, largest, and how much that trembles in a motion; in
mm and in parts of the character, over all frames and vertices, per frame and per vertex."""

from dataclasses import dataclass
from typing import Any, Callable, Optional

import numpy as np

from .dataset import Dataset

# So many distances are kept, and their percentiles are exact. More are counted in bins of equal bits: a float32's
# exponent and the first 11 bits of its fraction. Memory is bounded for any number of frames, and the percentiles then
# within 2^-11 (0.05 %) of the exact ones.
KEPT = 1 << 24
DROPPED_BITS = 12
BINS = 1 << (31 - DROPPED_BITS)

STAGES = {"skin": "skin", "base": "zero deltas", "basis": "basis", "network": "network"}  # what readers see of each
PERCENTILES = {"p99": 0.99, "p9999": 0.9999}
FIGURES = ("mean", *PERCENTILES, "max")
FIGURE_NAMES = {"p9999": "p99.99"}
WORST = 5  # frames and vertices that are named


class Distances:
    """Statistics over frames and vertices of the length of a difference of deltas."""

    def __init__(self, vertices: int) -> None:
        self.counts = np.zeros(BINS, np.int64)
        self.total, self.largest, self.where = 0.0, -1.0, (0, 0)
        self.kept: list[np.ndarray] = []
        self.kept_count = 0
        self.of_frames: list[np.ndarray] = []  # [n, 2] mean and largest
        self.sums, self.most = np.zeros(vertices), np.zeros(vertices)

    def add(self, rows: np.ndarray, lengths: np.ndarray) -> None:
        """rows [n]: of the data set; lengths [n, D] float64, scene units."""
        self.counts += np.bincount(lengths.astype(np.float32).view(np.uint32).ravel() >> DROPPED_BITS, minlength=BINS)
        self.keep(lengths)
        self.total += float(lengths.sum())
        worst = int(np.argmax(lengths))
        if lengths.flat[worst] > self.largest:
            row, slot = divmod(worst, lengths.shape[1])
            self.largest, self.where = float(lengths.flat[worst]), (int(rows[row]), slot)
        self.of_frames.append(np.stack([lengths.mean(axis=1), lengths.max(axis=1)], axis=1))
        self.sums += lengths.sum(axis=0)
        self.most = np.maximum(self.most, lengths.max(axis=0))

    def keep(self, lengths: np.ndarray) -> None:
        self.kept_count += lengths.size
        self.kept = self.kept + [lengths.ravel()] if self.kept_count <= KEPT else []

    def percentile(self, part: float) -> float:
        if self.kept:
            return float(np.quantile(np.concatenate(self.kept), part))
        ranks = np.cumsum(self.counts)
        index = np.searchsorted(ranks, part * ranks[-1])
        upper = np.array([(index + 1) << DROPPED_BITS], np.uint32).view(np.float32)[0]
        return float(min(upper, self.largest))

    def figures(self) -> dict[str, float]:
        """In scene units, by the names of FIGURES."""
        return {"mean": self.total / int(self.counts.sum()), "max": self.largest,
                **{name: self.percentile(part) for name, part in PERCENTILES.items()}}

    def by_frame(self) -> np.ndarray:
        """[n, 2] mean and largest of each frame, in the order of adding; scene units."""
        return np.concatenate(self.of_frames)

    def by_vertex(self) -> np.ndarray:
        """[D, 2] the same of each vertex."""
        return np.stack([self.sums / len(self.by_frame()), self.most], axis=1)


class Jitter:
    """Second differences over three frames that follow each other, of what is left of each delta: what shows as
    popping. In the space of the deltas, which for Surface deltas turns with the surface."""

    def __init__(self, dataset: Dataset) -> None:
        self.dataset = dataset
        self.last = np.zeros((0, 3 * dataset.delta_count))
        self.rows = np.zeros(0, np.int64)
        self.total, self.count, self.largest = 0.0, 0, 0.0

    def add(self, rows: np.ndarray, differences: np.ndarray) -> None:
        """rows [n], ascending over all calls; differences [n, 3 * D], scene units."""
        if self.dataset.drawn[rows].all():
            return
        self.rows = np.concatenate([self.rows, rows])
        self.last = np.concatenate([self.last, differences])
        middle = self.middles()
        if len(middle):
            second = self.last[middle - 1] - 2 * self.last[middle] + self.last[middle + 1]
            lengths = lengths_of(second)
            self.total, self.count = self.total + float(lengths.sum()), self.count + lengths.size
            self.largest = max(self.largest, float(lengths.max()))
        self.rows, self.last = self.rows[-2:], self.last[-2:]

    def middles(self) -> np.ndarray:
        """Which of the rows at hand stand between two neighbours of a motion."""
        rows, frames = self.rows, self.dataset.frames[self.rows].astype(np.int64)
        index = np.arange(1, len(rows) - 1)
        steps = frames[index] - frames[index - 1]
        follows = (rows[index + 1] - rows[index - 1] == 2) & (steps > 0) & (frames[index + 1] - frames[index] == steps)
        return index[follows & ~self.dataset.drawn[rows[index]]]

    def figures(self) -> Optional[dict[str, float]]:
        """In scene units; none where no three frames follow each other."""
        return {"mean": self.total / self.count, "max": self.largest} if self.count else None


class Stage:
    """What is measured of one stage."""

    def __init__(self, dataset: Dataset) -> None:
        self.dataset = dataset
        self.distances, self.jitter = Distances(dataset.delta_count), Jitter(dataset)

    def add(self, rows: np.ndarray, differences: np.ndarray) -> None:
        """differences [n, 3 * D] from the deltas that are right, scene units."""
        self.distances.add(rows, lengths_of(differences))
        self.jitter.add(rows, differences)

    def summary(self) -> dict[str, Any]:
        def both(figures: dict[str, float]) -> dict[str, Any]:
            return {name: in_units(self.dataset, length) for name, length in figures.items()}

        row, slot = self.distances.where
        moves = self.jitter.figures()
        return {**both(self.distances.figures()), "worstFrame": int(self.dataset.frames[row]),
                "worstVertex": self.dataset.vertex(slot), "jitter": None if moves is None else both(moves)}


@dataclass(frozen=True)
class Measured:
    """Errors over some rows."""

    errors: dict[str, Any]  # what report.json has
    rows: np.ndarray
    by_frame: np.ndarray    # [n, 2] mean and largest of what the network leaves in each frame, mm
    by_vertex: np.ndarray   # [D, 2] the same of each vertex, mm


def lengths_of(differences: np.ndarray) -> np.ndarray:
    """[n, D] of differences [n, 3 * D]."""
    return np.linalg.norm(differences.reshape(len(differences), -1, 3).astype(np.float64), axis=2)


def in_units(dataset: Dataset, length: float) -> dict[str, Optional[float]]:
    size = dataset.description["boundingBoxDiagonal"]
    return {"mm": length * millimetres(dataset), "percentOfDiagonal": length / size * 100 if size > 0 else None}


def millimetres(dataset: Dataset) -> float:
    """A unit of the scene."""
    return 1000 * float(dataset.description["metersPerUnit"])


def measure(dataset: Dataset, rows: np.ndarray, deltas_of: Callable[[np.ndarray], np.ndarray],
            shapes: Optional[np.ndarray] = None) -> dict[str, Any]:
    """Only the errors of measured()."""
    return measured(dataset, rows, deltas_of, shapes).errors


def measured(dataset: Dataset, rows: np.ndarray, deltas_of: Callable[[np.ndarray], np.ndarray],
             shapes: Optional[np.ndarray] = None) -> Measured:
    """The four errors over `rows`: of the skin, with deltas of zero, the best that the principal shapes could do, and
    the model's.

    rows       ascending
    deltas_of  gives predicted deltas [n, 3 * D] for controls [n, C]
    shapes     float32 [S, 3 * D], any basis, or none
    """
    skin, base, basis, network = (Stage(dataset) for _ in range(4))
    if shapes is not None:
        shapes = np.linalg.qr(shapes.T.astype(np.float64))[0].T  # orthonormal rows
    for part, deltas in dataset.blocks(rows):
        base.add(part, deltas)
        network.add(part, deltas_of(dataset.controls[part]) - deltas)
        if dataset.skin is not None:
            skin.distances.add(part, dataset.skin[part].astype(np.float64))
        if shapes is not None:
            exact = deltas.astype(np.float64)
            basis.add(part, exact @ shapes.T @ shapes - exact)  # nearest that the shapes can make
    if dataset.skin is None and dataset.description["deltaMode"] == 0:
        skin = base  # offsets of zero are the skin
    errors: dict[str, Any] = {
        "frames": len(rows), "skin": skin.summary() if skin.distances.of_frames else None, "base": base.summary(),
        "basis": None if shapes is None else basis.summary(), "network": network.summary()}
    mm = millimetres(dataset)
    by_frame, by_vertex = mm * network.distances.by_frame(), mm * network.distances.by_vertex()
    errors["worstFrames"] = named(by_frame, "frame", lambda index: int(dataset.frames[rows[index]]))
    errors["worstVertices"] = named(by_vertex, "vertex", dataset.vertex)
    return Measured(errors, rows, by_frame, by_vertex)


def named(errors: np.ndarray, what: str, name_of: Callable[[int], int]) -> list[dict[str, Any]]:
    """The worst by their means: [{what: its number, "meanMm", "maxMm"}]."""
    return [{what: name_of(int(index)), "meanMm": float(errors[index, 0]), "maxMm": float(errors[index, 1])}
            for index in np.argsort(-errors[:, 0], kind="stable")[:WORST]]


def before(errors: dict[str, Any]) -> tuple[str, dict[str, Any]]:
    """What there is without the model, and how it is called: the skin where it is known, or else deltas of zero."""
    return ("the skin", errors["skin"]) if errors["skin"] else ("zero deltas", errors["base"])


def advice(errors: dict[str, Any]) -> list[str]:
    """A sentence where the model makes things worse."""
    called, stage = before(errors)
    worse = [FIGURE_NAMES.get(name, name) for name in FIGURES[:-1]
             if errors["network"][name]["mm"] > stage[name]["mm"]]
    return [f"the network leaves more than {called} would ({' and '.join(worse)}): it needs more frames, or more epochs"
            ] if worse else []


def as_lines(errors: dict[str, Any]) -> list[str]:
    head = " ".join(f"{FIGURE_NAMES.get(name, name):>10}" for name in FIGURES)
    lines = [f"{'':11} {head}   (mm, over {errors['frames']} frames)"]
    for name, called in STAGES.items():
        stage = errors[name]
        if stage:
            values = " ".join(f"{stage[figure]['mm']:10.4g}" for figure in FIGURES)
            lines.append(f"{called:11} {values}   worst: frame {stage['worstFrame']}, vertex {stage['worstVertex']}")
    moves = errors["network"]["jitter"]
    if moves:
        lines.append(f"what the network leaves trembles by {moves['mean']['mm']:.4g} mm in the mean and "
                     f"{moves['max']['mm']:.4g} mm at most (second difference over three frames)")
    return lines
