# SPDX-License-Identifier: Apache-2.0
"""Principal shapes within a budget: what is kept, what it costs, and that all readers have the same numbers."""

import json
import tempfile
import unittest
from dataclasses import replace
from pathlib import Path
from typing import Any

import numpy as np

import synthetic
from trainer import pipeline
from trainer.budget import nearest, rounded
from trainer.dataset import Dataset, load_dataset
from trainer.errors import TrainerError


class BudgetTest(unittest.TestCase):
    def setUp(self) -> None:
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.place = Path(folder.name)
        self.said: list[str] = []

    def train(self, dataset: Dataset, **changes: Any) -> dict[str, Any]:
        settings = replace(dataset.settings, **{"principalShapesEnabled": True, "principalShapesAccuracy": 0.999,
                                                "principalShapesLimit": 20, "epochs": 2, "validationRatio": 0.0,
                                                **changes})
        self.said = []
        return pipeline.train(pipeline.Job(dataset, settings, 1, 1, self.place / "model.nwrp", self.place / "report",
                                           None, self.said.append, False))

    def text(self) -> np.ndarray:
        """The shapes of the JSON, float32 [S, 3 * D]."""
        return np.array(json.loads((self.place / "model.nwrp/principal_shapes.json").read_text())["principalShapes"],
                        np.float32)

    def archive(self) -> dict[str, np.ndarray]:
        with np.load(self.place / "model.nwrp/principal_shapes.npz") as arrays:
            return dict(arrays)

    def test_the_error_stays_in_the_budget_and_the_budget_is_used(self) -> None:
        dataset = load_dataset(synthetic.make(self.place / "data", frames=60))
        deltas = np.asarray(dataset.deltas, np.float64)
        self.train(dataset)
        whole = self.text()
        best = np.linalg.lstsq(whole.T.astype(float), deltas.T, rcond=None)[0].T @ whole
        millimetres = 1000 * dataset.description["metersPerUnit"]
        base = float(np.linalg.norm(deltas.reshape(-1, 3), axis=1).mean()) * millimetres
        sizes = [len(whole) * whole.shape[1] * 4]
        for part in (0.003, 0.03, 0.3):
            with self.subTest(part=part):
                report = self.train(dataset, principalShapesBudget=part * base)
                shapes, arrays = self.text(), self.archive()
                kept = np.linalg.lstsq(shapes.T.astype(float), deltas.T, rcond=None)[0].T @ shapes
                off = float(np.linalg.norm((kept - best).reshape(-1, 3), axis=1).mean()) * millimetres
                self.assertLessEqual(off, part * base * 1.001)
                self.assertGreater(off, part * base * 0.8)  # a few shapes of few vertices go in steps
                self.assertAlmostEqual(report["basisBudget"]["added"]["mean"]["mm"], off, delta=0.03 * off)
                self.check_archive(arrays, shapes)
                sizes.append(sum(array.nbytes for name, array in arrays.items() if name.startswith("shapes")))
                self.assertLess(report["explained"], 1)
        self.assertEqual(sizes, sorted(sizes, reverse=True))
        self.assertLess(sizes[-1], sizes[0] / 4)
        self.assertEqual((report["principalShapes"], report["basisBudget"]["of"]), (len(shapes), len(whole)))
        self.assertLess(len(shapes), len(whole))
        self.assertLess(report["explained"], 0.999)

    def check_archive(self, arrays: dict[str, np.ndarray], shapes: np.ndarray) -> None:
        """It gives the JSON's numbers, to the bit, by one multiplication."""
        self.assertEqual([arrays[name].dtype.str for name in ("shapes_int16", "shapes_int8", "scales")],
                         ["<i2", "|i1", "<f4"])
        numbers = np.concatenate([arrays["shapes_int16"].astype(np.int16), arrays["shapes_int8"]], axis=1)
        np.testing.assert_array_equal(numbers, numbers.astype(np.float16))  # readers keep halves
        products = numbers.astype(np.float32) * arrays["scales"][:, None]
        by_shape = np.ascontiguousarray(products.transpose(1, 0, 2)).reshape(shapes.shape)
        np.testing.assert_array_equal(by_shape.view(np.uint32), shapes.view(np.uint32))

    def test_the_network_learns_the_best_coefficients_of_what_is_kept(self) -> None:
        dataset = load_dataset(synthetic.make(self.place / "data", frames=40))
        job = pipeline.Job(dataset, replace(dataset.settings, principalShapesEnabled=True, principalShapesBudget=5.0,
                                            principalShapesAccuracy=0.99), 1, 1, self.place, self.place, None,
                           self.said.append, False)
        targets = pipeline.make_targets(job, np.arange(40))
        assert targets.shapes is not None
        left = np.asarray(dataset.deltas) - targets.of(np.arange(40)) @ targets.shapes
        across = np.abs(left @ targets.shapes.T)  # at right angles to each shape
        lengths = np.linalg.norm(np.asarray(dataset.deltas), axis=1)[:, None] * np.linalg.norm(targets.shapes, axis=1)
        self.assertLess(np.max(across / lengths), 1e-5)

    def test_numbers_of_any_size(self) -> None:
        random = np.random.default_rng(3)
        shapes = (random.standard_normal((6, 300)) * 10.0 ** np.array([[-38], [-3], [0], [4], [30], [0]])).astype("<f4")
        shapes[5] = 0
        packed = rounded(shapes, np.ones(6), 1e-6)
        wide = np.abs(packed.numbers.astype(int)).max(axis=1) > 127
        self.assertEqual(packed.large(), int(wide.sum()))
        np.testing.assert_array_equal(wide, np.sort(wide)[::-1])  # those of two bytes are the first
        np.testing.assert_array_equal(packed.numbers, packed.numbers.astype(np.float16))
        kept = shapes[[1, 2, 3, 4]]  # the smallest is none, nor is that of zeros
        self.assertEqual(len(packed.numbers), 4)
        off = np.abs(packed.decoded() - kept).max(axis=1)
        np.testing.assert_array_less(off, np.maximum(0.51e-6, np.abs(kept).max(axis=1) / 2**11))

    def test_alike_shapes_have_coefficients(self) -> None:
        shapes = np.array([[1, 2, 0], [1, 2, 0], [0, 0, 3]], np.float32)
        found = nearest(shapes)(np.array([[2, 4, 6]], np.float32))
        np.testing.assert_allclose(found, [[1, 1, 2]], atol=1e-5)

    def test_a_budget_that_cannot_be_had(self) -> None:
        dataset = load_dataset(synthetic.make(self.place / "data", frames=20))
        report = self.train(dataset, principalShapesBudget=1e-9)
        self.assertIsNone(report["basisBudget"])
        self.assertTrue(any("a budget of 1e-09 mm leaves the shapes as they are" in line for line in self.said))
        self.assertEqual(self.archive()["shapes"].dtype.str, "<f4")
        for changes, wanted in (({"principalShapesEnabled": False}, "give --principal-shapes as well"),
                                ({"principalShapesHalf": True}, "--basis-budget and --half-shapes are two ways")):
            with self.assertRaisesRegex(TrainerError, wanted):
                self.train(dataset, principalShapesBudget=0.1, **changes)


if __name__ == "__main__":
    unittest.main()
