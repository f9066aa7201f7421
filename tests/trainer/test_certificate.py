# SPDX-License-Identifier: Apache-2.0
"""What a certificate promises, on frames that were drawn after it was written."""

import json
import os
import subprocess
import tempfile
import unittest
from dataclasses import replace
from pathlib import Path
from typing import Any, Callable

import numpy as np
import xxhash

import synthetic
from trainer import certificate, pipeline
from trainer.dataset import Dataset, load_dataset
from trainer.errors import TrainerError
from trainer.evaluator import ModelDirectory, find_quarn, run_with_quarn
from trainer.guard import units_of
from trainer.measure import Measured, measure, measured
from trainer.split import split_rows


class CertificateTest(unittest.TestCase):
    def setUp(self) -> None:
        place = tempfile.TemporaryDirectory()
        self.addCleanup(place.cleanup)
        self.place = Path(place.name)

    def train(self, dataset: Dataset, **changes: Any) -> tuple[Any, Path]:
        """The certificate, and where it lies."""
        model = self.place / "model.nwrp"
        validation = changes.pop("validation", None)
        pipeline.train(pipeline.Job(dataset, replace(dataset.settings, **changes), 1, 1, model,
                                    self.place / "model.report", None, lambda line: None, False, validation))
        return json.loads((model / "metadata.json").read_text())["certificate"], model

    @staticmethod
    def measured(model: Path, dataset: Dataset) -> tuple[Measured, Callable[[np.ndarray], Measured]]:
        """Over all rows, and what measures others."""
        directory = ModelDirectory(model, None)
        return (measured(dataset, np.arange(dataset.frame_count), directory.deltas),
                lambda rows: measured(dataset, rows, directory.deltas))

    def test_other_frames_of_the_same_kind_have_the_errors_that_it_states(self) -> None:
        found, model = self.train(load_dataset(synthetic.make(self.place / "data", frames=1500, meshSum="xxh3_128:1f")),
                                  epochs=12)
        row, = found["errors"]
        self.assertEqual((row["frames"], row["poses"], row["heldOut"]),
                         (150, "drawn", "drawn at random from all rows; they chose nothing"))
        self.assertEqual((found["trainingFrames"], found["mesh"], row["mm"]["skin"]), (1200, "xxh3_128:1f", None))
        fresh = load_dataset(synthetic.make(self.place / "fresh", frames=600, seed=8))
        directory = ModelDirectory(model, None)
        errors = measure(fresh, np.arange(600), directory.deltas)
        for name in ("mean", "p9999"):
            for stage, called in (("network", "network"), ("base", "zeroDeltas")):
                ratio = errors[stage][name]["mm"] / row["mm"][called][name]
                self.assertTrue(1 / 1.3 < ratio < 1.3, (stage, name, ratio))
        # the curve: in the mean over the frames that error, and more for the far half of them than for the near one
        poses = np.load(model / certificate.POSES_NAME)
        self.assertEqual(found["trainedPoses"], {
            "count": 1000, "xxh3_128": xxhash.xxh3_128_hexdigest((model / certificate.POSES_NAME).read_bytes())})
        data = load_dataset(self.place / "data")
        trained = data.controls[split_rows(data, 0.2, 1).train]
        lower, upper = (np.array(found["controls"][name], np.float32) for name in ("minima", "maxima"))
        np.testing.assert_array_equal([lower, upper], [trained.min(axis=0), trained.max(axis=0)])
        curve = found["expectedError"]
        expected = np.interp(certificate.distances(fresh.controls, poses, units_of(lower, upper)), curve["distances"],
                             curve["millimetres"])
        self.assertLess(abs(expected.mean() / errors["network"]["mean"]["mm"] - 1), 0.1)

    def test_quarn_finds_the_certificate_whole(self) -> None:
        quarn = find_quarn(os.environ.get("NW_TEST_QUARN") or None)
        if quarn is None:
            self.skipTest("there is no quarn")
        _, model = self.train(load_dataset(synthetic.make(self.place / "data", frames=300)), epochs=1)
        answer = json.loads(subprocess.check_output([quarn, "info", "--json", str(model)]))
        self.assertEqual((answer["certificateNote"], answer["certificate"]["trainedPoses"]), ("", 240))
        self.assertEqual(len(run_with_quarn(quarn, model, np.zeros((2, 3), np.float32))), 2)

    def test_drawn_poses_and_motions_are_told_apart(self) -> None:
        drawn = load_dataset(synthetic.make(self.place / "data", frames=80))
        motion = load_dataset(synthetic.make(self.place / "motion", frames=60))
        motion = replace(motion, drawn=np.zeros(60, bool), controls=np.sort(motion.controls, axis=0))
        both = replace(motion, drawn=np.arange(60) < 30)
        for validation, kinds in ((motion, ["motion"]), (both, ["drawn", "motion"])):
            with self.subTest(kinds):
                found, _ = self.train(drawn, epochs=1, validation=validation)
                self.assertEqual([row["poses"] for row in found["errors"]], kinds)
                self.assertTrue(all(30 / len(kinds) - 4 < row["frames"] <= 30 for row in found["errors"]))
                self.assertEqual(found["trainingFrames"], 80)
        # what another data set gives is added, once; what was trained on promises nothing
        found, model = self.train(drawn, epochs=1, validationRatio=0.0)
        for _ in range(2):
            certificate.add_errors(model, motion, *self.measured(model, motion))
        added = json.loads((model / "metadata.json").read_text())["certificate"]
        self.assertEqual([(row["poses"], row["frames"]) for row in added["errors"]], [("drawn", 80), ("motion", 60)])
        self.assertEqual({**added, "errors": found["errors"]}, found)
        with self.assertRaisesRegex(TrainerError, "was trained on"):
            certificate.add_errors(model, drawn, *self.measured(model, drawn))
        self.assertEqual(sorted(os.listdir(model)), ["metadata.json", "model.onnx", certificate.POSES_NAME])
        self.assertIn("they were trained on", found["errors"][0]["heldOut"])
        self.assertIsNone(found["expectedError"])

    def test_representatives_leave_no_row_far(self) -> None:
        rows = np.random.default_rng(3).normal(size=(300, 2))
        chosen = certificate.representatives(rows, 20)
        self.assertEqual((len(set(chosen)), list(chosen)), (20, sorted(chosen)))
        left = certificate.distances(rows, rows[chosen], np.ones(2)).max()
        apart = min(certificate.squares(np.delete(rows[chosen], i, 0), rows[chosen][i]).min() ** 0.5 for i in range(20))
        self.assertLessEqual(left, apart)  # else a better choice was there
        twice = np.repeat(rows[:5], 3, axis=0)
        self.assertEqual(len(certificate.representatives(twice, 20)), 5)
        self.assertEqual(certificate.largest_count(1 << 20), 15)

    def test_the_curve_never_falls(self) -> None:
        random = np.random.default_rng(4)
        distance = random.uniform(1, 2, 400)
        rising = certificate.expected_error(distance, distance**2 + random.normal(0, 0.3, 400))
        assert rising is not None
        far, error = np.array(rising["distances"]), np.array(rising["millimetres"])
        self.assertTrue((np.diff(far) > 0).all() and (np.diff(error) >= 0).all())
        self.assertEqual(far[-1], distance.max())
        np.testing.assert_allclose(np.interp([1.2, 1.5, 1.8], far, error), [1.44, 2.25, 3.24], rtol=0.1)
        falling = certificate.expected_error(distance, 3 - distance)
        assert falling is not None
        self.assertLess(np.ptp(falling["millimetres"]), 1e-12)
        self.assertAlmostEqual(falling["millimetres"][0], float(np.mean(3 - distance)))
        self.assertIsNone(certificate.expected_error(distance[:19], distance[:19]))


if __name__ == "__main__":
    unittest.main()
