# SPDX-License-Identifier: Apache-2.0
"""neuralwarp.train: a small training, its arguments, and Ctrl-C."""

import json
import re
import signal
import subprocess
import sys
import tempfile
import unittest
from pathlib import Path
from typing import Any

import numpy as np

import neuralwarp

COLUMNS, ROWS, FRAMES = 5, 4, 60


def data_set(folder: Path) -> Path:
    """A grid that bulges with the first of two controls and turns with the second."""
    u, v = (a.ravel() for a in np.meshgrid(np.linspace(-1, 1, COLUMNS), np.linspace(-1, 1, ROWS)))
    controls = np.random.default_rng(3).uniform(-1, 1, (FRAMES, 2))
    a, b = controls.T[:, :, None]
    deltas = 0.2 * np.stack([a * (1 - u**2), b * u, a * b * v], axis=2)
    folder.mkdir()
    (folder / "dataset.json").write_text(json.dumps({
        "format": "neuralWarp training data", "version": 1, "writtenBy": "test", "scene": "grid.json",
        "deformer": "warp", "geometry": "grid", "geometryIndex": 0, "frameCount": FRAMES, "controlCount": 2,
        "deltaCount": len(u), "deltaType": "dos", "deltaMode": 0, "smoothingIterations": 0,
        "subsetState": "complete", "affectCount": len(u), "fullCount": len(u), "componentTagExpression": "*",
        "controlNames": ["arm.bend", "arm.turn"], "controlRanges": [[-1.0, 1.0], [-1.0, 1.0]], "metersPerUnit": 0.01,
        "boundingBoxDiagonal": 10.0, "files": {name: f"{name}.npy" for name in ("controls", "deltas", "frames")},
        "train": {"outputModelName": "grid", "epochs": 4, "hiddenLayerCount": 1, "neuronsPerLayer": 4,
                  "principalShapesEnabled": False}}))
    np.save(folder / "controls.npy", controls.astype("<f4"))
    np.save(folder / "deltas.npy", deltas.astype("<f4"))
    np.save(folder / "frames.npy", np.arange(FRAMES, dtype="<i4"))
    return folder


# ends as Python does after a Ctrl-C; says when the first epochs are over
UNTIL_INTERRUPTED = """import neuralwarp, sys
def told(epoch, epochs, left): print("told", epoch, flush=True)
neuralwarp.train(sys.argv[1], sys.argv[2], epochs=int(sys.argv[3]), options=["--quarn", "none"], progress=told)
"""


class Training(unittest.TestCase):
    def setUp(self) -> None:
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = Path(folder.name).resolve()
        self.data, self.model = data_set(self.folder / "data"), self.folder / "grid.nwrp"

    def test_makes_a_model_and_says_how_far_it_is(self) -> None:
        told: list[tuple[int, int, float]] = []
        report = neuralwarp.train(self.data, self.model, epochs=6, seed=5, options=["--quarn", "none", "--direct"],
                                  report=self.folder / "said",
                                  progress=lambda epoch, epochs, left: told.append((epoch, epochs, left)))
        self.assertEqual(([epoch for epoch, *_ in told], {epochs for _, epochs, _ in told}), ([1, 2, 3, 4, 5, 6], {6}))
        self.assertEqual(told[-1][2], 0)
        self.assertTrue(all(left > 0 for *_, left in told[:-1]))
        self.assertEqual((report["seed"], report["epochs"]), (5, 6))
        self.assertEqual(json.loads((self.folder / "said" / "report.json").read_text())["seed"], 5)
        self.assertEqual(neuralwarp.Model.load(self.model).control_names, ["arm.bend", "arm.turn"])

    def test_refuses_what_the_trainer_does_not_take(self) -> None:
        given: list[tuple[dict[str, Any], type[Exception], str]] = [
            ({"dataset": self.folder}, FileNotFoundError, "dataset.json"),
            ({"epochs": 0}, ValueError, "epochs has to be a whole number from 1 on, not 0"),
            ({"seed": 1.5}, ValueError, "seed has to be a whole number from 0 on, not 1.5"),
            ({"options": "--direct"}, ValueError, "a list of words"),
            ({"options": ["--epochz", "3"]}, ValueError, "unrecognized arguments: --epochz"),
            ({"interpreter": self.folder / "python"}, ValueError, "which is no program"),
            ({"options": ["--threads", "0"]}, RuntimeError, "--threads is 0")]
        for change, kind, said in given:
            with self.subTest(change=change), self.assertRaisesRegex(kind, re.escape(said)):
                words: dict[str, Any] = {"dataset": self.data, "output": self.model, **change}
                neuralwarp.train(**words)
        self.assertFalse(self.model.exists())

    def test_ends_with_what_its_caller_raises(self) -> None:
        def stop(*_: object) -> None:
            raise KeyError("enough")
        with self.assertRaises(KeyError):
            neuralwarp.train(self.data, self.model, epochs=2000, options=["--quarn", "none"], progress=stop)
        self.assertEqual({path.name for path in self.folder.iterdir()} - {"grid.checkpoint"}, {"data"})

    def test_is_interrupted_with_the_best_so_far(self) -> None:
        words = [sys.executable, "-c", UNTIL_INTERRUPTED, str(self.data), str(self.model), "4000"]
        with subprocess.Popen(words, stdout=subprocess.PIPE, stderr=subprocess.PIPE, encoding="utf-8") as run:
            assert run.stdout and run.stderr
            self.assertEqual(run.stdout.readline(), "told 200\n")
            run.send_signal(signal.SIGINT)
            said = run.stderr.read()
        self.assertIn("KeyboardInterrupt", said)
        metadata = json.loads((self.model / "metadata.json").read_text())
        self.assertGreaterEqual(metadata["interruptedAfterEpochs"], 200)
