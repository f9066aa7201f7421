# SPDX-License-Identifier: Apache-2.0
"""Networks that begin as others: the same function in other terms."""

import json
import tempfile
import unittest
from dataclasses import replace
from pathlib import Path
from typing import Any

import numpy as np

import synthetic
from trainer import pipeline
from trainer.dataset import load_dataset
from trainer.errors import TrainerError
from trainer.evaluator import ModelDirectory

SHAPES: dict[str, Any] = {"principalShapesEnabled": True, "principalShapesAccuracy": 0.9999999}


class WarmTest(unittest.TestCase):
    def setUp(self) -> None:
        place = tempfile.TemporaryDirectory()
        self.addCleanup(place.cleanup)
        self.place = Path(place.name)

    def train(self, data: Path, name: str, first: Any = None, steps: bool = True, **changes: Any) -> np.ndarray:
        """Deltas of the model on other poses; without `steps` the network is as it began."""
        dataset = load_dataset(data)
        changes = {"epochs": 5, **changes} if steps else {"epochs": 1, "learningRate": 0.0, **changes}
        job = pipeline.Job(dataset, replace(dataset.settings, **changes), 1, 1, self.place / f"{name}.nwrp",
                           self.place / f"{name}.report", None, lambda line: None, False,
                           first=first and self.place / f"{first}.nwrp")
        pipeline.train(job)
        return ModelDirectory(self.place / f"{name}.nwrp", None).deltas(self.poses(dataset.description["controlNames"]))

    def poses(self, names: list[str]) -> np.ndarray:
        values = np.random.default_rng(8).uniform(-0.5, 0.5, (20, 6)).astype(np.float32)
        return values[:, [int(name[5]) for name in names]]

    def test_begins_as_the_same_function(self) -> None:
        few = synthetic.make(self.place / "few", frames=30)
        more = synthetic.make(self.place / "more", frames=90, seed=9)
        # the same controls in another order, another among them
        turned = synthetic.make(self.place / "turned", frames=50, seed=10)
        controls = np.load(turned / "controls.npy")
        columns = [controls[:, 2], controls[:, 0], controls[:, 0] ** 2, controls[:, 1]]
        np.save(turned / "controls.npy", np.ascontiguousarray(np.transpose(columns)))
        description = json.loads((turned / "dataset.json").read_text())
        description.update(controlCount=4, controlNames=[f"joint{index}.rotateX" for index in (2, 0, 5, 1)])
        (turned / "dataset.json").write_text(json.dumps(description))
        line = {"linearPath": True, "activationFunction": "SiLU"}
        cases: list[tuple[dict[str, Any], dict[str, Any]]] = [
            ({}, {}), (line, line), ({}, {"linearPath": True, "dropoutRatio": 0.1}),
            (SHAPES, SHAPES), ({**SHAPES, **line}, {**SHAPES, **line, "principalShapesHalf": True}),
            (SHAPES, {}), ({}, SHAPES), ({"guard": "fade", **line}, line)]
        for before, now in cases:
            old = self.train(few, "old", **before)
            for data in (more, turned):
                with self.subTest(before=before, now=now, data=data.name):
                    new = self.train(data, "new", "old", steps=False, **now)
                    shapes = ModelDirectory(self.place / "new.nwrp", None).shapes
                    wanted = old if shapes is None else old @ np.linalg.pinv(shapes) @ shapes  # what they can show
                    self.assertLess(np.abs(new - wanted).max(), 2e-5 * np.abs(wanted).max())
        self.assertRegex(json.loads((self.place / "new.nwrp/metadata.json").read_text())["firstNetwork"], "^sha256:")

    def test_what_cannot_begin_so_is_refused(self) -> None:
        data = synthetic.make(self.place / "data", frames=20)
        self.train(data, "old", linearPath=True)
        settings: list[tuple[dict[str, Any], str]] = [
            ({"neuronsPerLayer": 9}, "neuronsPerLayer is 32, and this one's is 9"), ({}, "without --linear-path"),
            ({"activationFunction": "Tanh"}, "activationFunction is LeakyReLU")]
        for changes, wanted in settings:
            with self.assertRaisesRegex(TrainerError, wanted):
                self.train(data, "new", "old", **changes)
        metadata = self.place / "old.nwrp/metadata.json"
        known = json.loads(metadata.read_text())
        others: list[tuple[dict[str, Any], str]] = [
            ({"controlNames": ["a", "b", "c"]}, "its control a is none"), ({"controlNames": [[], 1, 2]}, "its control"),
            ({"controlNames": known["controlNames"][:2]}, "another form"), ({"fullCount": 7}, "fullCount 7"),
            ({"settings": 1}, "settings"),
            ({"settings": {**known["settings"], "hiddenLayerCount": 3}}, "hiddenLayerCount is 3")]
        for change, wanted in others:
            metadata.write_text(json.dumps({**known, **change}))
            with self.assertRaisesRegex(TrainerError, wanted):
                self.train(data, "new", "old", linearPath=True)


if __name__ == "__main__":
    unittest.main()
