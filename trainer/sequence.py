# SPDX-License-Identifier: Apache-2.0
"""Which rows of a data set are drawn independently of each other, and which follow each other as a motion does.

Where quarn export has not said it, the controls do: by von Neumann's ratio of the mean square successive difference to
the variance (J. von Neumann, "Distribution of the ratio of the mean square successive difference to the variance",
Annals of Mathematical Statistics 12, 1941). Half of it is 1 in the mean for independent rows, whatever their
distribution, and 1 - cos(2 pi / P) for a swing of P rows.
"""

from pathlib import Path
from typing import Any

import numpy as np

from .errors import TrainerError

INDEPENDENT = 0.5  # half the ratio; what swings more slowly than once in 6 rows lies below, and is a motion
FEWEST = 8         # rows that tell one from the other


def drawn_rows(description: dict[str, Any], controls: np.ndarray, frames: np.ndarray, path: Path) -> np.ndarray:
    """bool [F]: the rows that are independent of their neighbours. `path`: of the description, for errors."""
    spans = description.get("drawnFrames")
    if spans is None:
        return np.full(len(frames), looks_drawn(controls))
    drawn = np.zeros(len(frames), bool)
    for first, last in checked(spans, path):
        drawn |= (first <= frames) & (frames <= last)
    return drawn


def checked(spans: object, path: Path) -> list[tuple[int, int]]:
    if not isinstance(spans, list) or not all(is_span(span) for span in spans):
        raise TrainerError(f"{path}: drawnFrames is {str(spans)[:60]}, not a list of pairs of a first and a last frame")
    return spans


def is_span(span: object) -> bool:
    return (isinstance(span, list) and len(span) == 2 and all(type(end) is int for end in span)
            and bool(span[0] <= span[1]))


def looks_drawn(controls: np.ndarray) -> bool:
    """Whether a step from row to row is about as long as one between any two rows; no for few rows."""
    if len(controls) < FEWEST:
        return False
    values = controls.astype(np.float64)
    variance = values.var(axis=0)
    moves = variance > 1e-12 * np.maximum(1e-12, np.square(values).max(axis=0))
    if not moves.any():
        return False
    steps = np.square(np.diff(values[:, moves], axis=0)).mean(axis=0)
    return bool(np.mean(steps / variance[moves]) / 2 >= INDEPENDENT)
