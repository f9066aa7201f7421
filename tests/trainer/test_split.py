# SPDX-License-Identifier: Apache-2.0
"""Which rows are held out, and that what is said of them is measured on rows that have chosen nothing."""

import tempfile
import unittest
from dataclasses import replace
from pathlib import Path
from typing import Any
from unittest import mock

import numpy as np

import synthetic
from trainer import pipeline, split, training
from trainer.dataset import Dataset, load_dataset
from trainer.errors import TrainerError
from trainer.measure import measured


class SplitTest(unittest.TestCase):
    def setUp(self) -> None:
        place = tempfile.TemporaryDirectory()
        self.addCleanup(place.cleanup)
        self.place = Path(place.name)
        self.count = 0

    def dataset(self, **changes: Any) -> Dataset:
        self.count += 1
        return load_dataset(synthetic.make(self.place / f"{self.count}", **changes))

    def test_parts_of_any_size(self) -> None:
        """None in two parts, something left to train on, and something to choose by; a test as soon as two are out."""
        data = self.dataset(frames=500)
        for count in (1, 2, 3, 5, 8, 40, 120, 500):
            for drawn in (np.zeros(count, bool), np.ones(count, bool), np.arange(count) < count // 3):
                for ratio in (0.0, 0.01, 0.2, 0.5, 0.99):
                    some = replace(data, controls=data.controls[:count], drawn=drawn)
                    with self.subTest(count=count, drawn=int(drawn.sum()), ratio=ratio):
                        found = split.split_rows(some, ratio, 3)
                        rows = np.concatenate([found.train, found.validation, found.test])
                        self.assertEqual(len(rows) + found.left_out, count)
                        self.assertEqual(len(np.unique(rows)), len(rows))
                        self.assertTrue(all((np.diff(part) > 0).all()
                                            for part in (found.train, found.validation, found.test)))
                        self.assertGreaterEqual(len(found.train), 1)
                        held = len(found.validation) + len(found.test)
                        self.assertEqual(held > 0, ratio > 0 and count > 1)
                        self.assertIn(len(found.validation) - len(found.test), range(-16, 17))
                        if 0 < ratio < 0.9 and count > 8:
                            self.assertAlmostEqual(held / count, ratio, delta=1.5 / count + 0.02)
                        self.assertLessEqual(found.left_out, (count - held) / 8)
                        for name, part in (("train", found.train), ("validation", found.validation),
                                           ("test", found.test)):
                            self.assertEqual(found.facts()[name], len(part))
                        self.assertEqual(found.facts()["measured"], "test" if len(found.test) else
                                         "validation" if held else "train")

    def test_a_motion_is_held_out_in_blocks_with_a_gap(self) -> None:
        for count, least in ((120, 12), (600, 30), (5000, 30)):
            motion = self.dataset(frames=count, motion=True)
            self.assertFalse(motion.drawn.any())
            for seed in range(5):
                found = split.split_rows(motion, 0.2, seed)
                part_of = np.zeros(count, int)  # 0 left out
                for number, rows in enumerate((found.train, found.validation, found.test), 1):
                    part_of[rows] = number
                ends = np.flatnonzero(np.diff(part_of)) + 1
                runs = np.split(part_of, ends)
                self.assertTrue(all(len(run) >= least - 1 for run in runs if run[0] in (2, 3)))
                kinds = [run[0] for run in runs if len(run)]
                # between rows to train on and a block, and between two blocks, rows are left out
                self.assertTrue(all(0 in pair for pair in zip(kinds, kinds[1:])), kinds)
                self.assertEqual([kind for kind in kinds if kind > 1][:2], [2, 3])

    def test_what_a_data_set_says_of_its_rows_or_looks_like(self) -> None:
        drawn = np.arange(160)
        cases: list[tuple[dict[str, Any], np.ndarray]] = [
                ({}, drawn < 160), ({"motion": True}, drawn < 0), ({"frames": 5}, np.arange(5) < 0),
                ({"drawnFrames": [[101, 110], [150, 150]]}, (drawn < 10) | (drawn == 49)),
                ({"motion": True, "drawnFrames": [[-5, 1000]]}, drawn < 160),
                ({"drawnFrames": []}, drawn < 0)]
        for changes, wanted in cases:
            with self.subTest(changes):
                np.testing.assert_array_equal(self.dataset(**changes).drawn, wanted)
        for spans in (5, [1, 2], [[1]], [[2, 1]], [[1, 2.5]], [[True, True]], [["1", "2"]]):
            with self.subTest(spans), self.assertRaisesRegex(TrainerError, "dataset.json: drawnFrames is"):
                self.dataset(drawnFrames=spans)
        mixed = split.split_rows(self.dataset(drawnFrames=[[101, 180]]), 0.25, 1)
        self.assertEqual((mixed.how, len(mixed.test)), ("random and blocks", 20))
        self.assertEqual(np.sum(mixed.test < 80), 10)
        self.assertEqual(np.ptp(mixed.test[mixed.test >= 80]), 9)

    def train(self, data: Dataset, validation: Any = None, **changes: Any) -> dict[str, Any]:
        job = pipeline.Job(data, replace(data.settings, **{"epochs": 12, **changes}), 1, 1, self.place / "m.nwrp",
                           self.place / "m.report", None, lambda line: None, False, validation)
        return pipeline.train(job)

    def test_the_third_part_chooses_nothing(self) -> None:
        """What it holds may be anything: the model is the same, and its errors are the report's."""
        data = self.dataset()
        report = self.train(data)
        model = (self.place / "m.nwrp/model.onnx").read_bytes()
        self.assertEqual(report["split"], {"how": "random", "train": 128, "validation": 16, "test": 16, "leftOut": 0,
                                           "measured": "test", "validationSet": None})
        test = split.split_rows(data, 0.2, 1).test
        wrong = np.array(data.deltas)
        wrong[test] += np.float32(0.5)
        again = self.train(replace(data, deltas=wrong))
        self.assertEqual((self.place / "m.nwrp/model.onnx").read_bytes(), model)
        self.assertGreater(again["errors"]["network"]["mean"]["mm"], 8)  # (0.5, 0.5, 0.5) cm off
        self.assertLess(report["errors"]["network"]["mean"]["mm"], 4)

    def test_another_set_validates_and_tests(self) -> None:
        for shapes in (False, True):
            data = self.dataset(frames=80)
            motion = self.dataset(frames=200, motion=True, seed=9)
            rows: list[np.ndarray] = []
            with mock.patch.object(training, "mean_loss", wraps=training.mean_loss) as asked:
                report = self.train(data, motion, principalShapesEnabled=shapes, principalShapesAccuracy=0.999)
                rows = [np.concatenate(call.args[3]) for call in asked.call_args_list]
            facts = report["split"]
            self.assertEqual((facts["how"], facts["train"], facts["validationSet"]), ("blocks", 80, "2" if not shapes
                                                                                      else "4"))
            self.assertEqual((facts["validation"], facts["test"], facts["leftOut"]), (90, 90, 20))
            self.assertTrue(all((part >= 80).all() for part in rows))
            # what is published does the same on the rows of the other set
            from trainer.evaluator import ModelDirectory

            held = split.split_with(data, motion, 1).test - 80
            found = measured(motion, held, ModelDirectory(self.place / "m.nwrp", None).deltas).errors["network"]
            self.assertAlmostEqual(report["errors"]["network"]["max"]["mm"], found["max"]["mm"], 3)
            self.assertEqual(report["errors"]["network"]["worstFrame"], found["worstFrame"])
        other = self.dataset(frames=20, affect=[3, 4])
        with self.assertRaisesRegex(TrainerError, "4 cannot validate .*5: its subsetState is 'complete'"):
            self.train(other, motion)


class MeasureTest(unittest.TestCase):
    def test_stages_figures_and_arrays_against_numpy(self) -> None:
        random = np.random.default_rng(2)
        with tempfile.TemporaryDirectory() as folder:
            affect = [40, 3, 17, 21, 9]
            place = synthetic.make(Path(folder) / "set", frames=60, motion=True, affect=affect,
                                   skin=random.uniform(0, 1, (60, 5)).astype("<f4"))
            data = load_dataset(place)
            data.frames[40:] += 7  # another clip
            away = random.normal(size=(60, 5, 3)).astype("<f4") * np.array([3, 1, 1, 1, 2])[:, None]
            by_row = {row.tobytes(): away[number].ravel() for number, row in enumerate(data.controls)}
            rows = np.concatenate([np.arange(5, 20), np.arange(30, 55)])

            def deltas_of(controls: np.ndarray) -> np.ndarray:
                wanted = {row.tobytes(): np.asarray(data.deltas[number]) for number, row in enumerate(data.controls)}
                return np.array([wanted[row.tobytes()] + by_row[row.tobytes()] for row in controls])

            with mock.patch("trainer.dataset.BLOCK_BYTES", 4 * 15 * 7):  # 7 rows at once
                found = measured(data, rows, deltas_of, None)
        errors, assert_skin = found.errors, data.skin
        assert assert_skin is not None
        lengths = 10 * np.linalg.norm(away[rows], axis=2)  # a unit is a centimetre
        for stage, values in (("network", lengths), ("skin", 10 * assert_skin[rows]),
                              ("base", 10 * np.linalg.norm(data.deltas[rows].reshape(-1, 5, 3), axis=2))):
            for name, wanted in (("mean", values.mean()), ("p99", np.quantile(values, 0.99)),
                                 ("p9999", np.quantile(values, 0.9999)), ("max", values.max())):
                self.assertAlmostEqual(errors[stage][name]["mm"] / wanted, 1, 5, (stage, name))
                self.assertAlmostEqual(errors[stage][name]["percentOfDiagonal"], wanted, 3)  # 100 mm
        inside = [row for row in rows if {row - 1, row, row + 1} <= set(rows) and not {39, 40} & {row}]
        second = [10 * np.linalg.norm(away[row - 1] - 2 * away[row] + away[row + 1], axis=1) for row in inside]
        self.assertAlmostEqual(errors["network"]["jitter"]["mean"]["mm"], np.mean(second), 4)
        self.assertAlmostEqual(errors["network"]["jitter"]["max"]["mm"], np.max(second), 4)
        self.assertEqual((errors["skin"]["jitter"], errors["basis"]), (None, None))
        np.testing.assert_allclose(found.by_frame, np.stack([lengths.mean(1), lengths.max(1)], 1), rtol=1e-5)
        np.testing.assert_allclose(found.by_vertex, np.stack([lengths.mean(0), lengths.max(0)], 1), rtol=1e-5)
        worst = np.argsort(-lengths.mean(axis=1))[:5]
        self.assertEqual([one["frame"] for one in errors["worstFrames"]], list(data.frames[rows[worst]]))
        self.assertEqual(errors["worstVertices"][0]["vertex"], 40)
        self.assertAlmostEqual(errors["worstVertices"][1]["maxMm"], lengths[:, 4].max(), 4)

    def test_the_skin_of_a_set_that_does_not_have_it(self) -> None:
        with tempfile.TemporaryDirectory() as folder:
            for mode, skin in ((0, "base"), (1, None)):
                data = load_dataset(synthetic.make(Path(folder) / f"{mode}", frames=20, deltaMode=mode))
                errors = measured(data, np.arange(20), lambda controls: np.zeros((len(controls), 144), "f4")).errors
                self.assertEqual(errors["skin"], errors[skin] if skin else None)
                self.assertEqual(errors["base"]["mean"], errors["network"]["mean"])
                self.assertIsNone(errors["network"]["jitter"])
            synthetic.make(Path(folder) / "bad", frames=20, skin=np.full((20, 48), np.nan, "<f4"))
            with self.assertRaisesRegex(TrainerError, r"skin\.npy: frame 101 \(row 0\), control 0 is nan"):
                load_dataset(Path(folder) / "bad")


if __name__ == "__main__":
    unittest.main()
