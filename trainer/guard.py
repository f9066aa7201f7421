# SPDX-License-Identifier: Apache-2.0
"""The guard: what keeps a network from poses that it knows nothing of. It is put around a trained network, and inside
the ranges of the training rows it changes no bit (decision 0194).

clamp  each control is moved to the nearest value of its range before the network sees it
fade   the same, and the outputs fall to exactly 0 the further out the controls are
"""

from dataclasses import dataclass
from typing import TYPE_CHECKING, Optional

import numpy as np

from .errors import TrainerError
from .settings import Settings

if TYPE_CHECKING:
    from .export import GraphWriter

SMALLEST_PART = 0.1  # of the root mean square of all widths: the least that a control's excess is divided by


@dataclass(frozen=True)
class Guard:
    """A box of controls, in their own units."""

    lower: np.ndarray            # float32 [C]
    upper: np.ndarray            # float32 [C]
    reach: Optional[np.ndarray]  # float32 [C], above 0: so far beyond the box the outputs are 0; none: they never are

    def clamped(self, controls: np.ndarray) -> np.ndarray:
        return np.clip(controls, self.lower, self.upper)

    def factor(self, controls: np.ndarray) -> np.ndarray:
        """What outputs are multiplied by, float32 [rows, 1]: 1 in the box, 0 at the end of the reach and beyond."""
        if self.reach is None:
            return np.ones((len(controls), 1), np.float32)
        parts = (controls - self.clamped(controls)) / self.reach
        left = np.maximum(1 - np.square(parts).max(axis=1, keepdims=True), np.float32(0))
        return np.square(left)  # the quartic (biweight) kernel: flat at both ends


def units_of(lower: np.ndarray, upper: np.ndarray) -> np.ndarray:
    """What the excess of each control is divided by, float64 [C]: as ControlRanges of libraries/model has it."""
    widths = upper.astype(np.float64) - lower
    least = SMALLEST_PART * np.sqrt(np.mean(np.square(widths)))
    return np.maximum(widths, least) if least > 0 else np.ones_like(widths)


def guard_of(settings: Settings, controls: np.ndarray) -> Optional[Guard]:
    """The guard that is asked for, around the rows of `controls`, float32 [rows, C]: those that are trained on."""
    if settings.guard == "none":
        return None
    lower, upper = controls.min(axis=0), controls.max(axis=0)
    fades = settings.guard == "fade"
    return Guard(lower, upper, (settings.guardWidth * units_of(lower, upper)).astype(np.float32) if fades else None)


def check_guard(settings: Settings, changes: dict[str, object]) -> None:
    if "guardWidth" in changes and settings.guard != "fade":
        raise TrainerError(f"--guard-width is where outputs that fade are 0, and --guard is {settings.guard}: give "
                           "--guard fade as well")


def add_clamp(graph: "GraphWriter", guard: Guard) -> None:
    """The node before becomes one that stays in the box."""
    graph.add("Max", guard.lower)
    graph.add("Min", guard.upper)


def add_fade(graph: "GraphWriter", guard: Guard, controls: str, clamped: str) -> None:
    """The node before, the outputs, is multiplied by the factor; `controls` and `clamped` are names of values."""
    if guard.reach is None:
        return
    outputs = graph.value
    graph.value = controls
    graph.join("Sub", clamped)
    graph.add("Mul", 1 / guard.reach)
    graph.join("Mul", graph.value)
    graph.add("ReduceMax", axes=[-1], keepdims=1)
    graph.add("Sub", np.ones(1))
    graph.add("Min", np.zeros(1))
    graph.join("Mul", graph.value)
    graph.join("Mul", outputs)
