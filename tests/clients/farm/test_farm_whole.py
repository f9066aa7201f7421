# SPDX-License-Identifier: Apache-2.0
"""What quarn makes in parts has the bytes of what it makes at once, in whatever order, and whatever was killed."""

import filecmp
import json
import math
import os
import signal
import subprocess
import tempfile
import unittest
from array import array
from pathlib import Path

from site_of_a_farm import FarmTest

ROOT = Path(__file__).resolve().parents[3]
QUARN = os.environ.get("NW_TEST_QUARN", str(ROOT / "build" / "release" / "quarn" / "quarn"))
LONG = "1-30000"  # frames that take long enough to be killed in between
PARTS = ("part-0003", "part-0001", "part-0002")


def quarn(*words: str, folder: Path) -> None:
    done = subprocess.run([QUARN, *words], cwd=folder, capture_output=True, text=True, check=False)
    if done.returncode:
        raise AssertionError(f"quarn {' '.join(words)}: {done.stderr}")


def make_scene(folder: Path) -> None:
    """scene.json: a triangle that a joint turns, with a target for each of the frames."""
    (folder / "bone.gltf").write_bytes((ROOT / "tests/fuzz/corpus/fuzz_gltf/accepted_text").read_bytes())
    quarn("import", "bone.gltf", "--neural-warp", "--with-roots", "-o", "character.json", folder=folder)
    quarn("pose", "character.json", "--samples", "100", "-o", "poses.json", folder=folder)
    quarn("bake", "poses.json", "mesh_skin.outputGeom[0]", "--frames", LONG, "-o", "target.npy", folder=folder)
    content = (folder / "target.npy").read_bytes()
    points = array("f", content[128:])
    points = array("f", [value + 0.01 * math.sin(number) for number, value in enumerate(points)])
    (folder / "target.npy").write_bytes(content[:128] + points.tobytes())
    quarn("target", "poses.json", "--cache", "target.npy", "-o", "scene.json", folder=folder)


@unittest.skipUnless(os.access(QUARN, os.X_OK), f"there is no {QUARN}")
class WholeTest(FarmTest):
    work: Path

    @classmethod
    def setUpClass(cls) -> None:
        place = tempfile.TemporaryDirectory()
        cls.addClassCleanup(place.cleanup)
        cls.work = Path(place.name).resolve()
        make_scene(cls.work)

    def setUp(self) -> None:
        super().setUp()
        self.folder = self.place / "plan"

    def plan_of(self, kind: str, *words: str) -> None:
        self.farm("plan", kind, self.work / "scene.json", *words, "-o", self.folder, "--quarn", QUARN)

    def test_a_data_set_of_parts_of_which_one_was_killed(self) -> None:
        self.plan_of("export", "--frames", LONG, "--parts", "3", "--result", str(self.place / "set"))
        part = self.folder / "parts/0002.part"
        first = self.start("task", self.folder, "part-0002")
        self.wait_until(lambda: part.exists() and any(file.stat().st_size > 100_000 for file in part.iterdir()))
        child = int(Path(f"/proc/{first.pid}/task/{first.pid}/children").read_text())
        os.kill(child, signal.SIGKILL)
        first.communicate(timeout=60)
        self.assertEqual(first.returncode, 128 + signal.SIGKILL)
        self.assertIn("part-0002: failed: ended with 137", self.farm("status", self.folder, code=1))
        for identifier in PARTS:
            self.farm("task", self.folder, identifier)
        self.farm("merge", self.folder)
        self.farm("status", self.folder)
        quarn("export", "scene.json", "--frames", LONG, "-o", str(self.place / "one"), folder=self.work)
        self.assert_same(self.place / "set", self.place / "one")

    def assert_same(self, one: Path, other: Path) -> None:
        names = sorted(path.name for path in other.iterdir())
        self.assertEqual(sorted(path.name for path in one.iterdir()), names)
        self.assertGreater(len(names), 4)
        self.assertEqual(filecmp.cmpfiles(one, other, names, shallow=False), (names, [], []))

    def test_a_cache_of_parts(self) -> None:
        self.plan_of("bake", "warp.outputGeom[0]", "--frames", "1-100x3", "--parts", "3", "--preroll", "2")
        for identifier in PARTS:
            self.farm("task", self.folder, identifier)
        self.farm("merge", self.folder)
        quarn("bake", "scene.json", "warp.outputGeom[0]", "--frames", "1-100x3", "-o", str(self.place / "one.npy"),
              folder=self.work)
        self.assertTrue(filecmp.cmp(self.folder / "result.npy", self.place / "one.npy", shallow=False))

    def test_files_that_are_there_stay(self) -> None:
        self.plan_of("play", "--frames", "1-9", "--parts", "3", "--result", str(self.place / "shots/h.##.obj"))
        for identifier in PARTS:
            self.farm("task", self.folder, identifier)
        self.farm("status", self.folder)
        shots = sorted((self.place / "shots").iterdir())
        self.assertEqual([shot.name for shot in shots], [f"h.0{frame}.obj" for frame in range(1, 10)])
        times = [shot.stat().st_ctime_ns for shot in shots]
        shots[4].unlink()
        self.assertIn("part-0002: begun", self.farm("status", self.folder, code=3))
        self.farm("task", self.folder, "part-0002")
        self.assertEqual([shot.stat().st_ctime_ns == time for shot, time in zip(shots, times)],
                         [number != 4 for number in range(9)])
        self.assertIn("nothing to merge", self.farm("merge", self.folder, code=1))

    def test_pictures_of_parts_are_those_of_one_film(self) -> None:
        """The camera stands where it sees the motion of all frames, whatever a part has of it."""
        self.plan_of("render", "--frames", "1-9x2", "--parts", "3", "--result", str(self.place / "film/h.##.png"),
                     "--pass", "size=48x36")
        for identifier in PARTS:
            self.farm("task", self.folder, identifier)
        self.farm("status", self.folder)
        quarn("render", "scene.json", "--frames", "1-9x2", "--size", "48x36", "-o",
              str(self.place / "one/h.##.png"), folder=self.work)
        self.assert_same(self.place / "film", self.place / "one")

    def test_a_plan_by_the_time_of_its_first_frames(self) -> None:
        words = ("--frames", LONG, "--minutes", "0.02")
        self.plan_of("export", *words)
        made = json.loads((self.folder / "plan.json").read_text())
        self.assertGreater(made["secondsAFrame"], 0)
        self.assertGreater(made["tasks"][0]["resources"]["minutes"], 0)
        files = {os.path.basename(file["path"]) for file in made["files"]}
        self.assertLessEqual({"scene.json", "target.npy"}, files)
        self.plan_of("export", *words)
        self.assertEqual(json.loads((self.folder / "plan.json").read_text()), made)


if __name__ == "__main__":
    unittest.main()
