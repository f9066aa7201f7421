# SPDX-License-Identifier: Apache-2.0
"""Plans: what is written and read, what of others is refused, and how frames are cut."""

import copy
import json
import os
import resource
import unittest
from dataclasses import replace
from pathlib import Path
from typing import Any, Callable, Union

from neuralwarp_farm import parts, plan
from neuralwarp_farm.errors import FarmError, UsageError
from neuralwarp_farm.facts import Timing
from neuralwarp_farm.kinds.frames import frame_file
from neuralwarp_farm.parts import Frames
from neuralwarp_farm.plan import Result
from site_of_a_farm import FarmTest

Change = Callable[[dict[str, Any]], object]

# what is done to a good plan, and what the refusal names
HOSTILE: list[tuple[Change, str]] = [
    (lambda p: p.update(format="neuralWarp part"), "format is 'neuralWarp part'"),
    (lambda p: p.update(version=2), "version 2, and this program reads 1"),
    (lambda p: p.update(version=True), "version is True"),
    (lambda p: p.update(name="../hand"), "name is '../hand'"),
    (lambda p: p.update(surprise=1), "'surprise' is no entry"),
    (lambda p: p.pop("tasks"), "tasks is missing"),
    (lambda p: p.update(tasks=[]), "no tasks"),
    (lambda p: p.update(tasks={}), "tasks is {}, not a list"),
    (lambda p: p.update(secondsAFrame=-1), "secondsAFrame is -1"),
    (lambda p: p.update(secondsAFrame=float("nan")), "secondsAFrame is nan"),
    (lambda p: p.update(programs={"quarn": 7}), "programs: quarn is 7"),
    (lambda p: p.update(environment={"A B": "c"}), "environment.*A B"),
    (lambda p: p["files"][0].update(path="scene.json"), "not an absolute path"),
    (lambda p: p["files"][0].update(bytes=-1), "bytes is -1"),
    (lambda p: p["files"][0].update(sum="md5:0"), "sum is 'md5:0'"),
    (lambda p: p["tasks"][0].update(id="a/../../b"), "id is 'a/../../b'"),
    (lambda p: p["tasks"][0].update(id="-rf"), "id is '-rf'"),
    (lambda p: p["tasks"][0].update(id="b" * 101), "id is 'bbb"),
    (lambda p: p["tasks"][1].update(id="a"), "the task a twice"),
    (lambda p: p["tasks"][0].update(needs=["merge"]), "a needs 'merge', which does not come before"),
    (lambda p: p["tasks"][0].update(needs=["a"]), "a needs 'a', which does not come before"),
    (lambda p: p["tasks"][1].update(needs=["c"]), "needs 'c', which is no task"),
    (lambda p: p["tasks"][0].update(command=[]), r"tasks\[0\] \(a\): command is empty"),
    (lambda p: p["tasks"][0].update(command="rm"), "command is 'rm', not a list"),
    (lambda p: p["tasks"][0].update(command=["a\0b"]), r"command\[0\]"),
    (lambda p: p["tasks"][0]["result"].update(kind="film"), "kind is 'film'"),
    (lambda p: p["tasks"][0]["result"].update(path="parts/../../a"), "leads out"),
    (lambda p: p["tasks"][0]["result"].update(files=["x"]), "files has 1 names"),
    (lambda p: p["tasks"][0].update(result={"kind": "frames", "path": "a", "files": ["../x"]}), "no name of a file"),
    (lambda p: p["tasks"][0]["resources"].update(cpus=0), "cpus is 0"),
    (lambda p: p["tasks"][0]["resources"].update(memoryMb=2**70), "memoryMb is 1180591620717411303424"),
    (lambda p: p["tasks"][0]["resources"].update(minutes="5"), "minutes is '5'"),
]


class PlanTest(FarmTest):
    def test_what_is_written_is_read(self) -> None:
        files = ("a.0001.obj", "ä.obj")
        shots = replace(self.task("shots"), result=Result("frames", "/somewhere", files), frames="1-2")
        made = self.plan(self.task("a"), shots, self.task("merge", needs=("a",)))
        self.assertEqual(plan.read(made.folder / "plan.json"), made)
        self.assertEqual(made.task("shots"), shots)
        with self.assertRaisesRegex(FarmError, "no task 'b'; the first of its 3 is a"):
            made.task("b")

    def test_hostile_plans_are_refused(self) -> None:
        made = self.plan(self.task("a"), self.task("merge", needs=("a",)))
        path = made.folder / plan.FILE
        good = json.loads(path.read_text())
        for change, named in HOSTILE:
            bad = copy.deepcopy(good)
            change(bad)
            path.write_text(json.dumps(bad))
            with self.subTest(named=named), self.assertRaisesRegex(FarmError, named):
                plan.read(made.folder)
        for content, named in ((b"\xff", "is no plan"), (b"[" * 100_000, "nested too deeply"), (b"[]", "not an object"),
                               (b'{"a": 1, "a": 2}', "'a' twice"), (b"{", "is no plan")):
            path.write_bytes(content)
            with self.subTest(content=content[:20]), self.assertRaisesRegex(FarmError, named):
                plan.read(made.folder)
        os.truncate(path, plan.LARGEST_FILE + 1)
        with self.assertRaisesRegex(FarmError, "at most"):
            plan.read(path)
        with self.assertRaisesRegex(FarmError, "there is no plan at"):
            plan.read(self.place)

    def test_a_plan_is_frozen(self) -> None:
        made = self.plan(self.task("a"))
        path = made.folder / plan.FILE
        before = path.read_bytes()
        plan.write(replace(made, seconds_a_frame=2.0, tasks=(replace(made.tasks[0], resources=replace(
            made.tasks[0].resources, minutes=9)),)))  # as it comes out when it is timed again
        other = replace(made, frames="1-4")
        with self.assertRaisesRegex(FarmError, "is another plan"):
            plan.write(other)
        self.assertEqual(path.read_bytes(), before)
        plan.write(other, overwrite=True)
        self.assertEqual(plan.read(made.folder), other)

    def test_a_disk_that_is_full(self) -> None:
        made = self.plan(self.task("a"))
        limits = resource.getrlimit(resource.RLIMIT_FSIZE)
        self.addCleanup(resource.setrlimit, resource.RLIMIT_FSIZE, limits)
        resource.setrlimit(resource.RLIMIT_FSIZE, (100, limits[1]))
        with self.assertRaisesRegex(FarmError, "plan.json could not be written"):
            plan.write(replace(made, frames="1-4"), overwrite=True)
        self.assertEqual(os.listdir(made.folder), [plan.FILE])
        self.assertEqual(plan.read(made.folder), made)


class RefusalTest(FarmTest):
    def test_what_cannot_be_planned(self) -> None:
        (self.place / "shot2.obj").touch()
        scene, made, one = self.scene, self.place / "made", ("--frames", "1-3", "--parts", "1")
        cases: list[tuple[int, str, tuple[Union[str, Path], ...]]] = [
            (2, "say --frames A-B", ("export", scene)),
            (2, "--parts is 5, and there are 3", ("export", scene, "--frames", "1-3", "--parts", "5")),
            (2, "no range of frames", ("export", scene, "--frames", "3-1", "--parts", "1")),
            (2, "--pass frames is the plan's own", ("export", scene, *one, "--pass", "frames=1")),
            (2, "--pass is '--quiet'", ("export", scene, *one, "--pass=--quiet")),
            (2, "ends in .npy", ("bake", scene, "a.outMesh", *one, "--result", "a.pc2")),
            (2, "put ####", ("play", scene, *one, "--result", "a.glb")),
            (2, "has 2 geometries, arm, hat", ("export", scene, *one, "--deformer", "two")),
            (2, "above 0", ("export", scene, "--minutes", "0")),
            (2, "no whole number", ("export", scene, "--cpus", "many")),
            (1, "is not a program", ("export", scene, "--quarn", "/no/such")),
            (1, "could not be read", ("export", self.place / "no.json", *one)),
            (1, "shot2.obj is there already", ("play", scene, *one, "--result", self.place / "shot#.obj")),
        ]
        for code, named, words in cases:
            with self.subTest(named=named):
                self.assertIn(named, self.farm("plan", *words, "-o", made, code=code, QUARN=str(self.quarn)))
                self.assertFalse(made.exists())

    def test_what_another_plan_has_made_goes_only_when_that_is_asked_for(self) -> None:
        words = ("plan", "export", self.scene, "--frames", "1-4", "--quarn", self.quarn, "-o", self.place / "farm")
        self.farm(*words, "--parts", "2")
        made = self.place / "farm/parts/0001"
        made.mkdir(parents=True)
        (made / "dataset.json").touch()
        self.farm(*words, "--parts", "2")
        self.assertIn("is another plan", self.farm(*words, "--parts", "3", code=1))
        self.assertTrue(made.exists())
        self.farm(*words, "--parts", "3", "--overwrite")
        self.assertFalse(made.exists())
        self.assertEqual(len(plan.read(self.place / "farm").tasks), 4)


class PartsTest(unittest.TestCase):
    def test_parts_are_the_whole(self) -> None:
        for frames in (Frames(5, 5), Frames(-3, 8), Frames(1, 100), Frames(1001, 1096, 5)):
            for count in (1, 2, 3, 7, 99, 1000):
                pieces = parts.cut(frames, count)
                numbers = [piece.frame(number) for piece in pieces for number in range(piece.count)]
                self.assertEqual(numbers, list(range(frames.first, frames.last + 1, frames.step)))
                sizes = {piece.count for piece in pieces}
                self.assertLessEqual(max(sizes) - min(sizes), 1)
                self.assertEqual(len(pieces), min(count, frames.count))
                self.assertEqual([parts.frames_of(str(piece)) for piece in pieces if piece.count > 1],
                                 [piece for piece in pieces if piece.count > 1])

    def test_parts_take_the_time_that_they_are_given(self) -> None:
        frames = Frames(1, 4000)
        for minutes in (0.1, 1, 15, 1e5):
            for timing in (Timing(0, 1e-6, 0, 0), Timing(0.4, 0.12, 0, 0), Timing(300, 5, 0, 0), Timing(9, 1e5, 0, 0)):
                count = parts.count_for(frames, minutes, timing.start_seconds, timing.seconds_a_frame)
                longest = max(piece.count for piece in parts.cut(frames, count))
                self.assertTrue(longest == 1 or timing.seconds(longest) <= 60 * minutes, (minutes, timing))
                if count > 1 and longest > 1:  # and one less would not do
                    fewer = max(piece.count for piece in parts.cut(frames, count - 1))
                    self.assertGreater(timing.seconds(fewer), 60 * minutes, (minutes, timing))

    def test_texts_of_frames(self) -> None:
        for text, wanted in (("5", Frames(5, 5)), ("-10--1", Frames(-10, -1)), ("1-100x7", Frames(1, 99, 7))):
            self.assertEqual(parts.frames_of(text), wanted)
        for text in ("", "a", "1-", "5-1", "1-5x0", "1-5x", "1.5", "1-5 ", "9" * 30, "1-999999999", "١"):
            with self.subTest(text=text), self.assertRaisesRegex(UsageError, "frame"):
                parts.frames_of(text)

    def test_names_of_files(self) -> None:
        for pattern, frame, wanted in (("h.####.obj", 7, "h.0007.obj"), ("h.#.obj", 123, "h.123.obj"),
                                       ("h.####.obj", -7, "h.-0007.obj"), ("a#b.##.png", 3, "a#b.03.png")):
            self.assertEqual(frame_file(pattern, frame), wanted)
        self.assertEqual(parts.names(2), ["0001", "0002"])
        self.assertEqual(parts.names(10_000)[0], "00001")


if __name__ == "__main__":
    unittest.main()
