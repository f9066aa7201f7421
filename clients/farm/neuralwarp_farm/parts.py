# SPDX-License-Identifier: Apache-2.0
"""Ranges of frames as quarn has them, and how they are cut."""

import math
import re
from dataclasses import dataclass

from .errors import UsageError

LARGEST_FRAME = 100_000_000
LARGEST_COUNT = 10_000  # of parts: more than that is more for a queue than for whoever reads its list
RANGE = re.compile(r"(-?[0-9]{1,9})(?:-(-?[0-9]{1,9})(?:x([0-9]{1,9}))?)?")


@dataclass(frozen=True)
class Frames:
    """Whole frames from `first` to `last`, both included, each `step`-th."""

    first: int
    last: int
    step: int = 1

    @property
    def count(self) -> int:
        return (self.last - self.first) // self.step + 1

    def frame(self, number: int) -> int:
        """From 0."""
        return self.first + number * self.step

    def run(self, begin: int, end: int) -> "Frames":
        """Those of the numbers from `begin` to `end`, without the last."""
        return Frames(self.frame(begin), self.frame(end - 1), self.step)

    def __str__(self) -> str:
        if self.first == self.last:
            return str(self.first)
        return f"{self.first}-{self.last}" + (f"x{self.step}" if self.step != 1 else "")


def frames_of(text: str) -> Frames:
    """"5", "1-100" or "1-100x5", as quarn reads them. Raises UsageError, quoting the text, for anything else."""
    found = RANGE.fullmatch(text)
    if not found:
        raise UsageError(f'"{text}" is no range of frames: write 5, 1-100 or 1-100x5')
    first, last, step = (int(number) if number else None for number in found.groups())
    assert first is not None
    last, step = first if last is None else last, 1 if step is None else step
    if last < first or step < 1:
        raise UsageError(f'"{text}" is no range of frames: the last is not before the first, and steps are at least 1')
    if max(-first, last) > LARGEST_FRAME:
        raise UsageError(f'"{text}" goes beyond the frame {LARGEST_FRAME}')
    return Frames(first, last - (last - first) % step, step)


def cut(frames: Frames, count: int) -> list[Frames]:
    """`count` runs of whole frames that are equally long, give or take one; as many as there are frames at most."""
    count = min(max(count, 1), frames.count)
    bounds = [frames.count * number // count for number in range(count + 1)]
    return [frames.run(begin, end) for begin, end in zip(bounds, bounds[1:])]


def count_for(frames: Frames, minutes: float, start_seconds: float, seconds_a_frame: float) -> int:
    """How many parts there are to be, if each is to take so long. A part has one frame at least."""
    room = 60 * minutes - start_seconds
    each = max(1, math.floor(room / seconds_a_frame)) if seconds_a_frame > 0 else frames.count
    return min(math.ceil(frames.count / each), LARGEST_COUNT)


def names(count: int) -> list[str]:
    """"0001" and so on: as they sort, with 4 digits at least."""
    digits = max(4, len(str(count)))
    return [f"{number:0{digits}d}" for number in range(1, count + 1)]
