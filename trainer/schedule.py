# SPDX-License-Identifier: Apache-2.0
"""The learning rate over a training, and when the training ends (decision 0191)."""

import math
from dataclasses import dataclass
from typing import Optional


def falling(rate: float, part: float) -> float:
    """Half a cosine from `rate` to 0, after `part` (0 to 1) of the way."""
    return rate * 0.5 * (1 + math.cos(math.pi * part))


@dataclass
class Schedule:
    """The rate falls to 0 over all epochs. When nothing gets better any more it falls from where it is to 0 over a last
    phase of at most `patience` epochs: what only small steps can learn is learned in any case."""

    rate: float                    # at the start
    epochs: int
    patience: int                  # epochs without a better loss until the last phase
    landing: Optional[int] = None  # epochs that were done when the last phase began

    @property
    def end(self) -> int:
        """Epochs after which the training is over."""
        return self.epochs if self.landing is None else min(self.epochs, self.landing + self.patience)

    def at(self, step: int, steps: int) -> float:
        """The rate of a step, counted from 0 over the whole training, with `steps` in an epoch."""
        if self.landing is None:
            return falling(self.rate, step / (self.epochs * steps))
        first = self.landing * steps
        return falling(falling(self.rate, self.landing / self.epochs), (step - first) / (self.end * steps - first))

    def note(self, epoch: int, best_epoch: int) -> None:
        """To be called after each epoch, counted from 1."""
        if self.landing is None and epoch - best_epoch >= self.patience:
            self.landing = epoch
