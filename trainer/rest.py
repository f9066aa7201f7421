# SPDX-License-Identifier: Apache-2.0
"""The pose at rest. A character stands in it for much of its time, and any error is seen there; among thousands of rows
it is one. So it is trained on, and as often as a hundredth of the rows is (decision 0194)."""

import math

import numpy as np

from .dataset import Dataset
from .split import Split

NOTHING = 1e-6  # of the character's diagonal: deltas that are smaller correct nothing
PART = 0.01     # of the rows of an epoch


def rest_rows(dataset: Dataset) -> np.ndarray:
    """Sorted rows in which there is nothing to correct: the skin is the target, as it is at rest."""
    least = NOTHING * dataset.description["boundingBoxDiagonal"]
    everything = np.arange(dataset.frame_count)
    return np.concatenate([part[np.abs(deltas).max(axis=1) <= least] for part, deltas in dataset.blocks(everything)])


def with_rest(dataset: Dataset, split: Split) -> Split:
    """The split with a row at rest among those that are trained on, if there is any, and repeated as said above."""
    rest = rest_rows(dataset)
    if not np.isin(rest, split.train).any():
        split = moved(split, np.intersect1d(rest, np.concatenate([split.validation, split.test]))[:1])
    rest = np.intersect1d(rest, split.train)
    missing = math.ceil(PART * len(split.train)) - len(rest)
    return split._replace(again=np.resize(rest, max(0, missing))) if len(rest) else split


def moved(split: Split, rows: np.ndarray) -> Split:
    """With these among the rows that are trained on; as it was where no row would be left to validate or to test."""
    validation, test = np.setdiff1d(split.validation, rows), np.setdiff1d(split.test, rows)
    if (len(validation) > 0) != (len(split.validation) > 0) or (len(test) > 0) != (len(split.test) > 0):
        return split
    return split._replace(train=np.union1d(split.train, rows), validation=validation, test=test)
