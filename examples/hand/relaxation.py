# SPDX-License-Identifier: Apache-2.0
"""The shape that a posed skin would have if it were elastic and kept its volume where it bends.

Sources:
[ARAP] O. Sorkine, M. Alexa: As-Rigid-As-Possible Surface Modeling. Symposium on Geometry Processing 2007.
[COT]  U. Pinkall, K. Polthier: Computing Discrete Minimal Surfaces and Their Conjugates. Experimental Mathematics 1993.

Vectors are rows, [V, 3] is an array of V of them; a rotation R turns p into p R.
"""

from typing import Callable

import numpy as np
from scipy import sparse
from scipy.sparse.linalg import splu
from skinned_mesh import SkinnedMesh

ITERATIONS = 12
# how strongly a vertex is pulled to the skin, against cotangent weights of about 1 an edge: soft where it bends
PULL_BENDING, PULL_RIGID = 0.003, 1.0
# share of a region's lost volume that one iteration's pressure gives back, and the loss at which pressure stops growing
RESTORED, LARGEST_LOSS = 1.0, 3.0
# steps of diffusion by which weights of regions and pulls are spread over the surface, so that nothing has an edge
SPREAD = 4
# how much each vertex turns with its wider surroundings: without that, the sharp inside of a fold has two shapes of
# nearly the same energy, and snaps from one to the other
ALIGNMENT, SURROUNDINGS = 0.2, 8
# a pair of influences is a region where it has the mean of at least that many vertices
SMALLEST_REGION = 2.0


class Relaxation:
    """A mesh's constant matrices; relax() then takes one posed skin after the other."""

    def __init__(self, mesh: SkinnedMesh) -> None:
        """mesh: a SkinnedMesh; its triangles turn the same way around, outwards."""
        self.rest = mesh.points
        self.triangles = mesh.triangles
        count = len(self.rest)
        edges, cotangents = cotangent_weights(self.rest, self.triangles)
        laplacian = _laplacian(edges, cotangents, count)
        spread = self._spread = _diffusion(edges, count)
        self.pull = spread(_pull(mesh.weights))
        self.regions = spread(_regions(mesh.weights))
        self._region_of_triangle = self.regions[self.triangles].mean(axis=1)
        self._covariance = _covariance(self.rest, edges, cotangents)
        self._system = splu((laplacian + sparse.diags(self.pull)).tocsc())
        self._rest_volumes = self._volumes(self.rest)
        self._sizes = self._ball_volumes()
        self._compliance = self._growth_by_pressure()

    def relax(self, skin: np.ndarray) -> np.ndarray:
        """skin: the posed points, [V, 3]. Returns the relaxed ones, [V, 3]; for the rest shape, the rest shape."""
        points = skin
        held = self.pull[:, None] * skin
        aligned = self._alignment(skin)
        lost = np.zeros(len(self._sizes))
        for _ in range(ITERATIONS):
            lost += RESTORED * (self._rest_volumes - self._volumes(points)) / self._sizes
            rotations = nearest_rotations((self._covariance @ points).reshape(-1, 3, 3) + aligned)
            elastic = 0.5 * (self._covariance.T @ rotations.reshape(-1, 3))  # [ARAP] (8)
            points = self._system.solve(elastic + held + self._pressure(lost, points))  # [ARAP] (9)
        return points

    def _alignment(self, skin: np.ndarray) -> np.ndarray:
        """[V, 3, 3]: what pulls the rotation of each vertex towards that of its surroundings in the skin."""
        covariances = (self._covariance @ skin).reshape(-1, 9)
        surroundings = nearest_rotations(self._spread(covariances, SURROUNDINGS).reshape(-1, 3, 3))
        sizes = np.trace((self._covariance @ self.rest).reshape(-1, 3, 3), axis1=1, axis2=2)
        return ALIGNMENT * sizes[:, None, None] * surroundings

    def _pressure(self, lost: np.ndarray, points: np.ndarray) -> np.ndarray:
        """The force on each vertex: pressures of its regions, times how fast the volume grows with the vertex."""
        pressures = LARGEST_LOSS * np.tanh(lost / LARGEST_LOSS) / self._compliance
        return (self.regions @ pressures)[:, None] * self._normals(points)

    def _ball_volumes(self) -> np.ndarray:
        """Of balls with the area of each region: what a loss of volume is measured by. A region's own volume can be
        nothing, where it is flat."""
        areas = self._region_of_triangle.T @ np.linalg.norm(self._corner_cross(self.rest), axis=1) / 2.0
        return areas**1.5 / (6.0 * np.sqrt(np.pi))

    def _growth_by_pressure(self) -> np.ndarray:
        """By how much each region grows, in its size, when all regions have a pressure of 1."""
        normals = self._normals(self.rest)
        moved = self._system.solve(self.regions.sum(axis=1)[:, None] * normals)
        return self.regions.T @ np.einsum("vd,vd->v", normals, moved) / self._sizes

    def _corner_cross(self, points: np.ndarray) -> np.ndarray:
        first, second, third = (points[self.triangles[:, k]] for k in range(3))
        return np.cross(second - first, third - first)

    def _normals(self, points: np.ndarray) -> np.ndarray:
        """A third of the area of the triangles around each vertex, as a vector outwards. Not normalised: in a fold,
        where the direction jumps, the length is nothing."""
        per_triangle = self._corner_cross(points) / 6.0
        return np.stack([np.bincount(self.triangles.ravel(), np.repeat(per_triangle[:, k], 3), len(points))
                         for k in range(3)], axis=1)

    def _volumes(self, points: np.ndarray) -> np.ndarray:
        """Of each region: its triangles' cones to the region's middle, weighted as the region is."""
        middles = (self.regions.T @ points) / self.regions.sum(axis=0)[:, None]
        cross = self._corner_cross(points)
        centres = points[self.triangles].mean(axis=1)
        to_origin = self._region_of_triangle.T @ np.einsum("td,td->t", cross, centres)
        return (to_origin - np.einsum("rd,rd->r", self._region_of_triangle.T @ cross, middles)) / 6.0


def cotangent_weights(points: np.ndarray, triangles: np.ndarray) -> tuple[np.ndarray, np.ndarray]:
    """Edges [E, 2] and their weights [E], half the sum of the cotangents of the angles opposite ([COT]); an edge of
    obtuse angles gets 0 instead of a negative weight, which would make the energy unbounded."""
    weights: dict[tuple[int, int], float] = {}
    for k in range(3):
        tip, first, second = triangles[:, k], triangles[:, (k + 1) % 3], triangles[:, (k + 2) % 3]
        a, b = points[first] - points[tip], points[second] - points[tip]
        area = np.linalg.norm(np.cross(a, b), axis=1)
        cotangents = np.einsum("td,td->t", a, b) / np.maximum(area, 1e-12 * np.einsum("td,td->t", a, a))
        for edge, cotangent in zip(np.sort(np.stack([first, second], axis=1), axis=1), cotangents):
            key = (edge[0], edge[1])
            weights[key] = weights.get(key, 0.0) + 0.5 * cotangent
    return np.array(list(weights), dtype=int).reshape(-1, 2), np.maximum(list(weights.values()), 0.0)


def nearest_rotations(matrices: np.ndarray) -> np.ndarray:
    """The rotation R of each matrix S [N, 3, 3] with the largest trace(transpose(R) S) ([ARAP] (6))."""
    left, _, right = np.linalg.svd(matrices)
    left[:, :, 2] *= np.sign(np.linalg.det(left @ right))[:, None]
    return left @ right


def _laplacian(edges: np.ndarray, weights: np.ndarray, count: int) -> sparse.spmatrix:
    i, j = np.concatenate([edges, edges[:, ::-1]]).T
    off = sparse.csr_matrix((np.concatenate([weights, weights]), (i, j)), shape=(count, count))
    return sparse.diags(np.asarray(off.sum(axis=1)).ravel()) - off


def _covariance(rest: np.ndarray, edges: np.ndarray, weights: np.ndarray) -> sparse.csr_matrix:
    """[3 V, V]: times points, it is for each vertex i the matrix sum over its edges of w (r_i - r_j)^T (p_i - p_j)."""
    count = len(rest)
    i, j = np.concatenate([edges, edges[:, ::-1]]).T
    values = np.concatenate([weights, weights])[:, None] * (rest[i] - rest[j])
    rows = (3 * i[:, None] + np.arange(3)).ravel()
    at_i, at_j = (sparse.csr_matrix((s * values.ravel(), (rows, np.repeat(k, 3))), shape=(3 * count, count))
                  for s, k in ((1.0, i), (-1.0, j)))
    return (at_i + at_j).tocsr()


def _diffusion(edges: np.ndarray, count: int) -> Callable[..., np.ndarray]:
    neighbours = -_laplacian(edges, np.ones(len(edges)), count)
    degrees = -neighbours.diagonal()
    step = 0.5 * sparse.identity(count) + 0.5 * sparse.diags(1.0 / np.maximum(degrees, 1.0)) @ (
        neighbours + sparse.diags(degrees))

    def spread(values: np.ndarray, steps: int = SPREAD) -> np.ndarray:
        for _ in range(steps):
            values = step @ values
        return values

    return spread


def _pull(weights: sparse.csr_matrix) -> np.ndarray:
    """By how far one influence holds a vertex alone: its weights' sum of squares, 1 if it does."""
    rigid = np.asarray(weights.multiply(weights).sum(axis=1)).ravel()
    return PULL_BENDING + (PULL_RIGID - PULL_BENDING) * rigid**4


def _regions(weights: sparse.csr_matrix) -> np.ndarray:
    """[V, R]: how much a vertex belongs to the joint between two influences, for all pairs that share vertices."""
    columns = weights.tocsc()
    shared = sparse.triu(weights.T @ weights, k=1).tocoo()
    large = shared.data * 4.0 >= SMALLEST_REGION
    pairs = zip(shared.row[large], shared.col[large])
    regions = [2.0 * np.sqrt(np.asarray(columns[:, a].multiply(columns[:, b]).todense()).ravel()) for a, b in pairs]
    return np.stack(regions, axis=1) if regions else np.zeros((weights.shape[0], 0))
