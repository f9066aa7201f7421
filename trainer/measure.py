# SPDX-License-Identifier: Apache-2.0
"""How far vertices end from where they should: mean, 99th percentile, largest, in mm and in parts of the character."""

from typing import Any, Callable, Optional

import numpy as np

from .dataset import Dataset
from .settings import Settings

# So many distances are kept, and their percentile is exact. More are counted in bins of equal bits: a float32's
# exponent and the first 11 bits of its fraction. Memory is bounded for any number of frames, and the percentile then
# within 2^-11 (0.05 %) of the exact one.
KEPT = 1 << 24
DROPPED_BITS = 12
ENOUGH_EXPLAINED = 0.99  # part of the deltas' sum of squares: what shapes that hold it leave is hardly seen
BINS = 1 << (31 - DROPPED_BITS)


class Distances:
    """Statistics over frames and vertices of the length of a difference of deltas."""

    def __init__(self) -> None:
        self.counts = np.zeros(BINS, np.int64)
        self.total, self.largest, self.where = 0.0, -1.0, (0, 0)
        self.kept: list[np.ndarray] = []
        self.kept_count = 0

    def add(self, rows: np.ndarray, differences: np.ndarray) -> None:
        """rows [n]: of the data set; differences [n, 3 * D], scene units."""
        lengths = np.linalg.norm(differences.reshape(len(rows), -1, 3).astype(np.float64), axis=2)
        self.counts += np.bincount(lengths.astype(np.float32).view(np.uint32).ravel() >> DROPPED_BITS, minlength=BINS)
        self.keep(lengths)
        self.total += float(lengths.sum())
        worst = int(np.argmax(lengths))
        if lengths.flat[worst] > self.largest:
            row, slot = divmod(worst, lengths.shape[1])
            self.largest, self.where = float(lengths.flat[worst]), (int(rows[row]), slot)

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

    def summary(self, dataset: Dataset) -> dict[str, Any]:
        def both(length: float) -> dict[str, Optional[float]]:
            size = dataset.description["boundingBoxDiagonal"]
            return {"mm": length * dataset.description["metersPerUnit"] * 1000,
                    "percentOfDiagonal": length / size * 100 if size > 0 else None}

        row, slot = self.where
        return {"mean": both(self.total / self.counts.sum()), "p99": both(self.percentile(0.99)),
                "max": both(self.largest), "worstFrame": int(dataset.frames[row]),
                "worstVertex": dataset.vertex(slot)}


def measure(dataset: Dataset, rows: np.ndarray, deltas_of: Callable[[np.ndarray], np.ndarray],
            shapes: Optional[np.ndarray] = None) -> dict[str, Any]:
    """The three errors over `rows`: without a correction, the best that the principal shapes could do, and the model's.

    deltas_of  gives predicted deltas [n, 3 * D] for controls [n, C]
    shapes     float32 [S, 3 * D], any basis, or none
    """
    base, basis, network = Distances(), Distances(), Distances()
    if shapes is not None:
        shapes = np.linalg.qr(shapes.T.astype(np.float64))[0].T.astype(np.float32)  # orthonormal rows
    for part, deltas in dataset.blocks(rows):
        base.add(part, deltas)
        network.add(part, deltas_of(dataset.controls[part]) - deltas)
        if shapes is not None:
            basis.add(part, deltas @ shapes.T @ shapes - deltas)  # nearest that the shapes can make
    return {"frames": len(rows), "base": base.summary(dataset),
            "basis": None if shapes is None else basis.summary(dataset), "network": network.summary(dataset)}


def is_at_floor(errors: dict[str, Any], explained: float) -> bool:
    """Whether most of what is left is what the shapes cannot show, and more of them could be had.

    What the shapes cannot show and what the network does wrong in their span are at right angles: at 1.4 times the
    basis's error the two are alike."""
    return (errors["basis"] is not None and explained < ENOUGH_EXPLAINED
            and errors["network"]["mean"]["mm"] <= 2**0.5 * errors["basis"]["mean"]["mm"])


def advice(errors: dict[str, Any], explained: Optional[float], settings: Settings) -> list[str]:
    """What the errors say about the settings: sentences, none where there is nothing to be done."""
    sentences = []
    if explained is not None and is_at_floor(errors, explained):
        sentences.append(
            f"the shapes limit this model: with an accuracy of {settings.principalShapesAccuracy:g} and at most "
            f"{settings.principalShapesLimit} of them they hold {100 * explained:.1f} % of the deltas, and the network "
            "leaves little more than the best that they could do; --principal-accuracy 0.99 --principal-limit 200 "
            "would leave less")
    worse = [name for name in ("mean", "p99") if errors["network"][name]["mm"] > errors["base"][name]["mm"]]
    if worse:
        sentences.append(f"the network leaves more than no correction does ({' and '.join(worse)}): it needs more "
                         "frames, or more epochs")
    return sentences


def as_lines(errors: dict[str, Any]) -> list[str]:
    lines = [f"{'':8} {'mean':>10} {'p99':>10} {'max':>10}   (mm, over {errors['frames']} frames)"]
    for name in ("base", "basis", "network"):
        if errors[name]:
            values = [errors[name][key]["mm"] for key in ("mean", "p99", "max")]
            lines.append(f"{name:8} " + " ".join(f"{value:10.4g}" for value in values)
                         + f"   worst: frame {errors[name]['worstFrame']}, vertex {errors[name]['worstVertex']}")
    return lines
