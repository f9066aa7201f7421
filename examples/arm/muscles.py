# SPDX-License-Identifier: Apache-2.0
"""What the arm looks like in a pose: it bends without collapsing, the biceps bunches, upper arm and forearm press each
other flat where they meet, and the volume stays what it is at rest.

Source: [SBS] L. Kavan, J. Zara: Spherical Blend Skinning: A Real-time Deformation of Articulated Models. Symposium on
Interactive 3D Graphics and Games 2005. Here the centre of rotation is the joint.

Vectors are rows, a rotation R turns p into p R.
"""

import numpy as np
from arm_shape import JOINTS, arm_weights, bump, share, volume

BULGE = 0.0352  # how far the biceps comes out, at most; 30 mm of it at 90 degrees
OLECRANON = 0.008  # and the point of the elbow
# upper arm and forearm keep GAP off the plane between them, and give way from SOFT on; both grow from nothing at the
# elbow, where the two are one, and are whole at a distance of some NEAR
GAP, SOFT, NEAR = 0.002, 0.012, 0.04
VOLUME_STEPS = 2  # each leaves a hundredth of the error


class Arm:
    """The arm at rest; pose() then takes one skin after the other."""

    def __init__(self, rest: np.ndarray, triangles: np.ndarray) -> None:
        """rest: [V, 3], points of the arm in any order; triangles: [T, 3], closed, turned outwards."""
        x, y, z = rest.T
        self.rest, self.triangles = rest, triangles
        self.held = (arm_weights(rest) > 1.0 - 1e-6).T  # by one joint alone
        self.forearm, self.hand = share(x, "forearm"), share(x, "hand")
        outwards = np.stack([0.0 * x, y, z], axis=1) / np.maximum(np.hypot(y, z), 1e-9)[:, None]
        above, below = (bump(np.arctan2(z, sign * y), 0.0, 0.95) for sign in (1.0, -1.0))
        self.biceps = (bump(x, 0.13, 0.06) * above)[:, None] * (outwards + [0.0, 1.0, 0.0]) / 2.0
        self.olecranon = (bump(x, JOINTS["forearm"], 0.03) * below)[:, None] * outwards
        self.flesh = (bump(x, 0.17, 0.11) * (1.0 - above))[:, None] * outwards
        self.volume = volume(rest, triangles)
        self.volume_of_flesh = (volume(rest + 0.001 * self.flesh, triangles) - self.volume) / 0.001

    def pose(self, skin: np.ndarray) -> np.ndarray:
        """skin: [V, 3], the linearly skinned arm, from which the pose is read. Returns [V, 3]."""
        (upper, place), (forearm, _), (hand, _) = (rigid_motion(self.rest[held], skin[held]) for held in self.held)
        elbow, wrist = rotation_vector(forearm @ upper.T), rotation_vector(hand @ forearm.T)
        flexed = np.sin(0.75 * max(elbow[2], 0.0)) ** 2
        muscles = self.rest + flexed * (BULGE * self.biceps + OLECRANON * self.olecranon)
        flesh = 0.0
        for _ in range(VOLUME_STEPS):  # the chord method
            bent = self._bend(muscles + flesh * self.flesh, elbow, wrist)
            flesh += (self.volume - volume(bent, self.triangles)) / self.volume_of_flesh
        return self._bend(muscles + flesh * self.flesh, elbow, wrist) @ upper + place

    def _bend(self, points: np.ndarray, elbow: np.ndarray, wrist: np.ndarray) -> np.ndarray:
        at_elbow, at_wrist = ([JOINTS[joint], 0.0, 0.0] for joint in ("forearm", "hand"))
        points = turn(points - at_wrist, self.hand[:, None] * wrist) + at_wrist
        # as seen from the plane that halves the elbow's angle: upper arm on one side, forearm on the other
        halved = turn(points - at_elbow, (self.forearm[:, None] - 0.5) * elbow)
        along = self.rest[:, 0] - JOINTS["forearm"]
        near = np.tanh(np.abs(along) / NEAR)
        halved[:, 0] = np.sign(along) * soft_maximum(np.sign(along) * halved[:, 0], GAP * near, SOFT * near)
        return turn(halved, 0.5 * elbow) + at_elbow


def soft_maximum(first: np.ndarray, second: np.ndarray, width: np.ndarray) -> np.ndarray:
    """Without an edge where both are nearly the same; the larger one itself where they are `width` apart."""
    both = np.maximum(width - np.abs(first - second), 0.0)
    return np.maximum(first, second) + both * both / np.maximum(4.0 * width, 1e-12)


def rigid_motion(before: np.ndarray, after: np.ndarray) -> tuple[np.ndarray, np.ndarray]:
    """R and t with before R + t nearest to after; both are [N, 3]."""
    middle, there = before.mean(axis=0), after.mean(axis=0)
    left, _, right = np.linalg.svd((before - middle).T @ (after - there))
    left[:, 2] *= np.sign(np.linalg.det(left @ right))
    rotation = left @ right
    return rotation, there - middle @ rotation


def rotation_vector(rotation: np.ndarray) -> np.ndarray:
    """Axis times angle, of less than half a turn."""
    twice_sine = np.array([rotation[1, 2] - rotation[2, 1], rotation[2, 0] - rotation[0, 2],
                           rotation[0, 1] - rotation[1, 0]])
    sine = np.linalg.norm(twice_sine) / 2.0
    angle = np.arctan2(sine, (np.trace(rotation) - 1.0) / 2.0)
    return twice_sine / 2.0 * (angle / sine if sine > 1e-9 else 1.0)


def turn(points: np.ndarray, vectors: np.ndarray) -> np.ndarray:
    """Each point by its rotation vector, or all by one (the formula of Rodrigues)."""
    angles = np.linalg.norm(vectors, axis=-1, keepdims=True)
    axes = vectors / np.maximum(angles, 1e-12)
    along = np.sum(axes * points, axis=-1, keepdims=True)
    return (points * np.cos(angles) + np.cross(axes, points) * np.sin(angles)
            + axes * along * (1.0 - np.cos(angles)))
