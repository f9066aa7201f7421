# SPDX-License-Identifier: Apache-2.0
"""The row at rest is trained on, and often enough."""

import math
import tempfile
import unittest
from collections import Counter
from dataclasses import replace
from pathlib import Path

import numpy as np

import synthetic
from trainer.checkpoint import Checkpoints
from trainer.dataset import load_dataset
from trainer.device import Device
from trainer.network import build
from trainer.rest import with_rest
from trainer.settings import Settings
from trainer.split import Split, split_rows
from trainer.training import fit

ROWS = 1000


class RestTest(unittest.TestCase):
    def test_wherever_it_lies(self) -> None:
        with tempfile.TemporaryDirectory() as place:
            data = load_dataset(synthetic.make(Path(place) / "data", frames=ROWS))
        for ratio in (0.0, 0.2, 0.99):
            plain = split_rows(data, ratio, 1)
            held = np.concatenate([plain.validation, plain.test])
            for rest in (np.arange(0), plain.train[-1:], held[:1], held[-1:], held[-2:], plain.train[::3]):
                deltas = np.array(data.deltas)
                deltas[rest] = 1e-8  # what is left of single precision
                found = with_rest(replace(data, deltas=deltas), plain)
                with self.subTest(ratio=ratio, rest=len(rest)):
                    parts = np.concatenate([found.train, found.validation, found.test])
                    self.assertEqual(sorted(parts), list(range(ROWS)))
                    self.assertLessEqual(len(np.setxor1d(found.train, plain.train)), 1)
                    self.assertTrue(np.isin(found.again, rest).all())
                    trained = np.isin(rest, found.train).sum()
                    self.assertEqual(trained > 0, len(rest) > 0)
                    self.assertEqual(trained + len(found.again),
                                     max(trained, -(-len(found.train) // 100)) if trained else 0)

    def test_no_part_is_left_empty(self) -> None:
        with tempfile.TemporaryDirectory() as place:
            data = load_dataset(synthetic.make(Path(place) / "data", frames=3))
        plain = Split(np.array([0]), np.array([1]), np.array([2]), "random")
        deltas = np.array(data.deltas)
        deltas[2] = 0
        found = with_rest(replace(data, deltas=deltas), plain)
        self.assertEqual([list(part) for part in found[:3]], [[0], [1], [2]])
        self.assertEqual(len(found.again), 0)

    def test_an_epoch_has_it_so_often(self) -> None:
        seen: Counter[int] = Counter()

        def targets_of(rows: np.ndarray) -> np.ndarray:
            seen.update(rows.tolist())
            return np.zeros((len(rows), 1), np.float32)

        split = Split(np.array([0, 1, 2]), np.arange(0), np.arange(0), "none", again=np.array([2, 2]))
        settings = Settings(epochs=4, batchSize=2, neuronsPerLayer=1)
        fit(build(settings, 1, 1, np.zeros(1, bool)), np.ones((3, 1), np.float32), targets_of, split, settings, 1,
            lambda history: None, lambda: 0, Device("cpu"), Checkpoints(Path(), {}, math.inf, print, False))
        self.assertEqual(seen, {0: 4, 1: 4, 2: 12})


if __name__ == "__main__":
    unittest.main()
