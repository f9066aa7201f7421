# SPDX-License-Identifier: Apache-2.0
"""The arm at rest: stretched along x, the inside of the elbow up (y), in metres; the joints lie on the x axis.

Shape and skin weights are functions of the place alone, so that every copy of the mesh agrees on them, whatever the
order of its vertices. Vectors are rows: [V, 3] is an array of V of them.
"""

import numpy as np

JOINTS = {"upperArm": 0.0, "forearm": 0.27, "hand": 0.49}  # and where along x; each hangs below the one before
BLENDS = {"forearm": (0.19, 0.35), "hand": (0.43, 0.53)}  # where a joint's weight rises from 0 to 1
FIRST, LAST = -0.09, 0.625
FIRST_CAP, LAST_CAP = 0.08, 0.05  # over how much of its length an end is rounded

RINGS, AROUND = 92, 40


def bump(x: np.ndarray, middle: float, width: float) -> np.ndarray:
    return np.exp(-((x - middle) / width) ** 2)


def extents(x: np.ndarray) -> tuple[np.ndarray, np.ndarray, np.ndarray]:
    """Half the height upwards and downwards, and half the width, at places along the arm."""
    wrist = JOINTS["hand"]
    taper = 0.058 - 0.030 * np.clip((x - FIRST) / (wrist - FIRST), 0.0, 1.0)
    shoulder, elbow, fist = bump(x, -0.02, 0.08), bump(x, JOINTS["forearm"], 0.04), bump(x, 0.575, 0.05)
    biceps, triceps, forearm = bump(x, 0.14, 0.07), bump(x, 0.12, 0.08), bump(x, 0.345, 0.06)
    up = taper + 0.008 * shoulder + 0.012 * biceps + 0.013 * forearm + 0.012 * fist
    down = taper + 0.012 * shoulder + 0.012 * triceps + 0.007 * elbow + 0.010 * forearm + 0.010 * fist
    side = taper + 0.014 * shoulder + 0.004 * biceps + 0.006 * elbow + 0.019 * forearm + 0.022 * fist
    rounded = round_end((x - FIRST) / FIRST_CAP, 2.0) * round_end((LAST - x) / LAST_CAP, 2.6)
    return up * rounded, down * rounded, side * rounded


def round_end(t: np.ndarray, power: float) -> np.ndarray:
    """0 at t = 0, 1 from t = 1 on, a superellipse between."""
    return (1.0 - (1.0 - np.clip(t, 0.0, 1.0)) ** power) ** (1.0 / power)


def ring_places() -> np.ndarray:
    """Of the rings along x, without the two poles: as far apart along the outline everywhere, ends included; nearer to
    each other at the elbow, whose outside is stretched."""
    fine = np.linspace(FIRST, LAST, 20001)
    outline = np.hypot(np.diff(fine), np.diff(extents(fine)[1]))
    way = np.concatenate([[0.0], np.cumsum(outline * (1.0 + bump(fine[1:], JOINTS["forearm"], 0.06)))])
    return np.interp(np.linspace(0.0, way[-1], RINGS + 2)[1:-1], way, fine)


def ring_points() -> np.ndarray:
    """[RINGS, AROUND, 3]; a ring begins below."""
    x = ring_places()[:, None]
    up, down, side = extents(x)
    turn = 2.0 * np.pi * np.arange(AROUND) / AROUND
    y, z = -np.cos(turn), np.sin(turn)
    rise = smooth_step((1.0 + y) / 2.0)  # from below to above, without an edge
    thumb = 0.016 * bump(x, 0.55, 0.026) * bump(np.arctan2(y - 0.6, z), 0.0, 0.6)
    return np.stack([x + 0.0 * y, (down + (up - down) * rise) * y + 0.4 * thumb, side * z + thumb], axis=2)


def arm_points() -> np.ndarray:
    """[2 + RINGS * AROUND, 3]: the pole of the shoulder, the rings, the tip."""
    return np.concatenate([[[FIRST, 0.0, 0.0]], ring_points().reshape(-1, 3), [[LAST, 0.0, 0.0]]])


def arm_triangles() -> np.ndarray:
    """[T, 3], indices of arm_points(); they turn the same way around, outwards."""
    turn = np.arange(AROUND)
    after = (turn + 1) % AROUND
    starts = 1 + AROUND * np.arange(RINGS - 1)[:, None]
    near, behind = (starts + turn).ravel(), (starts + after).ravel()
    tip = 1 + RINGS * AROUND
    fans = [(0 * turn, 1 + turn, 1 + after), (0 * turn + tip, tip - AROUND + after, tip - AROUND + turn)]
    quads = [(near, near + AROUND, behind + AROUND), (near, behind + AROUND, behind)]
    return np.concatenate([np.stack(corners, axis=1) for corners in (fans[0], *quads, fans[1])])


def smooth_step(t: np.ndarray) -> np.ndarray:
    t = np.clip(t, 0.0, 1.0)
    return t * t * (3.0 - 2.0 * t)


def share(x: np.ndarray, joint: str) -> np.ndarray:
    """By how much a place along the arm goes with the joint: 0 before its blend, 1 behind it."""
    first, last = BLENDS[joint]
    return smooth_step((x - first) / (last - first))


def arm_weights(rest: np.ndarray) -> np.ndarray:
    """Of points at rest, [V, 3]: [V, joints], rows that add up to 1. No more than two joints hold a point."""
    forearm, hand = share(rest[:, 0], "forearm"), share(rest[:, 0], "hand")
    return np.stack([1.0 - forearm, forearm - hand, hand], axis=1)


def volume(points: np.ndarray, triangles: np.ndarray) -> np.ndarray:
    """Of closed surfaces [..., V, 3]: by the divergence theorem, a sixth of the sum of the triangles' determinants."""
    first, second, third = (points[..., triangles[:, k], :] for k in range(3))
    return np.einsum("...td,...td->...", first, np.cross(second, third)) / 6.0
