# SPDX-License-Identifier: Apache-2.0
"""Sweeps: what a list multiplies out to, what the trainer is told, attempts, and the table in the end."""

import contextlib
import io
import json
import os
import sys
import tempfile
import unittest
from pathlib import Path
from typing import Any

from neuralwarp_farm import __main__, plan
from neuralwarp_farm.errors import FarmError
from neuralwarp_farm.kinds import train_list

QUARN = 'import json; print(json.dumps({"version": "0.9.0", "build": "abc", "instructionSet": "AVX2"}))'
# is killed at its first attempt, and goes on at the second; its error is neurons - seed, in mm
TRAINER = """
import json, os, sys
from pathlib import Path
words = sys.argv[1:]
model = Path(words[words.index("-o") + 1])
checkpoint = model.with_suffix(".checkpoint")
if not checkpoint.exists():
    checkpoint.touch()
    os.kill(os.getpid(), 9)
numbers = [int(words[words.index(flag) + 1]) if flag in words else 0 for flag in ("--neurons", "--seed")]
mm = lambda value: {"mm": value}
network = {"mean": mm(numbers[0] - numbers[1]), "p9999": mm(7), "max": mm(9)}
report = {"errors": {"skin": None, "network": network}, "bestEpoch": 3, "seed": numbers[1], "seconds": 1.5,
          "heldOut": True, "sizes": {"a": 5, "b": 6}, "split": {"validationSet": None}, "words": words}
for folder, name, content in ((model, "metadata.json", {}), (model.with_suffix(".report"), "report.json", report)):
    folder.mkdir()
    (folder / name).write_text(json.dumps(content))
checkpoint.unlink()
"""


class SweepCase(unittest.TestCase):
    def setUp(self) -> None:
        place = tempfile.TemporaryDirectory()
        self.addCleanup(place.cleanup)
        self.place = Path(place.name)
        for name in ("sets/hand", "sets/arm", "heldOut"):
            (self.place / name).mkdir(parents=True)
            (self.place / name / "dataset.json").write_text("{}")
        self.folder = self.place / "night"

    def write_list(self, content: Any) -> Path:
        path = self.place / "sweep.json"
        path.write_text(json.dumps(content))
        return path

    def script(self, name: str, text: str) -> str:
        path = self.place / name
        path.write_text(f"#!{sys.executable}\n{text}")
        path.chmod(0o755)
        return str(path)

    def farm(self, *words: str) -> tuple[int, str]:
        with contextlib.redirect_stdout(io.StringIO()) as said, contextlib.redirect_stderr(said):
            return __main__.main(list(words)), said.getvalue()


class ListTest(SweepCase):
    def test_lists_multiply_out_and_paths_count_from_the_list(self) -> None:
        found = train_list.read_list(self.write_list([
            {"name": "{character}-{neurons}", "dataset": "sets/{character}", "seeds": [1, 2],
             "each": {"character": ["hand", "arm"], "neurons": [16], "mode": ["SiLU"]},
             "arguments": ["--neurons", "{neurons}", "--activation", "{mode}", "--validation-set", "heldOut"]},
            {"name": "alone", "dataset": str(self.place / "sets/arm")}]))
        self.assertEqual([training.name for training in found],
                         ["hand-16.SiLU.1", "hand-16.SiLU.2", "arm-16.SiLU.1", "arm-16.SiLU.2", "alone"])
        self.assertEqual(found[2], ("arm-16.SiLU.1", self.place / "sets/arm", (
            "--neurons", "16", "--activation", "SiLU", "--validation-set", str(self.place / "heldOut"), "--seed", "1")))
        self.assertEqual(found[4][1:], (self.place / "sets/arm", ()))

    def test_what_is_wrong_is_named(self) -> None:
        good: dict[str, Any] = {"name": "a", "dataset": "sets/arm"}
        cases = [({}, "is {}, not a list"), ([], "no training"), ([1], r"\[0\] is 1"), ([{"name": "a"}], "dataset"),
                 ([{**good, "dataset": "sets/foot"}], "sets/foot"), ([good, good], "two models are called a"),
                 ([{**good, "seed": 1}], "'seed' is no entry"), ([{**good, "seeds": []}], "seeds is empty"),
                 ([{**good, "each": {"k": [[]]}}], "k has"), ([{**good, "each": {"k k": [1]}}], "'k k'"),
                 ([{**good, "each": {"seed": [1]}, "seeds": [1]}], "seeds is there beside"),
                 ([{**good, "name": "../a"}], "name makes '../a'"), ([{**good, "seeds": [1, 1]}], r"called a\.1"),
                 ([{**good, "arguments": ["--neurons", "{size}"]}], "names {size}"),
                 ([{**good, "arguments": ["--threads=4"]}], "has --threads, which the farm sets"),
                 ([{**good, "arguments": "--direct"}], "arguments"),
                 ([{**good, "each": {"a": list(range(200)), "b": list(range(200))}}], "more than 10000")]
        for content, sentence in cases:
            with self.subTest(sentence), self.assertRaisesRegex(FarmError, sentence):
                train_list.read_list(self.write_list(content))


class SweepTest(SweepCase):
    def setUp(self) -> None:
        super().setUp()
        path = self.write_list([
            {"name": "hand", "dataset": "sets/hand", "each": {"neurons": [30, 10]}, "seeds": [1, 2],
             "arguments": ["--neurons", "{neurons}"]}, {"name": "arm", "dataset": "sets/arm"}])
        code, said = self.farm("plan", "train", str(path), "-o", str(self.folder), "--quarn",
                               self.script("quarn", QUARN), "--trainer", self.script("trainer", TRAINER))
        self.assertEqual(code, 0, said)
        self.models = [task.id for task in plan.read(self.folder).tasks if task.result.kind == "model"]

    def task(self, identifier: str, *words: str) -> int:
        return self.farm("task", str(self.folder), identifier, *words)[0]

    def test_each_is_trained_where_another_attempt_finds_it(self) -> None:
        self.assertEqual(self.models, ["hand.30.1", "hand.30.2", "hand.10.1", "hand.10.2", "arm"])
        self.assertEqual([self.task("hand.10.2", "--threads", "3") for _ in range(3)], [137, 0, 0])
        report = json.loads((self.folder / "models/hand.10.2.report/report.json").read_text())
        self.assertEqual(report["words"], [
            "train", str(self.place / "sets/hand"), "-o", "models/hand.10.2.nwrp", "--report",
            "models/hand.10.2.report", "--resume-if-fits", "--threads", "3", "--quarn", str(self.place / "quarn"),
            "--neurons", "10", "--seed", "2"])
        (self.place / "sets/hand/dataset.json").write_text('{"changed": true}')
        self.assertEqual(self.task("hand.10.1"), 1)
        self.assertIn("dataset.json has changed", (self.folder / "logs/hand.10.1.log").read_text())

    def test_the_table_has_the_best_first_and_is_written_when_all_are_there(self) -> None:
        for name in self.models[1:]:
            self.task(name)
            self.task(name)
        code, said = self.farm("table", str(self.folder), "--write")
        self.assertEqual((code, self.names(said), "1 of 5 models are not there: hand.30.1" in said),
                         (1, ["arm", "hand.10.2", "hand.10.1", "hand.30.2"], True), said)
        self.assertEqual([self.task(name) for name in ("merge", "hand.30.1", "hand.30.1", "merge")], [1, 137, 0, 0])
        text = (self.folder / "table.txt").read_text()
        self.assertEqual(self.names(text), ["arm", "hand.10.2", "hand.10.1", "hand.30.2", "hand.30.1"])
        self.assertEqual([line.split()[0] for line in text.splitlines() if line.endswith("best")], ["arm", "hand.10.2"])
        self.assertEqual(text.count("hold out different frames"), 1)
        rows = json.loads((self.folder / "table.json").read_text())["models"]
        self.assertEqual([(row["name"], row["mean"], row["best"], row["bytes"]) for row in rows[:3]],
                         [("arm", 0, True, 11), ("hand.10.2", 8, True, 11), ("hand.10.1", 9, False, 11)])
        os.remove(self.folder / "models/arm.report/report.json")
        self.assertIn("arm.nwrp has no report", self.farm("table", str(self.folder))[1])

    def names(self, text: str) -> list[str]:
        return [line.split()[0] for line in text.splitlines() if line.startswith(("hand", "arm"))]
