# SPDX-License-Identifier: Apache-2.0
"""Principal shapes within a budget: whole numbers, as coarse as an error in mm allows.

A shape is whole numbers times a scale of its own. Scales are one length for all shapes, divided by the root mean
square of a shape's coefficients: so each shape is off by about as much as any other when it moves as usual, which is
the best that uniform steps can do (reverse water-filling: Cover and Thomas, "Elements of Information Theory", 10.3.3).
A shape that moves less than that length becomes 0 and is left out. Numbers of most shapes fit into a byte; those of all
are small ones mostly, which an archive packs well.
"""

from dataclasses import dataclass
from pathlib import Path
from typing import Any, Callable, Optional

import numpy as np

from .dataset import Dataset
from .errors import TrainerError
from .halves import by_vertex, rounding
from .settings import Settings

OF_A_BYTE = 127
LARGEST = 32752     # the largest half that two bytes hold
SMALLEST = 2.0**-100  # of scales: then no product with a whole number is too small to be exact
CHOSEN_BY = 512     # rows by which the length is looked for; all are measured at the end
OCTAVES = 30        # lengths are tried from that of no shape down to so many halvings of it
TRIES = 16          # of which each halves what is open: the last one is within 0.05 %
ALIKE = 1e-5        # of singular values, of the largest one's part

Coefficients = Callable[[np.ndarray], np.ndarray]  # float32 [n, S] for n rows


@dataclass(frozen=True)
class WholeNumbers:
    numbers: np.ndarray  # int16 [S, 3 * D], each of them a half (IEEE 754 binary16); first those that need two bytes
    scales: np.ndarray   # float32 [S]
    compressed = True

    def decoded(self) -> np.ndarray:
        """float32 [S, 3 * D]"""
        return self.scales[:, None] * self.numbers.astype(np.float32)

    def large(self) -> int:
        """Shapes that need two bytes a number."""
        return int(np.count_nonzero(np.abs(self.numbers).max(axis=1) > OF_A_BYTE))

    def arrays(self) -> dict[str, np.ndarray]:
        count = self.large()
        return {"shapes_int16": by_vertex(self.numbers[:count], "<i2"),
                "shapes_int8": by_vertex(self.numbers[count:], "|i1"), "scales": self.scales.astype("<f4")}


@dataclass(frozen=True)
class Choice:
    packed: WholeNumbers
    added: dict[str, Any]  # how far vertices are off by it, over the rows


def rounded(shapes: np.ndarray, sizes: np.ndarray, length: float) -> WholeNumbers:
    """shapes: float32 [S, 3 * D]; sizes [S]: root mean square of their coefficients; `length` what a 1 moves a vertex
    by at that, in scene units."""
    largest = np.abs(shapes).max(axis=1)
    scales = np.maximum(np.maximum(length / sizes, largest / LARGEST), SMALLEST).astype(np.float32)
    numbers = np.rint(shapes / scales[:, None])
    numbers = np.clip(numbers, -LARGEST, LARGEST).astype(np.float16).astype(np.int16)
    ranges = np.abs(numbers).max(axis=1)
    kept = np.flatnonzero(ranges)
    order = kept[np.argsort(ranges[kept] <= OF_A_BYTE, kind="stable")]
    return WholeNumbers(numbers[order], scales[order])


def differences(shapes: np.ndarray, decoded: np.ndarray) -> np.ndarray:
    """[S, 3 * D]: what is left of each shape when decoded ones are put together as like it as they can be."""
    return shapes - nearest(decoded)(shapes) @ decoded


def nearest(shapes: np.ndarray) -> Callable[[np.ndarray], np.ndarray]:
    """Gives, for deltas [n, 3 * D], the coefficients float32 [n, S] of the sums of `shapes` [S, 3 * D] that are nearest
    (least squares)."""
    # coarse shapes can be alike
    inverse = np.linalg.pinv((shapes @ shapes.T).astype(np.float64), rcond=ALIKE, hermitian=True)
    return lambda deltas: ((deltas @ shapes.T).astype(np.float64) @ inverse).astype(np.float32)


def check_budget(settings: Settings) -> None:
    if settings.principalShapesBudget > 0 and not settings.principalShapesEnabled:
        raise TrainerError("a budget is for principal shapes, and this model has none: give --principal-shapes as "
                           "well, or leave --basis-budget away")
    if settings.principalShapesBudget > 0 and settings.principalShapesHalf:
        raise TrainerError("--basis-budget and --half-shapes are two ways to keep the same shapes: give one of them")


def budgeted(dataset: Dataset, rows: np.ndarray, shapes: np.ndarray, coefficients: Coefficients, millimetres: float,
             say: Callable[[str], None]) -> dict[str, Any]:
    """What the budget changes of the targets: shapes, and the coefficients of all rows that go best with them."""
    choice = choose(dataset, rows, shapes, coefficients, millimetres)
    if choice is None:
        say(f"a budget of {millimetres:g} mm leaves the shapes as they are: whole numbers are off by more")
        return {}
    decoded, added = choice.packed.decoded(), choice.added
    coefficients_of = nearest(decoded)
    best = np.concatenate([coefficients_of(block) for _, block in dataset.blocks(np.arange(dataset.frame_count))])
    wide = choice.packed.large()
    say(f"a budget of {millimetres:g} mm keeps {len(decoded)} of {len(shapes)} shapes, {wide} of them in two bytes a "
        f"number and the others in one: they put vertices off by {added['mean']['mm']:.2g} mm in the mean and "
        f"{added['max']['mm']:.2g} mm at most")
    return {"count": len(decoded), "of": lambda rows: best[rows], "shapes": decoded, "packed": choice.packed,
            "explained": part_held(dataset, rows, best, decoded),
            "budget": {"mm": millimetres, "shapes": len(decoded), "of": len(shapes), "int16": wide,
                       "int8": len(decoded) - wide, "added": added, "floatBytes": 4 * shapes.size}}


def say_size(budget: dict[str, Any], archive: Path, say: Callable[[str], None]) -> None:
    """Puts the size of the archive into the report as well."""
    budget["archiveBytes"] = size = archive.stat().st_size
    say(f"{archive.name} has {size / 1e3:.0f} kB, {100 * size / budget['floatBytes']:.1f} % of what all shapes would "
        "take in single precision")


def part_held(dataset: Dataset, rows: np.ndarray, coefficients: np.ndarray, shapes: np.ndarray) -> float:
    """Part of the sum of squares of the deltas of `rows` that the shapes hold."""
    left = total = 0.0
    for part, block in dataset.blocks(rows):
        left += float(np.sum(np.square(block - coefficients[part] @ shapes, dtype=np.float64)))
        total += float(np.sum(np.square(block, dtype=np.float64)))
    return 1 - left / total


def choose(dataset: Dataset, rows: np.ndarray, shapes: np.ndarray, coefficients: Coefficients,
           millimetres: float) -> Optional[Choice]:
    """The coarsest numbers with which vertices are off by no more than the budget in the mean over `rows`; nothing
    where the finest are off by more.

    shapes        float32 [S, 3 * D], at right angles to each other
    coefficients  those of rows: float32 [n, S]
    """
    budget = millimetres / 1000 / dataset.description["metersPerUnit"]
    sizes = np.maximum(np.sqrt(np.mean(np.square(coefficients(rows), dtype=np.float64), axis=0)), np.finfo(float).tiny)
    some = coefficients(rows[np.linspace(0, len(rows) - 1, min(len(rows), CHOSEN_BY)).astype(int)])

    def mean(length: float) -> float:
        return mean_length(some, differences(shapes, rounded(shapes, sizes, length).decoded()))

    most = float(np.max(sizes * np.abs(shapes).max(axis=1)))  # of the largest number there is then 1 left
    low, high = most * 2.0**-OCTAVES, most
    for _ in range(TRIES):
        middle = float(np.sqrt(low * high))
        low, high = (middle, high) if mean(middle) <= budget else (low, middle)
    for _ in range(TRIES if low > most * 2.0**-OCTAVES else 0):
        packed = rounded(shapes, sizes, low)
        added = rounding(dataset, rows, coefficients, differences(shapes, packed.decoded()))
        if added["mean"]["mm"] <= millimetres:
            return Choice(packed, added)
        low *= 0.98 * millimetres / added["mean"]["mm"]
    return None


def mean_length(coefficients: np.ndarray, vectors: np.ndarray) -> float:
    total, count = 0.0, 0
    for part in np.array_split(coefficients, max(1, len(coefficients) // 64)):
        lengths = np.linalg.norm((part @ vectors).reshape(len(part), -1, 3), axis=2)
        total, count = total + float(lengths.sum(dtype=np.float64)), count + lengths.size
    return total / count
