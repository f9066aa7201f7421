# SPDX-License-Identifier: Apache-2.0
"""The joints of a scene, set from an armature's evaluated pose: constraints and drivers count.

Matrices here are of row vectors, as the scene has them: p' = p * M. A joint's matrix is S * R * JO * T, with S and R
the identity at rest (Shear, which a pose may have by constraints, a joint has not: it is left out).
"""

from typing import Any, List, Sequence, Tuple

import numpy as np
from numpy.typing import NDArray

from .character import to_mesh
from .refused import Refused

Array = NDArray[np.float64]

# row and column one and two further on, around a matrix of 3 x 3
ONE_ON, TWO_ON = (np.ix_(turn, turn) for turn in ((1, 2, 0), (2, 0, 1)))
KINDS = ("translate", "rotate", "scale")
ATTRIBUTES = [kind + axis for kind in KINDS for axis in "XYZ"]


class JointSetter:
    """Sets the joints that bones stand for; all others stay at rest."""

    def __init__(self, scene: Any, bones: Sequence[Tuple[str, str]]) -> None:
        """scene: neuralwarp.Scene. bones: the name of a bone and of its joint."""
        joints = {joint["name"]: (number, joint) for number, joint in enumerate(scene.joints())}
        for bone, name in bones:
            if name not in joints:
                raise Refused(f"the scene of the model has no joint {name}, which the bone {bone} is to set")
        chosen = [joints[name] for _, name in bones]
        self.bones = [bone for bone, _ in bones]
        self._numbers = np.array([number for number, _ in chosen], dtype=np.intp)
        self._parents = np.array([joint["parent"] for _, joint in chosen], dtype=np.intp)
        self._orders = [joint["rotateOrder"] for _, joint in chosen]
        # one more for joints without a parent: the last, which -1 is
        worlds = [np.asarray(scene.get(f"{name}.worldMatrix")).reshape(4, 4) for name in joints]
        self._worlds = np.stack([*worlds, np.eye(4)])
        rest = np.stack([np.asarray(scene.get(f"{name}.restMatrix")).reshape(4, 4) for _, name in bones])
        self._unoriented = unoriented(rest)
        self._plugs = scene.plugs([f"{name}.{attribute}" for _, name in bones for attribute in ATTRIBUTES])
        self._values = np.empty((len(bones), 3, 3))  # translate, rotate, scale
        self._places: Any = None  # of mesh and armature, of the last frame
        self._to_mesh = np.eye(4)
        self._names: List[str] = []  # of all bones of the armature, as they were found
        self._matrices = np.empty(0, dtype=np.float32)
        self._rows = np.empty(0, dtype=np.intp)

    def set(self, thing: Any, armature: Any) -> None:
        """thing, armature: the evaluated objects. Refused where a bone is missing."""
        bones = armature.pose.bones
        if len(bones) != len(self._names) or bones.keys() != self._names:
            self.find_bones(armature)
        bones.foreach_get("matrix", self._matrices)  # column by column, which is a row vector's matrix row by row
        places = (thing.matrix_world.copy(), armature.matrix_world.copy())
        if places != self._places:  # to read one takes as long as all bones together
            self._places, self._to_mesh = places, to_mesh(thing, armature).T
        self._worlds[self._numbers] = self._matrices.reshape(-1, 4, 4)[self._rows] @ self._to_mesh
        local = self._worlds[self._numbers] @ inverses(self._worlds[self._parents])
        joint_values(local, self._unoriented, self._orders, self._values)
        self._plugs.set(self._values.ravel())

    def find_bones(self, armature: Any) -> None:
        """Refused where the armature lacks one."""
        names = armature.pose.bones.keys()
        missing = [bone for bone in self.bones if bone not in names]
        if missing:
            raise Refused(f"{armature.name} has no bone {missing[0]}, which the model was made with"
                          + (f", nor {len(missing) - 1} more" if len(missing) > 1 else ""))
        self._rows = np.array([names.index(bone) for bone in self.bones], dtype=np.intp)
        self._matrices = np.empty(16 * len(names), dtype=np.float32)
        self._names = names


def unoriented(rest: Array) -> Array:
    """[J, 3, 3]: the inverses of JO, of joints whose matrices at rest are these, [J, 4, 4]."""
    return split(rest)[1].transpose(0, 2, 1)


def joint_values(local: Array, unorient: Array, orders: Sequence[str], values: Array) -> None:
    """Of joints with these matrices, [J, 4, 4], translate, rotate and scale: values, [J, 3, 3]. unorient: as
    unoriented() gives it."""
    scale, rotation = split(local)
    values[:, 0] = local[:, 3, :3]
    values[:, 1] = angles(rotation @ unorient, orders)
    values[:, 2] = scale


def cofactors(axes: Array) -> Array:
    """Of [J, 3, 3]: the cross products of the two other rows, in turn. (np.cross takes four times as long.)"""
    (row, column), (next_row, next_column) = ONE_ON, TWO_ON
    return axes[:, row, column] * axes[:, next_row, next_column] - axes[:, row, next_column] * axes[:, next_row, column]


def inverses(matrices: Array) -> Array:
    """Of [J, 4, 4] that move, turn, scale and shear. (That of NumPy asks threads of a BLAS for each of them.)"""
    axes, result = matrices[:, :3, :3], np.zeros_like(matrices)
    around = cofactors(axes)
    determinants = np.einsum("jk,jk->j", axes[:, 0], around[:, 0])
    result[:, :3, :3] = around.transpose(0, 2, 1) / determinants[:, None, None]
    result[:, 3, :3] = -np.einsum("jk,jkl->jl", matrices[:, 3, :3], result[:, :3, :3])
    result[:, 3, 3] = 1.0
    return result


def split(matrices: Array) -> Tuple[Array, Array]:
    """Of [J, 4, 4] the scales, [J, 3], and the rotations, [J, 3, 3]: S * R. A mirrored one has its x scaled by less
    than 0."""
    axes = matrices[:, :3, :3]
    scale = np.sqrt(np.einsum("jkl,jkl->jk", axes, axes))
    scale[np.einsum("jk,jk->j", axes[:, 0], cofactors(axes)[:, 0]) < 0.0, 0] *= -1.0
    return scale, axes / np.where(scale == 0.0, 1.0, scale)[:, :, None]


def angles(rotations: Array, orders: Sequence[str]) -> Array:
    """[J, 3] in radians, x, y, z: of rotations [J, 3, 3] that turn about the axes in these orders ("xyz": x first).
    The middle angle lies between -90 and 90 degrees."""
    result = np.empty((len(rotations), 3))
    for order in set(orders):
        rows = np.array([number for number, other in enumerate(orders) if other == order], dtype=np.intp)
        first, middle, last = ("xyz".index(axis) for axis in order)
        sign = 1.0 if order in ("xyz", "yzx", "zxy") else -1.0
        m = rotations[rows]
        cosine = np.hypot(m[:, first, first], m[:, first, middle])
        # where the middle angle is a right one, the last axis lies on the first: all of the turn is the first's
        locked = cosine < 1e-9
        result[rows, first] = np.where(locked, np.arctan2(-sign * m[:, last, middle], m[:, middle, middle]),
                                       np.arctan2(sign * m[:, middle, last], m[:, last, last]))
        result[rows, middle] = np.arctan2(-sign * m[:, first, last], cosine)
        result[rows, last] = np.where(locked, 0.0, np.arctan2(sign * m[:, first, middle], m[:, first, first]))
    return result
