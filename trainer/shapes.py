# SPDX-License-Identifier: Apache-2.0
"""Principal shapes: an orthonormal basis that holds as much of the deltas as few shapes can.

The deltas are not centred: a model directory has no mean shape, so the shapes have to span the mean as well.
The basis is a truncated singular value decomposition of the deltas X [rows, 3 * D], by the eigenvectors of the smaller
of X X^T and X^T X where that is small, else by random projection with power iterations (Halko, Martinsson, Tropp,
"Finding structure with randomness", SIAM Review 53, 2011, section 4.5 on X^T X, and the Rayleigh-Ritz method for the
values). Then X is read once for an iteration, block by block, and once for the values: a set may be larger than the
memory (decision 0191).
"""

from dataclasses import dataclass

import numpy as np
import scipy.linalg

from .dataset import Dataset
from .plausible import require_any

EXACT_SIDE = 2048        # largest matrix whose eigenvectors are computed: some seconds
OVERSAMPLING = 10        # Halko et al., section 4.2: 5 or 10
POWER_ITERATIONS = 3
LARGE_BLOCK = 256 << 20  # bytes; with each block some hundred MB of sums are read and written
RELATIVE_FLOOR = 1e-6    # singular values below this part of the largest are rounding of float32 data


@dataclass(frozen=True)
class Basis:
    shapes: np.ndarray   # float32 [S, 3 * D], orthonormal rows
    explained: float     # part of the sum of squares of the deltas that the shapes hold

    def coefficients(self, deltas: np.ndarray) -> np.ndarray:
        return deltas @ self.shapes.T


def principal_basis(dataset: Dataset, rows: np.ndarray, limit: int, accuracy: float, seed: int) -> Basis:
    """The fewest shapes, at most `limit`, that hold `accuracy` (0 to 1) of the sum of squares of the deltas of `rows`.

    At least one. The same arguments give the same bits on one machine.
    """
    limit = min(limit, len(rows), dataset.deltas.shape[1])
    if min(len(rows), dataset.deltas.shape[1]) <= EXACT_SIDE:
        vectors, values, total = exact(dataset, rows, limit)
    else:
        vectors, values, total = randomized(dataset, rows, limit, seed)
    require_any(dataset, total)
    parts = np.cumsum(values**2) / total
    usable = max(1, int(np.count_nonzero(values > RELATIVE_FLOOR * values[0])))
    count = min(usable, int(np.searchsorted(parts[:usable], accuracy - 1e-9)) + 1)
    return Basis(with_fixed_signs(vectors[:count]).astype(np.float32), float(min(1.0, parts[count - 1])))


def exact(dataset: Dataset, rows: np.ndarray, limit: int) -> tuple[np.ndarray, np.ndarray, float]:
    """The first right singular vectors [limit, 3 * D], singular values and the sum of squares of all deltas."""
    tall = len(rows) > dataset.deltas.shape[1]
    gram = inner_products(dataset, rows) if tall else outer_products(dataset, rows)
    side = len(gram)
    squares, vectors = scipy.linalg.eigh(gram, subset_by_index=[side - limit, side - 1])
    values, vectors = np.sqrt(np.maximum(squares[::-1], 0)), vectors[:, ::-1].T
    if not tall:
        # from left to right singular vectors; orthonormal again, as small singular values lose digits on the way
        vectors = np.linalg.qr(times_deltas(dataset, rows, vectors).T)[0].T
    return vectors, values, np.trace(gram)


def inner_products(dataset: Dataset, rows: np.ndarray) -> np.ndarray:
    gram = np.zeros((dataset.deltas.shape[1],) * 2)
    for _, block in dataset.blocks(rows):
        block = block.astype(np.float64)
        gram += block.T @ block
    return gram


def outer_products(dataset: Dataset, rows: np.ndarray) -> np.ndarray:
    """X X^T, by columns: each product sees all rows of a few columns."""
    gram = np.zeros((len(rows),) * 2)
    step = max(1, (64 << 20) // (8 * len(rows)))
    for first in range(0, dataset.deltas.shape[1], step):
        block = dataset.deltas[:, first:first + step][rows].astype(np.float64)
        gram += block @ block.T
    return gram


def times_deltas(dataset: Dataset, rows: np.ndarray, left: np.ndarray) -> np.ndarray:
    """left [k, rows] times X: [k, 3 * D]."""
    product, done = np.zeros((len(left), dataset.deltas.shape[1])), 0
    for part, block in dataset.blocks(rows):
        product += left[:, done:done + len(part)] @ block.astype(np.float64)
        done += len(part)
    return product


def randomized(dataset: Dataset, rows: np.ndarray, limit: int,
               seed: int) -> tuple[np.ndarray, np.ndarray, float]:
    size = min(limit + OVERSAMPLING, len(rows), dataset.deltas.shape[1])
    right = orthonormal(np.random.default_rng(seed).standard_normal((dataset.deltas.shape[1], size)))
    for _ in range(POWER_ITERATIONS):
        right = orthonormal(inner_products_times(dataset, rows, right))
    gram, total = np.zeros((size, size)), 0.0
    for _, block in dataset.blocks(rows):
        block = block.astype(np.float64)
        total += float(np.vdot(block, block))
        projected = block @ right
        gram += projected.T @ projected
    squares, turn = np.linalg.eigh(gram)
    return (right @ turn[:, :-limit - 1:-1]).T, np.sqrt(np.maximum(squares[:-limit - 1:-1], 0)), total


def orthonormal(columns: np.ndarray) -> np.ndarray:
    return scipy.linalg.qr(columns, mode="economic", overwrite_a=True, check_finite=False)[0]


def inner_products_times(dataset: Dataset, rows: np.ndarray, right: np.ndarray) -> np.ndarray:
    """X^T X times right [3 * D, k]. The products of a block are in single precision, which puts a direction off by its
    rounding times the first singular value in parts of its own: the next iteration starts there, and the values are
    computed in double precision."""
    right = right.astype(np.float32)
    product = np.zeros(right.shape)
    for _, block in dataset.blocks(rows, LARGE_BLOCK):
        product += block.T @ (block @ right)
    return product


def with_fixed_signs(vectors: np.ndarray) -> np.ndarray:
    """A singular vector has no sign of its own: the entry of largest magnitude becomes positive."""
    largest = np.argmax(np.abs(vectors), axis=1)
    return vectors * np.where(vectors[np.arange(len(vectors)), largest] < 0, -1.0, 1.0)[:, None]
