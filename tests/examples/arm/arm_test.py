# SPDX-License-Identifier: Apache-2.0
"""examples/arm: the shapes that its targets have, and the program that quarn run asks for them."""

import json
import subprocess
import sys
import tempfile
import unittest
from pathlib import Path

import numpy as np

EXAMPLE = Path(__file__).resolve().parents[3] / "examples/arm"
sys.path.insert(0, str(EXAMPLE))

from arm_shape import AROUND, JOINTS, arm_points, arm_triangles, arm_weights, volume  # noqa: E402
from muscles import Arm  # noqa: E402
from write_arm import texture_coordinates, with_seam  # noqa: E402

REST, TRIANGLES = arm_points(), arm_triangles()
LOSS = 0.0264  # of the volume, that the skin has at 90 degrees


def rotation(x: float, z: float) -> np.ndarray:
    """Of rows: about x, then about z, in degrees."""
    (c, d), (s, t) = np.cos(np.radians([x, z])), np.sin(np.radians([x, z]))
    return np.array([[1, 0, 0], [0, c, s], [0, -s, c]]) @ np.array([[d, t, 0], [-t, d, 0], [0, 0, 1]])


def skinned(elbow: float, twist: float = 0.0, wrist: float = 0.0) -> np.ndarray:
    at_elbow, at_wrist = ([JOINTS[name], 0.0, 0.0] for name in ("forearm", "hand"))
    turned = (REST - at_wrist) @ rotation(twist, wrist) + at_wrist
    moved = [REST, *((points - at_elbow) @ rotation(0.0, elbow) + at_elbow for points in (REST, turned))]
    return np.einsum("jvd,vj->vd", moved, arm_weights(REST))


def crossings(points: np.ndarray) -> int:
    """How many times an edge of the surface goes through a triangle that it shares no point with."""
    edges = np.unique(np.sort(TRIANGLES[:, [0, 1, 1, 2, 2, 0]].reshape(-1, 2)), axis=0)
    ends, corners = points[edges], points[TRIANGLES]
    low, high, least, most = ends.min(axis=1).T, ends.max(axis=1).T, corners.min(axis=1).T, corners.max(axis=1).T
    pairs = []
    for first in range(0, len(edges), 500):
        some = slice(first, first + 500)
        near = np.logical_and.reduce([test for k in range(3) for test in (
            low[k, some, None] <= most[k], high[k, some, None] >= least[k])])
        edge, triangle = np.nonzero(near)
        pairs.append((edge + first, triangle))
    edge, triangle = np.concatenate(pairs, axis=1)
    apart = (edges[edge][:, :, None] != TRIANGLES[triangle][:, None]).all(axis=(1, 2))
    (a, b), corner = ends[edge[apart]].swapaxes(0, 1), corners[triangle[apart]].swapaxes(0, 1)
    normals = np.cross(corner[1] - corner[0], corner[2] - corner[0])
    sides = [np.sum(normals * (end - corner[0]), axis=1) for end in (a, b)]
    turns = [np.sum(np.cross(corner[k] - a, corner[(k + 1) % 3] - a) * (b - a), axis=1) for k in range(3)]
    inside = (np.min(turns, axis=0) > 0.0) | (np.max(turns, axis=0) < 0.0)
    return int(np.count_nonzero(inside & (sides[0] * sides[1] < 0.0)))


class ArmTest(unittest.TestCase):
    def setUp(self) -> None:
        self.arm = Arm(REST, TRIANGLES)

    def test_volume_and_bulge(self) -> None:
        whole = volume(REST, TRIANGLES)
        for pose in [(0,), (45,), (90,), (120,), (90, 60, 40), (120, -60, -40), (0, 60, -40)]:
            with self.subTest(pose=pose):
                self.assertLess(abs(volume(self.arm.pose(skinned(*pose)), TRIANGLES) / whole - 1.0), 1e-4)
        bent = skinned(90)
        self.assertAlmostEqual(1.0 - volume(bent, TRIANGLES) / whole, LOSS, delta=0.0003)
        distances = np.linalg.norm(self.arm.pose(bent) - bent, axis=1)
        self.assertAlmostEqual(distances.max(), 0.030, delta=0.0005)
        self.assertEqual(self.arm.biceps[:, 1].argmax(), distances.argmax())
        self.assertLess(np.abs(self.arm.pose(REST) - REST).max(), 1e-9)
        self.assertLess(distances[REST[:, 0] < -0.06].max(), 0.001)

    def test_passes_through_nothing(self) -> None:
        self.assertGreater(crossings(skinned(120)), 0)
        for pose in [(100,), (120,), (120, 60, 40)]:
            self.assertEqual(crossings(self.arm.pose(skinned(*pose))), 0, pose)

    def test_no_popping(self) -> None:
        skins = [skinned(angle, angle / 2.0) for angle in np.arange(-2.0, 120.1, 2.0)]
        jerks = [np.linalg.norm(np.diff(frames, 2, axis=0), axis=2).max()
                 for frames in (skins, [self.arm.pose(skin) for skin in skins])]
        self.assertLess(jerks[1], 1.25 * jerks[0])

    def test_moves_with_the_skin(self) -> None:
        turn, place = rotation(30.0, 70.0), [0.3, -0.2, 0.1]
        bent = skinned(100, 40, 20)
        self.assertLess(np.abs(self.arm.pose(bent @ turn + place) - (self.arm.pose(bent) @ turn + place)).max(), 1e-9)

    def test_the_seam(self) -> None:
        """The file's triangles are the arm's, and none of them goes back through the whole texture."""
        of_vertex, corners = with_seam()
        self.assertTrue((of_vertex[corners] == TRIANGLES).all())
        around = texture_coordinates(of_vertex)[corners[AROUND:-AROUND], 1]
        self.assertLess(np.ptp(around, axis=1).max(), 1.5 / AROUND)
        self.assertEqual(np.bincount(corners.ravel()).min(), 2)

    def test_the_program(self) -> None:
        """Any frames, in any order, of vertices in any order, of which some are there twice; or a sentence."""
        of_vertex = np.random.default_rng(1).permutation(with_seam()[0])
        skins = np.array([skinned(angle) for angle in (10, 60, 110)], dtype="<f4")
        request = {"version": 1, "frames": [7, 5], "write": "made.npy",
                   "skin": {"file": "skin.npy", "rest": "rest.npy", "firstFrame": 5}}
        with tempfile.TemporaryDirectory() as folder:
            def run(rest: np.ndarray) -> str:
                np.save(f"{folder}/rest.npy", rest[None, of_vertex].astype("<f4"))
                np.save(f"{folder}/skin.npy", skins[:, of_vertex])
                Path(folder, "request.json").write_text(json.dumps(request), encoding="utf-8")
                return subprocess.run([sys.executable, EXAMPLE / "arm_targets.py", "request.json"], cwd=folder,
                                      text=True, capture_output=True, check=False).stderr

            self.assertEqual(run(REST), "")
            made = np.load(f"{folder}/made.npy")
            for shape, frame in zip(made, (2, 0)):
                self.assertLess(np.abs(shape - self.arm.pose(skins[frame].astype(float))[of_vertex]).max(), 1e-6)
            self.assertRegex(run(100.0 * REST), "^arm_targets.py: the mesh is not the one of write_arm.py")


if __name__ == "__main__":
    unittest.main()
