# SPDX-License-Identifier: Apache-2.0
"""Which controls act together: those that move the same vertices.

A correction at the index finger depends on that finger's joints. A neuron that sees all joints has to learn from poses
that the others do not matter; one that sees a neighbourhood need not, and few poses teach it more (decision 0189)."""

import re
from typing import Optional

import numpy as np

SHARE = 0.25  # of what a plug does where it acts: what another one does there, for both to be neighbours
SEE_ALL = 0.25  # part of the neurons that see every control: what acts together against the rule is learned as well
BLOCK_VERTICES = 4096
SMALLEST = np.finfo(np.float64).tiny


def plugs_of(names: list[str]) -> list[np.ndarray]:
    """Controls of one joint or slider: those whose names differ in the number behind the last colon alone."""
    plugs: dict[str, list[int]] = {}
    for index, name in enumerate(names):
        plugs.setdefault(re.sub(r":\d+$", "", name), []).append(index)
    return [np.array(controls) for controls in plugs.values()]


def shares(line: np.ndarray, shapes: Optional[np.ndarray], plugs: list[np.ndarray]) -> np.ndarray:
    """float64 [P, P]: how much column's plug moves the vertices that row's plug moves, as a part of what that does.

    A plug's influence on a vertex is the length of the change there; in parts of the largest influence on this vertex
    it is averaged over the vertices, weighted by the square of the influence of row's plug. Rows of plugs that move
    nothing are 0.

    line    float32 [K, C]: change of the outputs with each control
    shapes  float32 [K, 3 * D] whose coefficients the outputs are; none where they are deltas
    """
    width = line.shape[0] if shapes is None else shapes.shape[1]
    sums = np.zeros((len(plugs), len(plugs)))
    for first in range(0, width, 3 * BLOCK_VERTICES):
        part = slice(first, first + 3 * BLOCK_VERTICES)
        moved = (line[part].T if shapes is None else line.T @ shapes[:, part]).astype(np.float64)
        squares = np.square(moved).reshape(len(moved), -1, 3).sum(axis=2)
        of_plugs = np.array([squares[controls].sum(axis=0) for controls in plugs])
        influence = np.sqrt(of_plugs)
        sums += of_plugs @ (influence / np.maximum(influence.max(axis=0), SMALLEST)).T
    return sums / np.maximum(np.diag(sums), SMALLEST)[:, None]


def seen_by_neurons(neighbours: np.ndarray, plugs: list[np.ndarray], control_count: int, neurons: int) -> np.ndarray:
    """bool [neurons, C]: each plug that moves a vertex is in turn the centre of a neuron, which sees its neighbours.

    neighbours  float64 [P, P], of shares()
    """
    seen = np.ones((neurons, control_count), bool)
    centres = np.flatnonzero(np.diag(neighbours) > 0)
    if not len(centres):
        return seen
    for neuron in range(neurons - round(SEE_ALL * neurons)):
        near = np.flatnonzero(neighbours[centres[neuron % len(centres)]] >= SHARE)
        seen[neuron] = False
        seen[neuron, np.concatenate([plugs[plug] for plug in near])] = True
    return seen
