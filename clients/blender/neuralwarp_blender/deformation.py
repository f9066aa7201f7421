# SPDX-License-Identifier: Apache-2.0
"""A model at work on one object: controls come from the scene that was published with it, points from the evaluated
mesh, and the result goes into that mesh, which only Blender's drawing and rendering see afterwards.

The original mesh is read, and never written. What is made here belongs to the thread that made it: a render has its
own.
"""

from dataclasses import dataclass
from typing import Any, Dict, Hashable, Optional

import numpy as np
from numpy.typing import NDArray

from . import module
from .model_folder import Rig
from .pose import JointSetter
from .refused import Refused
from .stack import check_own_mesh, topology

Points = NDArray[np.float32]

# of the diagonal: by how much the mesh at rest may lie elsewhere than at the training before that is said
SAME_REST = 1e-4


@dataclass
class Copy:
    """An evaluated mesh as it was seen last, in one of Blender's dependency graphs."""

    points: Points  # [N, 3], as the armature made it
    result: Points  # [N, 3], as it was written
    controls: Points
    settings: Hashable = None

    @staticmethod
    def unseen(count: int) -> "Copy":
        """Equal to no mesh."""
        points = np.full((2, count, 3), np.nan, dtype=np.float32)
        return Copy(points[0], points[1], points[0, :0, 0])


class Deformation:
    """Made for the mesh of an object as it is; another mesh needs another one."""

    def __init__(self, rig: Rig, thing: Any) -> None:
        """Refused, module.Missing, and the module's own errors, which name a file and the reason."""
        neuralwarp = module.find()
        self.rig = rig
        check_mesh(rig, thing)
        self.count = len(thing.data.vertices)
        self.model = neuralwarp.Model.load(str(rig.folder))
        self.scene = neuralwarp.Scene.open(str(rig.scene))
        original = self.scene.deformers()[0]["geometries"][0]["original"]
        rest = self.scene.points(original)
        self.deformer = neuralwarp.Deformer(self.model, self.scene.faces(original), rest)
        self._map_vertices(len(rest))
        self.joints = JointSetter(self.scene, rig.bones)
        self.notes = self._notes(thing, rest)
        self.controls: Optional[Points] = None  # of the last frame
        self._copies: Dict[Hashable, Copy] = {}
        self._flat = np.empty(3 * self.count, dtype=np.float32)
        self._weights: Optional[Points] = None
        self._group: Optional[str] = None

    def forget_mesh(self) -> None:
        """The original mesh has changed, with the same polygons: its vertex group may be another."""
        self._group = None
        self._copies.clear()

    def deform(self, thing: Any, evaluated: Any, armature: Any, graph: Hashable) -> None:
        """Writes the result into the mesh of the evaluated object. graph: which dependency graph that is of.
        Refused names what does not fit."""
        mesh = evaluated.data
        self._check_evaluated(thing, mesh)
        self.joints.set(evaluated, armature)
        controls = self.scene.controls()
        envelope, weights = evaluated.neuralwarp.envelope, self._vertex_weights(thing)
        settings = (envelope, self._group)
        copy = self._copies.get(graph)
        if copy is None:
            copy = self._copies[graph] = Copy.unseen(self.count)
        mesh.vertices.foreach_get("co", self._flat)
        points = self._flat.reshape(-1, 3)
        is_ours = np.array_equal(points, copy.result)
        if is_ours and copy.settings == settings and np.array_equal(controls, copy.controls):
            return
        if not is_ours:
            copy.points[:] = points
        self._evaluate(copy, controls, envelope, weights)
        mesh.vertices.foreach_set("co", copy.result.reshape(-1))
        mesh.update()
        if is_ours:  # Blender has not made this mesh anew, and may have drawn it
            mesh.update_gpu_tag()
        copy.controls, copy.settings, self.controls = controls, settings, controls

    def distance(self) -> Optional[float]:
        """How far outside of the trained ranges the last pose was; None where the model does not say."""
        if self.controls is None or self.model.ranges is None:
            return None
        return float(self.model.distance(self.controls))

    def _evaluate(self, copy: Copy, controls: Points, envelope: float, weights: Optional[Points]) -> None:
        if self._representatives is None:
            self.deformer.evaluate(copy.points, controls, out=copy.result, envelope=envelope, weights=weights)
            return
        if weights is not None:
            weights = weights[self._representatives]
        joined = self.deformer.evaluate(copy.points[self._representatives], controls, envelope=envelope,
                                        weights=weights)
        np.take(joined, self._joined, axis=0, out=copy.result)

    def _map_vertices(self, count: int) -> None:
        """Where the scene has joined vertices at one place: of each of its vertices one of the mesh's, and back."""
        self._representatives: Optional[NDArray[np.intp]] = None
        joined = self.scene.vertex_map()
        if joined is None and count == self.count:
            return
        if joined is None or len(joined) != self.count:
            raise Refused(f"the scene of {self.rig.folder.name} has a mesh of {count} vertices"
                          + (f", and a map of {len(joined)}" if joined is not None else "") + f", not {self.count}")
        self._joined = np.asarray(joined, dtype=np.intp)
        if count == self.count and np.array_equal(self._joined, np.arange(count)):
            return
        found, first = np.unique(self._joined, return_index=True)
        if len(found) != count or found[0] != 0 or found[-1] != count - 1:
            raise Refused(f"the vertex map of {self.rig.folder.name} leaves out vertices of its scene")
        self._representatives = first.astype(np.intp)

    def _check_evaluated(self, thing: Any, mesh: Any) -> None:
        if len(mesh.vertices) != self.count:
            raise Refused(f"the modifiers of {thing.name} make {len(mesh.vertices)} vertices of {self.count}: "
                          "what changes their number has to be off")
        if mesh.vertices[0].as_pointer() == thing.data.vertices[0].as_pointer():
            raise Refused(f"no modifier of {thing.name} is on: its Armature modifier is what a model builds on")

    def _vertex_weights(self, thing: Any) -> Optional[Points]:
        """[N] of the vertex group that was chosen; read once, until the mesh changes."""
        name = thing.neuralwarp.vertex_group
        if name != self._group:
            self._copies.clear()
            self._weights = None
            if name:
                group = thing.vertex_groups.get(name)
                if group is None:
                    raise Refused(f"{thing.name} has no vertex group {name}")
                self._weights = group_weights(thing, group.index)
            self._group = name
        return self._weights

    def _notes(self, thing: Any, rest: Points) -> str:
        """A sentence where the mesh at rest is not where it was at the training."""
        points = rest_points(thing)
        moved = points - (rest if self._representatives is None else rest[self._joined])
        length, diagonal = float(np.abs(moved).max()), float(np.linalg.norm(np.ptp(rest, axis=0)))
        if length <= SAME_REST * diagonal:
            return ""
        return f"{thing.name} was changed after the training: at rest vertices lie up to {length:.3g} elsewhere"


def check_mesh(rig: Rig, thing: Any) -> None:
    """Refused where the object has not the mesh of the training."""
    check_own_mesh(thing)
    mesh = thing.data
    if len(mesh.vertices) != rig.vertices:
        raise Refused(f"{rig.folder.name} is for a mesh of {rig.vertices} vertices, and {thing.name} has "
                      f"{len(mesh.vertices)}")
    if topology(mesh) != rig.topology:
        raise Refused(f"{rig.folder.name} is for a mesh of other polygons than {thing.name} has: vertices or faces "
                      "were made or put in another order after the training")


def rest_points(thing: Any) -> Points:
    """[N, 3], object space: of the basis where there are shape keys."""
    keys = thing.data.shape_keys
    vertices = keys.reference_key.data if keys else thing.data.vertices
    flat = np.empty(3 * len(vertices), dtype=np.float32)
    vertices.foreach_get("co", flat)
    return flat.reshape(-1, 3)


def group_weights(thing: Any, index: int) -> Points:
    weights = np.zeros(len(thing.data.vertices), dtype=np.float32)
    for vertex in thing.data.vertices:
        for group in vertex.groups:
            if group.group == index:
                weights[vertex.index] = group.weight
    return weights
