# SPDX-License-Identifier: Apache-2.0
"""Which rows are trained on, which choose the epoch, and which do neither and give the final figures (decision 0190).

Rows that are drawn independently are held out at random. Of a motion blocks of consecutive rows are, since the
neighbour of a row that was trained on says nothing of frames that nobody has seen; rows between the two are left out.
"""

import math
from dataclasses import replace
from typing import Any, Iterator, NamedTuple, Optional, cast

import numpy as np

from .dataset import Dataset
from .errors import TrainerError

BLOCK_ROWS = 30    # at least, where there are so many: a second or more
MOST_PAIRS = 16    # of blocks, one to validate on and one to test on
LEFT_OUT = 8       # at most an eighth of a motion's rows that could be trained on is left out beside blocks
MOST_HELD = 10     # a tenth of a motion's rows is never held out: blocks have room between them

# what two data sets have in common that are used for one model
TOGETHER = ("deltaMode", "smoothingIterations", "subsetState", "fullCount", "affectMap", "controlNames")


class Split(NamedTuple):
    """Sorted rows; none is in two parts."""

    train: np.ndarray
    validation: np.ndarray  # choose the epoch
    test: np.ndarray        # choose nothing
    how: str                # "random", "blocks", "random and blocks" or "none"
    left_out: int = 0       # rows that are in no part
    again: np.ndarray = np.arange(0)  # of those that are trained on, what an epoch has once more; with repetitions

    def measured(self) -> tuple[str, np.ndarray]:
        """The rows that errors are told of, and which part they are: the last one that has any."""
        return next((name, rows) for name, rows in (("test", self.test), ("validation", self.validation),
                                                    ("train", self.train)) if len(rows))

    def facts(self) -> dict[str, Any]:
        """For the report: how rows were held out, how many, and which part the errors are over."""
        return {"how": self.how, "train": len(self.train), "validation": len(self.validation),
                "test": len(self.test), "leftOut": self.left_out, "measured": self.measured()[0]}


def split_rows(dataset: Dataset, ratio: float, seed: int) -> Split:
    """`ratio`: part of the rows that is not trained on; half of it validates, the other half tests.

    One row at least is left to train on. With a ratio above 0 and two rows one validates; with two held out one of
    them tests."""
    everything = np.arange(dataset.frame_count)
    if ratio == 0 or dataset.frame_count == 1:
        return Split(everything, everything[:0], everything[:0], "none")
    return held_out(dataset.drawn, ratio, seed)


def split_with(dataset: Dataset, validation: Dataset, seed: int) -> Split:
    """Of the two joined: all rows of the first are trained on; those of the second validate and test, half of them
    each."""
    split, start = held_out(validation.drawn, 1.0, seed), dataset.frame_count
    return split._replace(train=np.arange(start), validation=start + split.validation, test=start + split.test,
                          left_out=split.left_out + len(split.train))


def held_out(drawn: np.ndarray, ratio: float, seed: int) -> Split:
    """`ratio`: as above; with 1 no row is trained on."""
    def count_of(count: int) -> int:
        return count if ratio == 1 else min(count - 1, max(1, round(count * ratio)))

    rows = np.arange(len(drawn))
    independent, motion = rows[drawn], rows[~drawn]
    if len(motion) < 2:  # one row alone is no motion, and no draw that says anything of others
        independent, motion = rows, rows[:0]
    elif len(independent) < 2:
        independent, motion = rows[:0], rows
    random = np.random.default_rng(seed)
    validation, test, left_out = [rows[:0]], [rows[:0]], 0
    if len(independent):
        chosen = random.permutation(independent)[:count_of(len(independent))]
        test.append(chosen[:len(chosen) // 2])
        validation.append(chosen[len(chosen) // 2:])
    if len(motion):
        held = min(count_of(len(motion)), len(motion) - len(motion) // MOST_HELD)
        spare = (len(motion) - held) // (1 if ratio == 1 else LEFT_OUT)
        for number, (first, last, gap) in enumerate(blocks(len(motion), held, spare, random)):
            (test if number % 2 else validation).append(motion[first:last])
            left_out += 2 * gap
            rows = np.setdiff1d(rows, motion[first - gap:last + gap])
    both = len(independent) > 0 and len(motion) > 0
    how = "random and blocks" if both else "random" if len(independent) else "blocks"
    held_rows = [np.sort(np.concatenate(part)) for part in (validation, test)]
    return Split(np.setdiff1d(rows, np.concatenate(held_rows)), held_rows[0], held_rows[1], how, left_out)


def blocks(count: int, held: int, spare: int, random: np.random.Generator) -> Iterator[tuple[int, int, int]]:
    """First row, row behind the last, and rows to be left out before and behind, of blocks with `held` of `count` rows
    together: at a random place each in as many equal stretches, so that all of a motion is looked at. At most `spare`
    rows are left out."""
    number = min(held, 2 * min(MOST_PAIRS, max(1, held // (2 * BLOCK_ROWS))))
    for index in range(number):
        low, high = (count * end // number for end in (index, index + 1))
        length = min(high - low, held * (index + 1) // number - held * index // number)
        gap = min(math.ceil(length / 4), spare // (2 * number), (high - low - length) // 2)
        first = low + gap + int(random.integers(high - low - length - 2 * gap + 1))
        yield first, first + length, gap


def sentence(facts: dict[str, Any]) -> str:
    """What errors are over, for the user. `facts`: as the report has them."""
    part = facts["measured"]
    ways = {"random": "drawn at random", "blocks": "in blocks of a motion", "none": "all there are",
            "random and blocks": "drawn at random, and of a motion in blocks"}
    chosen = {"test": "which have chosen nothing", "validation": "which have chosen the epoch",
              "train": "which were trained on"}
    return f"errors are over {facts[part]} rows {ways[facts['how']]}, {chosen[part]}"


# --- another data set to validate on ---

class JoinedRows:
    """Two arrays of rows as one, without a copy of either."""

    def __init__(self, first: np.ndarray, second: np.ndarray) -> None:
        self.parts = first, second
        self.shape = (len(first) + len(second), *first.shape[1:])
        self.nbytes = first.nbytes + second.nbytes

    def __len__(self) -> int:
        return self.shape[0]

    def __getitem__(self, rows: Any) -> Any:
        """Of an array of sorted rows, or all rows of some columns: [:, columns]."""
        first, second = self.parts
        if isinstance(rows, tuple):
            return JoinedRows(first[rows], second[rows])
        border = int(np.searchsorted(rows, len(first)))
        return np.concatenate([first[rows[:border]], second[rows[border:] - len(first)]])

    def __array__(self, *arguments: Any) -> np.ndarray:
        return np.concatenate(self.parts)


def join(dataset: Dataset, validation: Dataset) -> Dataset:
    """The rows of both. Throws where they are not of the same mesh, controls and deltas."""
    for key in TOGETHER:
        mine, other = dataset.description.get(key), validation.description.get(key)
        if mine != other:
            raise TrainerError(f"{validation.folder} cannot validate {dataset.folder}: its {key} is {shown(other)}, "
                               f"and the other's is {shown(mine)}")
    skins = dataset.skin, validation.skin
    skin = None if skins[0] is None or skins[1] is None else JoinedRows(skins[0], skins[1])
    return replace(dataset, controls=np.concatenate([dataset.controls, validation.controls]),
                   deltas=cast(np.ndarray, JoinedRows(dataset.deltas, validation.deltas)),
                   frames=np.concatenate([dataset.frames, validation.frames]),
                   drawn=np.concatenate([dataset.drawn, validation.drawn]), skin=cast(Optional[np.ndarray], skin))


def shown(value: object) -> str:
    text = repr(value)
    return text if len(text) < 60 else text[:57] + "..."
