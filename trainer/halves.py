# SPDX-License-Identifier: Apache-2.0
"""Principal shapes in half precision (IEEE 754 binary16), with a scale for each shape.

The scale is a power of two, so that scale times number is exact in single precision.
"""

from dataclasses import dataclass
from typing import Any, Callable

import numpy as np

from .dataset import Dataset
from .measure import Stage

LARGEST = 15     # numbers of a shape go up to 2^15; half precision ends at 65504
SMALLEST = -100  # of a scale's exponents: then no product of scale and number is too small to be exact


@dataclass(frozen=True)
class Halves:
    numbers: np.ndarray  # float16 [S, 3 * D]
    scales: np.ndarray   # float32 [S]
    compressed = False   # it would gain little

    def decoded(self) -> np.ndarray:
        """float32 [S, 3 * D]"""
        return self.scales[:, None] * self.numbers.astype(np.float32)

    def arrays(self) -> dict[str, np.ndarray]:
        """As an archive has them."""
        return {"shapes": by_vertex(self.numbers, "<f2"), "scales": self.scales.astype("<f4")}


def by_vertex(shapes: np.ndarray, kind: str) -> np.ndarray:
    """[D, S, 3] of [S, 3 * D]"""
    return np.ascontiguousarray(shapes.reshape(len(shapes), shapes.shape[1] // 3, 3).transpose(1, 0, 2), kind)


def to_halves(shapes: np.ndarray) -> Halves:
    """shapes: float32 [S, 3 * D]"""
    exponents = np.frexp(np.max(np.abs(shapes), axis=1))[1]
    scales = np.ldexp(np.float32(1), np.maximum(exponents - LARGEST, SMALLEST)).astype(np.float32)
    return Halves((shapes / scales[:, None]).astype(np.float16) + np.float16(0), scales)  # no -0


def rounding(dataset: Dataset, rows: np.ndarray, coefficients: Callable[[np.ndarray], np.ndarray],
             differences: np.ndarray) -> dict[str, Any]:
    """How far vertices go wrong over `rows` by differences [S, 3 * D] of the shapes, with the best coefficients."""
    stage = Stage(dataset)
    for part, _ in dataset.blocks(rows):
        stage.add(part, coefficients(part) @ differences)
    return stage.summary()
