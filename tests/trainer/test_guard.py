# SPDX-License-Identifier: Apache-2.0
"""What a guarded model gives out inside the ranges of its training rows, and on the way out of them."""

import tempfile
import unittest
from dataclasses import replace
from pathlib import Path

import numpy as np

import synthetic
from trainer import pipeline
from trainer.dataset import load_dataset
from trainer.errors import TrainerError
from trainer.evaluator import ModelDirectory
from trainer.guard import check_guard
from trainer.settings import GUARDS, Settings, override
from trainer.split import split_rows

WIDTH = 0.5
HELD_OUT = 0.9  # extremes of the controls are among them
MOVING, STILL = 1, 3  # controls


class GuardTest(unittest.TestCase):
    def test_inside_nothing_changes_and_outside_it_holds_or_fades(self) -> None:
        with tempfile.TemporaryDirectory() as place:
            dataset = load_dataset(synthetic.make(Path(place) / "data", constant_control=True))
            for shapes in (False, True):
                models = {}
                for guard in GUARDS:
                    settings = replace(dataset.settings, epochs=3, validationRatio=HELD_OUT, guard=guard,
                                       guardWidth=WIDTH, linearPath=True, activationFunction="SiLU",
                                       principalShapesEnabled=shapes)
                    path = Path(place) / f"{guard}{shapes}.nwrp"
                    pipeline.train(pipeline.Job(dataset, settings, 1, 1, path, path.with_suffix(".report"), None,
                                                lambda line: None, False))
                    models[guard] = ModelDirectory(path, None)
                with self.subTest(shapes=shapes):
                    rows = dataset.controls[split_rows(dataset, HELD_OUT, 1).train]
                    self.check(models, rows)

    def check(self, models: dict[str, ModelDirectory], rows: np.ndarray) -> None:
        inside = models["none"].deltas(rows)
        for guard in ("clamp", "fade"):
            np.testing.assert_array_equal(models[guard].deltas(rows), inside)
        lower, upper = rows.min(axis=0), rows.max(axis=0)
        # a control that never moved counts in a tenth of what the others, three of four, turn in
        least = 0.1 * np.sqrt(np.mean(np.square(upper - lower)))
        for control, unit in ((MOVING, upper[MOVING] - lower[MOVING]), (STILL, least)):
            for edge, way in ((lower, -1), (upper, 1)):
                parts = np.array([0, 0.1, 0.25, 0.4, 0.51, 3], np.float32)
                controls = np.tile((lower + upper) / 2, (len(parts), 1))
                controls[:, control] = edge[control] + way * unit * parts
                controls[-1, 0] = (lower[0] + 3 * upper[0]) / 4  # what is inside goes on moving
                held = controls.copy()
                held[:, control] = edge[control]
                wanted = models["none"].deltas(held)
                np.testing.assert_array_equal(models["clamp"].deltas(controls), wanted)
                left = np.maximum(1 - (parts / WIDTH)**2, 0)[:, None]
                faded = models["fade"].deltas(controls)
                np.testing.assert_allclose(faded, wanted * left**2, atol=1e-6)
                self.assertFalse(faded[parts > WIDTH].any())

    def test_words(self) -> None:
        changed = override(Settings(), {"guard": "Fade", "guardWidth": 0.5}, str)
        self.assertEqual((changed.guard, changed.guardWidth), ("fade", 0.5))
        for name, value in (("guard", "clip"), ("guardWidth", 0.0), ("guardWidth", float("nan"))):
            with self.subTest(name, value=value), self.assertRaises(TrainerError):
                override(Settings(), {name: value}, str)
        with self.assertRaisesRegex(TrainerError, "--guard is clamp"):
            check_guard(Settings(guard="clamp"), {"guardWidth": 1.0})


if __name__ == "__main__":
    unittest.main()
