# SPDX-License-Identifier: Apache-2.0
"""A skinned mesh at rest, read from a scene file of OpenQuarn."""

import json
from dataclasses import dataclass
from typing import Any, Iterator, Optional

import numpy as np
from scipy import sparse

Json = dict[str, Any]


class BadInput(Exception):
    """One sentence for the user: what is wrong, where, and what was expected."""


@dataclass
class SkinnedMesh:
    """name: of the mesh node; points: [vertices, 3], object space, scene units; triangles: [triangles, 3], indices of
    points; weights: [vertices, influences], sparse, rows that add up to 1 (or to 0, where nothing is bound)."""

    name: str
    points: np.ndarray
    triangles: np.ndarray
    weights: sparse.csr_matrix


def read_skinned_mesh(path: str, mesh_name: Optional[str] = None) -> SkinnedMesh:
    """The one mesh in the scene at `path` that a skinCluster deforms at index 0, or the one named `mesh_name`.

    Raises BadInput."""
    scene = _read_json(path)
    try:
        nodes = {node["name"]: node for node in scene["nodes"]}
        sources = {destination: source for source, destination in scene.get("connections", [])}
        found = dict(_skinned_meshes(nodes, sources))
        name = _choose(path, list(found), mesh_name)
        return _build(path, name, nodes[name]["values"]["inMesh"], found[name])
    except (KeyError, TypeError, AttributeError, ValueError) as error:
        raise BadInput(f"{path}: not a scene with a skinned mesh ({type(error).__name__}: {error})") from error


def _read_json(path: str) -> Any:
    try:
        with open(path, encoding="utf-8") as file:
            return json.load(file)
    except OSError as error:
        raise BadInput(f"{path}: {error.strerror}") from error
    except ValueError as error:
        raise BadInput(f"{path}: not JSON ({error})") from error


def _skinned_meshes(nodes: Json, sources: dict[str, str]) -> Iterator[tuple[str, Json]]:
    for name, node in nodes.items():
        mesh = sources.get(f"{name}.input[0].inputGeometry", "").rpartition(".")[0]
        if node["type"] == "skinCluster" and nodes.get(mesh, {}).get("type") == "mesh":
            yield mesh, node["values"]


def _choose(path: str, found: list[str], wanted: Optional[str]) -> str:
    if wanted is None and len(found) == 1:
        return found[0]
    if wanted is not None and wanted in found:
        return wanted
    if not found:
        raise BadInput(f"{path}: no mesh node is connected into input[0].inputGeometry of a skinCluster")
    if wanted is None:
        raise BadInput(f"{path}: has several skinned meshes, choose one with --mesh: {', '.join(found)}")
    raise BadInput(f"{path}: has no skinned mesh '{wanted}'; it has {', '.join(found)}")


def _build(path: str, name: str, mesh: Json, skin: Json) -> SkinnedMesh:
    points = np.array(mesh["points"], dtype=float).reshape(-1, 3)
    counts = np.array(mesh["counts"], dtype=int)
    corners = np.array(mesh["corners"], dtype=int)
    if counts.sum() != len(corners) or (len(corners) and not 0 <= corners.min() <= corners.max() < len(points)):
        raise BadInput(f"{path}: the polygons of mesh '{name}' do not fit its {len(points)} points")
    return SkinnedMesh(name, points, _fans(counts, corners), _weights(path, name, skin, len(points)))


def _fans(counts: np.ndarray, corners: np.ndarray) -> np.ndarray:
    """Polygons as triangles, each a fan around its first corner."""
    starts = np.cumsum(counts) - counts
    fans = [(corners[s], corners[s + k], corners[s + k + 1]) for s, n in zip(starts, counts) for k in range(1, n - 1)]
    return np.array(fans, dtype=int).reshape(-1, 3)


def _weights(path: str, name: str, skin: Json, vertex_count: int) -> sparse.csr_matrix:
    counts = np.array(skin["skin[0].influenceCounts"], dtype=int)
    influences = np.array(skin["skin[0].influences"], dtype=int)
    weights = np.array(skin["skin[0].skinWeights"], dtype=float)
    if len(counts) != vertex_count or not counts.sum() == len(influences) == len(weights):
        raise BadInput(f"{path}: the skin of mesh '{name}' does not fit its {vertex_count} points: "
                       f"{len(counts)} counts of {counts.sum()} influences, {len(influences)} and {len(weights)} given")
    rows = np.repeat(np.arange(vertex_count), counts)
    matrix = sparse.csr_matrix((weights, (rows, influences)))
    matrix.resize(vertex_count, matrix.shape[1])
    total = np.asarray(matrix.sum(axis=1)).ravel()
    return sparse.diags(1.0 / np.where(total == 0.0, 1.0, total)) @ matrix
