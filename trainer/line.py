# SPDX-License-Identifier: Apache-2.0
"""The best straight line from controls to what is learned: ridge regression, in closed form (Hoerl and Kennard, "Ridge
Regression: Biased Estimation for Nonorthogonal Problems", Technometrics 12, 1970)."""

from dataclasses import dataclass
from typing import Callable

import numpy as np
import scipy.linalg

RIDGE = 1e-3  # of the controls' common variance: what few rows do not tell apart stays small
BLOCK_BYTES = 64 << 20


@dataclass(frozen=True)
class Line:
    weights: np.ndarray  # float32 [K, C]; 0 for controls that never move
    offset: np.ndarray   # float32 [K]

    def outputs(self, inputs: np.ndarray) -> np.ndarray:
        """float32 [n, K] for normalised controls [n, C]"""
        return inputs @ self.weights.T + self.offset


def best_line(inputs: np.ndarray, targets_of: Callable[[np.ndarray], np.ndarray], rows: np.ndarray,
              still: np.ndarray) -> Line:
    """The line that comes nearest to the targets of `rows`.

    inputs      float32 [F, C], normalised controls of all rows
    targets_of  gives float32 [n, K] for an array of sorted rows
    still       bool [C]: controls that must have no influence
    """
    moving = np.flatnonzero(~still)
    controls = inputs[rows][:, moving].astype(np.float64)
    center = controls.mean(axis=0)
    controls -= center
    outputs = targets_of(rows[:1]).shape[1]
    products, sums = np.zeros((len(moving), outputs)), np.zeros(outputs)
    step = max(1, BLOCK_BYTES // (4 * outputs))
    for first in range(0, len(rows), step):
        targets = targets_of(rows[first:first + step]).astype(np.float64)
        products += controls[first:first + step].T @ targets
        sums += targets.sum(axis=0)
    squares = controls.T @ controls + RIDGE * len(rows) * np.eye(len(moving))
    solved = scipy.linalg.solve(squares, products, assume_a="pos") if len(moving) else products
    weights = np.zeros((outputs, inputs.shape[1]), np.float32)
    weights[:, moving] = solved.T
    return Line(weights, (sums / len(rows) - center @ solved).astype(np.float32))
