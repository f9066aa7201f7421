# SPDX-License-Identifier: Apache-2.0
"""examples/hand/targets.py on a tube that bends in the middle."""

import json
import subprocess
import sys
import tempfile
import unittest
from pathlib import Path
from typing import Any, Callable, Union

import numpy as np

SCRIPT = Path(__file__).resolve().parents[3] / "examples/hand/targets.py"
RINGS, AROUND, LENGTH, RADIUS = 25, 12, 4.0, 0.5
ANGLES = np.radians(100.0) * np.sin(np.linspace(0.0, np.pi / 2.0, 41)) ** 2  # frame 0 is the rest pose


def tube() -> tuple[np.ndarray, list[list[int]], np.ndarray]:
    """Points and polygons of a closed tube along x, and each vertex's weight at the second of two joints."""
    x, turn = np.meshgrid(np.linspace(0.0, LENGTH, RINGS), np.arange(AROUND) * 2.0 * np.pi / AROUND, indexing="ij")
    points = np.stack([x, RADIUS * np.cos(turn), RADIUS * np.sin(turn)], axis=2).reshape(-1, 3)
    quads = [[r * AROUND + a, r * AROUND + (a + 1) % AROUND, (r + 1) * AROUND + (a + 1) % AROUND, (r + 1) * AROUND + a]
             for r in range(RINGS - 1) for a in range(AROUND)]
    caps = [list(range(AROUND))[::-1], list(range((RINGS - 1) * AROUND, RINGS * AROUND))]
    return points, quads + caps, np.clip((points[:, 0] - 1.6) / 0.8, 0.0, 1.0)


POINTS, POLYGONS, SECOND = tube()


def skinned(angle: float) -> np.ndarray:
    c, s = np.cos(angle), np.sin(angle)
    pivot = np.array([LENGTH / 2.0, 0.0, 0.0])
    bent = (POINTS - pivot) @ np.array([[c, s, 0.0], [-s, c, 0.0], [0.0, 0.0, 1.0]]) + pivot
    return POINTS + SECOND[:, None] * (bent - POINTS)


def scene() -> Any:
    influences = [[0] if w == 0.0 else [1] if w == 1.0 else [0, 1] for w in SECOND]
    weights = [[1.0] if w in (0.0, 1.0) else [1.0 - w, w] for w in SECOND]
    mesh = {"points": POINTS.ravel().tolist(), "counts": [len(p) for p in POLYGONS], "corners": sum(POLYGONS, [])}
    skin: dict[str, list] = {
        "skin[0].influenceCounts": [len(i) for i in influences], "skin[0].influences": sum(influences, []),
        "skin[0].skinWeights": sum(weights, [])}
    return {"openquarnScene": 1, "nodes": [{"name": "tube", "type": "mesh", "values": {"inMesh": mesh}},
                                           {"name": "tube_skin", "type": "skinCluster", "values": skin}],
            "connections": [["tube.outMesh", "tube_skin.input[0].inputGeometry"]]}


def volume(points: np.ndarray) -> float:
    corners = np.array([(p[0], p[k], p[k + 1]) for p in POLYGONS for k in range(1, len(p) - 1)])
    return np.einsum("td,td->", points[corners[:, 0]], np.cross(points[corners[:, 1]], points[corners[:, 2]])) / 6.0


def largest_jerk(points: np.ndarray) -> float:
    return np.linalg.norm(points[2:] - 2.0 * points[1:-1] + points[:-2], axis=2).max()


class TargetsTest(unittest.TestCase):
    def setUp(self) -> None:
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = Path(folder.name)
        (self.folder / "scene.json").write_text(json.dumps(scene()))

    def run_script(self, skin: Union[np.ndarray, bytes], *more: str, status: int = 0) -> Any:
        """The targets, and what was written to standard error; `skin` an array or what else to put into the file."""
        if isinstance(skin, np.ndarray):
            np.save(self.folder / "skin.npy", skin)
        else:
            (self.folder / "skin.npy").write_bytes(skin)
        done = subprocess.run([sys.executable, SCRIPT, "scene.json", "skin.npy", "-o", "targets.npy", "--quiet", *more],
                              cwd=self.folder, capture_output=True, text=True, check=False)
        self.assertEqual(done.returncode, status, done.stderr)
        self.assertEqual(done.stdout, "")
        return np.load(self.folder / "targets.npy") if status == 0 else done.stderr

    def test_a_bend(self) -> None:
        skin = np.array([skinned(angle) for angle in ANGLES], dtype="<f4")
        targets = self.run_script(skin, "--jobs", "1")
        self.assertEqual((targets.shape, targets.dtype.str), (skin.shape, "<f4"))
        with self.subTest("rest stays rest"):
            self.assertLess(np.abs(targets[0] - skin[0]).max(), 1e-6)
        with self.subTest("volume comes back, and hardly more than was lost"):
            for angle, before, after in list(zip(ANGLES, skin, targets))[15:]:
                self.assertGreater(volume(after), volume(before) + 0.2 * (volume(POINTS) - volume(before)), angle)
                self.assertLess(volume(after), 1.01 * volume(POINTS), angle)
        with self.subTest("what is rigid stays with the skin"):
            ends = (POINTS[:, 0] < 0.5) | (POINTS[:, 0] > LENGTH - 0.5)
            self.assertLess(np.abs(targets - skin)[:, ends].max(), 0.05 * RADIUS)
        with self.subTest("no popping"):
            self.assertLess(largest_jerk(targets), 1.25 * largest_jerk(skin))
        with self.subTest("the same bytes from two processes"):
            self.assertEqual(self.run_script(skin, "--jobs", "2").tobytes(), targets.tobytes())

    def test_moves_with_the_skin(self) -> None:
        turn = np.array([[0.0, 1.0, 0.0], [0.0, 0.0, 1.0], [1.0, 0.0, 0.0]])
        bent = skinned(1.2)
        there, moved = self.run_script(np.array([bent, bent @ turn + [3.0, -2.0, 1.0]], dtype="<f4"))
        self.assertLess(np.abs(there @ turn + [3.0, -2.0, 1.0] - moved).max(), 2e-5)

    def test_refuses(self) -> None:
        rest = POINTS[None].astype("<f4")
        spoiled = np.repeat(rest, 3, axis=0)
        spoiled[2, 7, 1] = np.nan
        rows: list[tuple[str, Union[np.ndarray, bytes], list[str], str]] = [
                ("other mesh", rest[:, 1:], [], "skin.npy: has 299 vertices, but mesh 'tube' has 300"),
                ("one frame, no axis", rest[0], [], "not \\[frames, vertices, 3\\]"),
                ("doubles", POINTS[None], [], "of <f8, not"),
                ("no frames", rest[:0], [], "no frames"),
                ("not finite", spoiled, [], "skin.npy: frame 2 .* not finite"),
                ("no array", b"points", [], "skin.npy: not a NumPy array"),
                ("no such mesh", rest, ["--mesh", "box"], "no skinned mesh 'box'; it has tube"),
                ("no such folder", rest, ["-o", "none/targets.npy"], "none: there is no such folder")]
        for name, skin, more, expected in rows:
            with self.subTest(name):
                error = self.run_script(skin, *more, status=1)
                self.assertRegex(error, f"^targets.py: .*{expected}.*\n$")
                self.assertEqual(sorted(p.name for p in self.folder.iterdir()), ["scene.json", "skin.npy"])

    def test_refuses_scenes(self) -> None:
        rest = POINTS[None].astype("<f4")

        def changed(change: Callable[..., object]) -> str:
            other = scene()
            mesh, skin = other["nodes"]
            change(other, mesh["values"]["inMesh"], skin["values"])
            return json.dumps(other)

        for name, text, expected in [
                ("cut short", json.dumps(scene())[:-9], "not JSON"),
                ("a list", "[]", "not a scene"),
                ("not skinned", changed(lambda s, mesh, skin: s["connections"].clear()), "no mesh node is connected"),
                ("no weights", changed(lambda s, mesh, skin: s["nodes"][1].pop("values")), "not a scene .*values"),
                ("too few weights", changed(lambda s, mesh, skin: skin["skin[0].skinWeights"].pop()), "does not fit"),
                ("corner", changed(lambda s, mesh, skin: mesh["corners"].append(999)), "polygons"),
                ("influence", changed(lambda s, mesh, skin: skin["skin[0].influences"].__setitem__(3, -1)), "scene")]:
            with self.subTest(name):
                (self.folder / "scene.json").write_text(text)
                self.assertRegex(self.run_script(rest, status=1), f"^targets.py: .*{expected}.*\n$")
        (self.folder / "scene.json").unlink()
        self.assertRegex(self.run_script(rest, status=1), "scene.json: No such file")


if __name__ == "__main__":
    unittest.main()
