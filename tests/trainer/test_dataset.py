# SPDX-License-Identifier: Apache-2.0
"""Data sets that are not what they should be, and settings beyond their limits."""

import json
import tempfile
import unittest
from pathlib import Path
from typing import Any, Callable

import numpy as np

import synthetic
from trainer.dataset import load_dataset
from trainer.errors import TrainerError
from trainer.settings import Settings, override

Change = Callable[[Path], Any]  # of a data set, in its folder


def described(**changes: object) -> Change:
    """Changes keys of dataset.json; None takes a key away."""
    def change(folder: Path) -> None:
        path = folder / "dataset.json"
        description = json.loads(path.read_text())
        description.update(changes)
        path.write_text(json.dumps({key: value for key, value in description.items() if value is not None}))
    return change


def written(name: str, make: Callable[[np.ndarray], np.ndarray]) -> Change:
    def change(folder: Path) -> None:
        np.save(folder / name, make(np.load(folder / name)))
    return change


def cut(name: str, size: int) -> Change:
    def change(folder: Path) -> None:
        (folder / name).write_bytes((folder / name).read_bytes()[:size])
    return change


def appended(name: str) -> Change:
    return lambda folder: (folder / name).write_bytes((folder / name).read_bytes() + b"x")


def with_value(at: object, value: float) -> Callable[[np.ndarray], np.ndarray]:
    def make(array: np.ndarray) -> np.ndarray:
        array[at] = value
        return array
    return make


def pickled(folder: Path) -> None:
    with open(folder / "deltas.npy", "wb") as file:
        np.lib.format.write_array(file, np.array([{}], object), allow_pickle=True)


HOSTILE: list[tuple[Change, str]] = [
    (lambda folder: (folder / "dataset.json").unlink(), "has no dataset.json (only a complete one has)"),
    (lambda folder: (folder / "dataset.json").write_text("{"), "dataset.json is not JSON"),
    (lambda folder: (folder / "dataset.json").write_text("[" * 100000), "dataset.json is not JSON"),
    (lambda folder: (folder / "dataset.json").write_text("[]"), "not a JSON object"),
    (described(format="other"), "format is 'other', not 'neuralWarp training data'"),
    (described(version=2), "version is 2, not 1"),
    (described(frameCount=0), "frameCount is 0, not a whole number from 1"),
    (described(frameCount=2.0), "frameCount is 2.0"),
    (described(frameCount=None), "frameCount is 'missing'"),
    (described(controlCount=True), "controlCount is True"),
    (described(deltaCount=2**40), "deltaCount is 1099511627776"),
    (described(deltaMode=2), "deltaMode is 2, not 0 (Offset) or 1 (Surface)"),
    (described(smoothingIterations=-1), "smoothingIterations is -1"),
    (described(subsetState="some"), "subsetState is 'some', not complete"),
    (described(subsetState="empty"), "deltaCount is 48, not 0"),
    (described(fullCount=50), "deltaCount is 48, not the 50 of fullCount"),
    (described(affectCount=47), "affectCount is 47, not the 48 of deltaCount"),
    (described(subsetState="partial"), "affectMap is not a list"),
    (described(subsetState="partial", affectMap=[0] * 47), "affectMap has 47 entries"),
    (described(subsetState="partial", affectMap=[0] * 48), "affectMap names a vertex twice"),
    (described(subsetState="partial", affectMap=[*range(47), 48]), "affectMap[47] is 48, not a vertex below"),
    (described(subsetState="partial", affectMap=[*range(47), -1]), "affectMap[47] is -1"),
    (described(metersPerUnit="1"), "metersPerUnit is '1', not a number"),
    (described(boundingBoxDiagonal=float("nan")), "boundingBoxDiagonal is nan"),
    (described(controlNames=["a"]), "controlNames is ['a'], not a list of 3 texts"),
    (described(files={"controls": "../controls.npy"}), "files.controls is '../controls.npy'"),
    (described(files=[]), "files is [], not an object"),
    (lambda folder: (folder / "frames.npy").unlink(), "frames.npy is missing"),
    (described(train=[]), "train is []"),
    (described(train={"epochs": 1.5}), "train.epochs is 1.5, not a whole number"),
    (described(train={"epochs": 0}), "train.epochs is 0, not between 1 and 100000"),
    (described(train={"activationFunction": "Swish"}), "train.activationFunction is 'Swish', not one of Sigmoid"),
    (described(train={"preloadData": 1}), "train.preloadData is 1, not true or false"),
    (cut("deltas.npy", 1000), "deltas.npy is not a whole .npy file"),
    (cut("deltas.npy", 0), "deltas.npy is not a whole .npy file"),
    (appended("controls.npy"), "controls.npy has 1 bytes after its array"),
    (pickled, "deltas.npy is not a whole .npy file"),
    (written("deltas.npy", lambda a: a.astype("<f8")), "deltas.npy holds float64, not float32"),
    (written("controls.npy", np.asfortranarray), "in C order"),
    (written("frames.npy", lambda a: a[:-1]), "frames.npy has the shape [159], not the [160] of dataset.json"),
    (written("deltas.npy", lambda a: a.reshape(160, 24, 6)), "deltas.npy has the shape [160, 24, 6]"),
    (written("deltas.npy", with_value((12, 3, 2), np.nan)), "frame 113 (row 12), vertex 3, axis 2 is nan"),
    (written("controls.npy", with_value((5, 1), -np.inf)), "frame 106 (row 5), control 1 is -inf"),
]


class DatasetTest(unittest.TestCase):
    def test_what_is_wrong_is_named(self) -> None:
        for spoil, wanted in HOSTILE:
            with self.subTest(wanted), tempfile.TemporaryDirectory() as place:
                folder = synthetic.make(Path(place) / "data")
                spoil(folder)
                with self.assertRaises(TrainerError) as caught:
                    load_dataset(folder)
                self.assertIn(wanted, str(caught.exception))
                self.assertIn(str(folder), str(caught.exception))
                self.assertNotIn("\n", str(caught.exception))

    def test_digest_follows_every_file(self) -> None:
        with tempfile.TemporaryDirectory() as place:
            folder = synthetic.make(Path(place) / "data")
            digests = [load_dataset(folder).digest]
            for change in (described(scene="other.json"), written("deltas.npy", with_value((0, 0, 0), 9)),
                           written("controls.npy", with_value((0, 0), 9)), written("frames.npy", with_value(0, 9))):
                change(folder)
                digests.append(load_dataset(folder).digest)
            self.assertEqual(len(set(digests)), 5)
            self.assertEqual(load_dataset(folder).digest, digests[-1])

    def test_partial_subset_knows_its_vertices(self) -> None:
        with tempfile.TemporaryDirectory() as place:
            dataset = load_dataset(synthetic.make(Path(place) / "data", affect=[40, 3, 17]))
            self.assertEqual([dataset.vertex(slot) for slot in range(3)], [40, 3, 17])

    def test_settings_that_cannot_work(self) -> None:
        for name, value in (("learningRate", 0.0), ("learningRate", float("nan")), ("dropoutRatio", 1.0),
                            ("validationRatio", 1.0), ("batchSize", 0), ("principalShapesLimit", 501)):
            with self.subTest(name, value=value), self.assertRaises(TrainerError):
                override(Settings(), {name: value}, str)
        self.assertEqual(override(Settings(), {"activationFunction": "leakyrelu"}, str).activationFunction, "LeakyReLU")


if __name__ == "__main__":
    unittest.main()
