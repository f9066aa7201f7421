# SPDX-License-Identifier: Apache-2.0
"""Trainings that are interrupted and go on: the same bytes as without, or a refusal that says why."""

import hashlib
import json
import random
import tempfile
import unittest
from dataclasses import replace
from pathlib import Path
from typing import Any
from unittest import mock

import synthetic
from trainer import pipeline, resume
from trainer.checkpoint import Checkpoints
from trainer.dataset import load_dataset
from trainer.device import Device
from trainer.errors import TrainerError
from trainer.state import State
from trainer.training import mean_loss


class Killed(BaseException):
    pass


class ResumeTest(unittest.TestCase):
    def setUp(self) -> None:
        place = tempfile.TemporaryDirectory()
        self.addCleanup(place.cleanup)
        self.place = Path(place.name)
        self.said: list[str] = []
        self.data = synthetic.make(self.place / "data", frames=40, train={"epochs": 6, "batchSize": 8})
        self.checkpoint = self.place / "model.checkpoint"

    def train(self, wish: str = resume.RESUME, seed: int = 1, threads: int = 1, **changes: Any) -> bytes:
        """The model's files."""
        dataset = load_dataset(self.data)
        model = self.place / "model.nwrp"
        pipeline.train(pipeline.Job(dataset, replace(dataset.settings, **changes), seed, threads, model,
                                    self.place / "model.report", None, self.said.append, False, going_on=wish))
        return b"".join(path.name.encode() + path.read_bytes() for path in sorted(model.iterdir()))

    def killed(self, save_at: int, die_at: int, wish: str = resume.RESUME, **changes: Any) -> bool:
        """Whether a training that writes a checkpoint before one step, and dies before another, has come that far."""
        steps = iter(range(10000))

        def is_due(checkpoints: Checkpoints) -> bool:
            step = next(steps)
            if step == die_at:
                raise Killed
            return step == save_at

        with mock.patch.object(Checkpoints, "is_due", is_due):
            try:
                self.train(wish, **changes)
            except Killed:
                return True
        return False

    def test_killed_again_and_again(self) -> None:
        moments = random.Random(5)

        def worse(state: State, *_: Any) -> float:
            return 1.0 + state.epoch  # the best is the first

        variants: list[tuple[dict[str, Any], Any]] = [
            ({"dropoutRatio": 0.2, "validationRatio": 0.0}, mean_loss), ({"patience": 2, "epochs": 12}, worse),
            ({"principalShapesEnabled": True, "principalShapesHalf": True, "principalShapesAccuracy": 0.95}, mean_loss),
            ({"activationFunction": "SiLU", "linearPath": True, "localNeurons": True, "preloadData": False}, mean_loss)]
        for changes, loss in variants:
            with self.subTest(changes), mock.patch("trainer.training.mean_loss", loss):
                wanted = self.train(resume.ANEW, **changes)
                self.said.clear()
                while self.killed(save_at := moments.randrange(9), save_at + moments.randrange(1, 4), **changes):
                    pass
                self.assertGreater(sum("going on" in line for line in self.said), 2)
                self.assertEqual(self.train(resume.ANEW, **changes), wanted)
                self.killed(7, 9, **changes)
                self.assertEqual(self.train(**changes), wanted)
                self.assertFalse(list(self.place.glob("*.checkpoint*")))

    def test_what_is_of_another_training_is_refused(self) -> None:
        self.assertTrue(self.killed(5, 6))
        cases: list[tuple[dict[str, Any], str]] = [
            ({"seed": 2}, "seed 1, and not 2"), ({"epochs": 7}, "epochs 6, and not 7"),
            ({"neuronsPerLayer": 9}, "neuronsPerLayer 32, and not 9"),
            ({"threads": 2}, "number of threads 1, and not 2")]
        for changes, wanted in cases:
            with self.assertRaisesRegex(TrainerError, f"of another training: {wanted}; without --resume"):
                self.train(**changes)
        with mock.patch("trainer.resume.__version__", "9"), self.assertRaisesRegex(TrainerError, "trainer .*not 9"):
            self.train()
        with mock.patch("trainer.resume.digest_of", lambda *_: "x"), self.assertRaisesRegex(TrainerError, "is learned"):
            self.train()
        before = self.checkpoint.read_bytes()
        self.data = synthetic.make(self.place / "other", frames=41, train={"epochs": 6, "batchSize": 8})
        with self.assertRaisesRegex(TrainerError, "data set sha256"):
            self.train()
        self.assertEqual(self.checkpoint.read_bytes(), before)
        self.train(resume.IF_FITS)
        self.assertTrue(any("begins anew, as" in line and "data set" in line for line in self.said))
        self.assertFalse(self.checkpoint.exists())
        self.train()
        self.assertIn("there is no", "".join(self.said))

    def test_damaged_and_hostile_files(self) -> None:
        wanted = self.train(resume.ANEW)
        self.assertTrue(self.killed(9, 10))
        whole = self.checkpoint.read_bytes()
        head, rest = whole.split(b"\n", 1)
        description = json.loads(head)

        def signed(**changes: Any) -> bytes:
            content = json.dumps({**description, **changes}).encode() + b"\n" + rest[:-32]
            return content + hashlib.sha256(content).digest()

        arrays, state = description["arrays"], description["state"]
        broken = [whole[:-1], whole[:len(head) + 9], whole[:len(head)], whole[:40], whole + b"\0",
                  whole[:-100] + bytes([whole[-100] ^ 1]) + whole[-99:], signed(version=2), signed(arrays=7),
                  signed(arrays=[[arrays[0][0], "<f4", [1 << 40, 1 << 40]], *arrays[1:]]), signed(arrays=arrays[1:]),
                  signed(arrays=[[arrays[0][0], "|O", [3]], *arrays[1:]]), signed(state={}), signed(identity=[]),
                  signed(state={**state, "history": {**state["history"], "best_epoch": 9}}),
                  signed(state={**state, "batch": -1})]
        for content in broken:
            self.checkpoint.write_bytes(content)
            with self.assertRaisesRegex(TrainerError, r"model\.checkpoint is (damaged|a checkpoint of|of a network)"):
                self.train()
            self.assertEqual(self.checkpoint.read_bytes(), content)
        self.checkpoint.write_bytes(signed())
        self.assertEqual(self.train(), wanted)
        self.checkpoint.write_text("somebody's own")
        with self.assertRaisesRegex(TrainerError, "move it away"):
            self.train(resume.ANEW)
        self.assertEqual(self.checkpoint.read_text(), "somebody's own")

    def test_a_full_disk_ends_no_training(self) -> None:
        wanted = self.train(resume.ANEW)
        (self.place / "model.checkpoint.part").mkdir()
        self.assertFalse(self.killed(3, 99))
        self.assertIn("no checkpoint was written", "".join(self.said))
        self.assertEqual(self.train(resume.ANEW), wanted)

    def test_devices(self) -> None:
        for name, has, wanted in (("cpu", True, "cpu"), ("auto", False, "cpu"), ("auto", True, "cuda")):
            with mock.patch("torch.cuda.is_available", lambda: has):
                self.assertEqual(Device(name).device.type, wanted)
        for name, wanted in (("cuda", "PyTorch .* (without CUDA|no CUDA device): give cpu, or auto"), ("gpu", "'gpu'")):
            with mock.patch("torch.cuda.is_available", lambda: False), self.assertRaisesRegex(TrainerError, wanted):
                Device(name)


if __name__ == "__main__":
    unittest.main()
