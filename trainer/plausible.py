# SPDX-License-Identifier: Apache-2.0
"""Whether deltas look like corrections of a skin. What does not was made from the wrong frames more often than not, and
trains without an error."""

from typing import Any, Optional

import numpy as np

from .dataset import Dataset
from .errors import TrainerError

LARGEST_MEAN = 0.1  # of the character's diagonal; corrections that sculptors and simulations make have a few hundredths
LOOKED_AT = 500  # rows at most, spread over all: a mean needs no more


def require_any(dataset: Dataset, total: float) -> None:
    """`total`: sum of squares of the deltas that are to be learned."""
    if total == 0:
        raise TrainerError(f"every delta of {dataset.folder} is 0: check that the targets were connected when it was "
                           "exported ('trainer zero' makes a model that outputs zeros)")


def mean_length(dataset: Dataset) -> float:
    """Of the deltas, in scene units."""
    rows = np.arange(0, dataset.frame_count, max(1, dataset.frame_count // LOOKED_AT))
    total = sum(float(np.linalg.norm(block.reshape(-1, 3).astype(np.float64), axis=1).sum())
                for _, block in dataset.blocks(rows))
    return total / max(1, len(rows) * dataset.delta_count)


def skin_motion(fit: dict[str, Any]) -> Optional[float]:
    """How far quarn export has seen the skin move, in scene units; none where it says nothing of use."""
    motion = fit.get("motion")
    return float(motion) if isinstance(motion, (int, float)) and not isinstance(motion, bool) else None


def doubts(dataset: Dataset) -> list[str]:
    """Sentences; none where the deltas look as they should."""
    description = dataset.description
    size, mean = description["boundingBoxDiagonal"], mean_length(dataset)
    fit = description.get("targetFit")
    fit = fit if isinstance(fit, dict) else {}
    motion = skin_motion(fit)
    millimetres = 1000 * description["metersPerUnit"]
    sentences = []
    if size > 0 and mean > LARGEST_MEAN * size:
        sentences.append(f"the deltas do not look like corrections: they are {mean / size:.0%} of the character's "
                         f"diagonal in the mean, where {LARGEST_MEAN:.0%} is a great deal")
    if fit.get("follows") is False:
        sentences.append("the targets do not go with the poses, as quarn export has found")
    elif fit.get("follows") is None and motion and mean > motion:
        sentences.append(f"the deltas, {millimetres * mean:.3g} mm in the mean, are larger than what the skin moves "
                         f"({millimetres * motion:.3g} mm): that is right for a face whose skin hardly moves, and for "
                         "little else")
    if sentences:
        sentences.append("'quarn target' says what may be wrong with a cache: its unit, its axes, its first frame, the "
                         "order of its vertices")
    return sentences
