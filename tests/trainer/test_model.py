# SPDX-License-Identifier: Apache-2.0
"""What is learned and what is written, against NumPy and against the data."""

import json
import tempfile
import unittest
from dataclasses import replace
from pathlib import Path
from typing import Any, Optional
from unittest import mock

import numpy as np
import onnx
import torch
import xxhash

import synthetic
from trainer import export, halves, limits, memory, pipeline, shapes
from trainer.dataset import load_dataset
from trainer.errors import TrainerError
from trainer.evaluator import ModelDirectory, NumpyModel
from trainer.line import best_line
from trainer.measure import Distances, advice, lengths_of
from trainer.neighbourhoods import plugs_of, seen_by_neurons, shares
from trainer.network import build, check_size
from trainer.plausible import doubts
from trainer.schedule import Schedule
from trainer.settings import ACTIVATIONS, Settings


class ModelTest(unittest.TestCase):
    def setUp(self) -> None:
        place = tempfile.TemporaryDirectory()
        self.addCleanup(place.cleanup)
        self.place = Path(place.name)
        self.said: list[str] = []

    def train(self, data: Path, name: str = "model", **changes: Any) -> dict[str, Any]:
        dataset = load_dataset(data)
        job = pipeline.Job(dataset, replace(dataset.settings, **changes), 1, 1, self.place / f"{name}.nwrp",
                           self.place / f"{name}.report", None, self.said.append, False)
        return pipeline.train(job)

    def read(self, name: str) -> Any:
        return json.loads((self.place / name).read_text())

    def test_errors_fall_well_below_the_base(self) -> None:
        data = synthetic.make(self.place / "data")
        motion = load_dataset(synthetic.make(self.place / "motion", seed=8, frames=50))
        variants: list[dict[str, Any]] = [
                        {}, {"principalShapesEnabled": True, "principalShapesAccuracy": 0.999},
                        {"preloadData": False}, {"validationRatio": 0.0}, {"activationFunction": "Tanh"},
                        {"activationFunction": "SiLU", "linearPath": True, "localNeurons": True}]
        for changes in variants:
            with self.subTest(changes):
                report = self.train(data, **changes)
                errors = report["errors"]
                self.assertLess(errors["network"]["mean"]["mm"], 0.25 * errors["base"]["mean"]["mm"])
                self.assertEqual(report["heldOut"], "validationRatio" not in changes)
                self.assertEqual(self.read("model.report/report.json"), json.loads(json.dumps(report)))
                self.assertEqual(report["sizes"], {path.name: path.stat().st_size
                                                   for path in (self.place / "model.nwrp").iterdir()})
                head, *losses = (self.place / "model.report/losses.csv").read_text().splitlines()
                best = losses[report["bestEpoch"] - 1].split(",")
                self.assertEqual((head, len(losses)), ("epoch,training,validation", report["epochs"]))
                self.assertEqual(float(best[2] or best[1]), report["bestLoss"])
                self.assertTrue((self.place / "model.report/loss.png").read_bytes().startswith(b"\x89PNG"))
                # the published files alone, on poses that were in no training
                model = ModelDirectory(self.place / "model.nwrp", None)
                model.check_fits(motion)
                left = np.abs(model.deltas(motion.controls) - motion.deltas).mean()
                self.assertLess(left, 0.3 * np.abs(motion.deltas).mean())

    def test_every_activation_exports_what_was_trained(self) -> None:
        # pipeline.train() itself compares the file with PyTorch; a comparison that cannot fail would show here
        data = synthetic.make(self.place / "data", frames=30)
        for activation in ACTIVATIONS:
            for layers in (1, 3):
                with self.subTest(activation, layers=layers):
                    self.train(data, activationFunction=activation, hiddenLayerCount=layers, linearPath=layers == 3,
                               epochs=2, dropoutRatio=0.2)

        def spoiled(parameter: Any, scale: float) -> np.ndarray:
            return 1.001 * parameter.detach().numpy() * scale

        with mock.patch.object(export, "scaled", spoiled), self.assertRaisesRegex(TrainerError, "is not published"):
            self.train(data, "other", epochs=2)
        self.assertFalse(any(self.place.glob("other*")))

    def test_graph_is_of_the_form_that_the_deformer_reads(self) -> None:
        self.train(synthetic.make(self.place / "data", frames=20), epochs=1)
        graph = NumpyModel(self.place / "model.nwrp/model.onnx").graph
        dims = [[d.dim_value for d in value.type.tensor_type.shape.dim] for value in (graph.input[0], graph.output[0])]
        self.assertEqual((graph.input[0].name, graph.output[0].name, dims), ("controls", "deltas", [[3], [144]]))

    def test_small_networks_ask_for_one_thread(self) -> None:
        entry = {"ort_config": '{"session_options": {"intra_op_num_threads": 1}}'}
        self.train(synthetic.make(self.place / "data", frames=20), epochs=1)
        # these outputs and one more weight: 16 MB are no less
        for model, wanted in ((onnx.load(self.place / "model.nwrp/model.onnx"), [entry]),
                              (export.zero_model(1, 3_999_998), [entry]), (export.zero_model(1, 3_999_999), [])):
            self.assertEqual([{prop.key: prop.value} for prop in model.metadata_props], wanted)

    def test_metadata_of_a_partial_subset(self) -> None:
        affect = [40, 3, 17, 21]
        report = self.train(synthetic.make(self.place / "data", affect=affect), epochs=2)
        metadata = self.read("model.nwrp/metadata.json")
        wanted = {"subsetState": "partial", "affectMap": affect, "affectCount": 4, "deltaCount": 4, "fullCount": 48,
                  "deltaMode": 1, "smoothingIterations": 2, "geometry": "grid", "componentTagExpression": "*"}
        self.assertEqual({key: metadata[key] for key in wanted}, wanted)
        self.assertIn(report["errors"]["network"]["worstVertex"], affect)
        self.assertTrue(101 <= report["errors"]["network"]["worstFrame"] < 261)

    def test_a_control_that_never_moves_has_no_influence(self) -> None:
        data = synthetic.make(self.place / "data", constant_control=True)
        self.train(data, epochs=3, linearPath=True)
        self.assertTrue(any("never move" in line and "joint3.rotateX" in line for line in self.said))
        model = ModelDirectory(self.place / "model.nwrp", None)
        controls = load_dataset(data).controls[:5]
        moved = controls + np.array([0, 0, 0, 100], np.float32)
        np.testing.assert_array_equal(model.deltas(controls), model.deltas(moved))

    def test_shapes_of_half_precision_are_said_to_be_off(self) -> None:
        data = synthetic.make(self.place / "data", frames=30)
        whole = self.train(data, epochs=3, principalShapesEnabled=True)
        with np.load(self.place / "model.nwrp/principal_shapes.npz") as archive:
            floats = archive["shapes"]
        half = self.train(data, epochs=3, principalShapesEnabled=True, principalShapesHalf=True)
        with np.load(self.place / "model.nwrp/principal_shapes.npz") as archive:
            off = archive["shapes"].astype(np.float32) * archive["scales"][:, None] - floats
        self.assertIsNone(whole["halfPrecision"])
        lost = half["halfPrecision"]["max"]["mm"]
        self.assertTrue(any(f"{lost:.2g} mm at most" in line for line in self.said))
        # coefficients have a root mean square of 1 over rows and shapes
        bound = float(np.linalg.norm(off, axis=2).max()) * (30 * off.shape[1])**0.5 * off.shape[1]**0.5
        self.assertGreater(lost, 0)
        self.assertLess(lost, 1000 * bound * load_dataset(data).description["metersPerUnit"])
        with self.assertRaisesRegex(TrainerError, "give --principal-shapes as well"):
            self.train(data, principalShapesHalf=True)

    def test_small_and_empty_data(self) -> None:
        self.assertEqual(self.train(synthetic.make(self.place / "one", frames=1), epochs=3)["heldOut"], False)
        self.train(synthetic.make(self.place / "two", frames=2), epochs=3, principalShapesEnabled=True)
        still = synthetic.make(self.place / "still")
        np.save(still / "deltas.npy", np.zeros((160, 48, 3), "<f4"))
        with self.assertRaisesRegex(TrainerError, "every delta .* is 0"):
            self.train(still)

    def test_deltas_that_look_like_no_corrections_are_said(self) -> None:
        # of the set as it is, the mean is a few hundredths of the diagonal
        cases: list[tuple[dict[str, Any], str]] = [
            ({}, ""), ({"boundingBoxDiagonal": 0.5}, "of the character's diagonal"),
            ({"boundingBoxDiagonal": 0}, ""), ({"targetFit": {"follows": True, "motion": 0.01}}, ""),
            ({"targetFit": {"follows": False, "motion": 9.0}}, "do not go with the poses"),
            ({"targetFit": {"follows": None, "motion": 0.01}}, "larger than what the skin moves"),
            ({"targetFit": {"follows": None, "motion": 0}}, ""),
            ({"targetFit": {"follows": None, "motion": 9}}, ""), ({"targetFit": [{"motion": "x"}]}, "")]
        for number, (changes, wanted) in enumerate(cases):
            said = " ".join(doubts(load_dataset(synthetic.make(self.place / f"{number}", frames=9, **changes))))
            self.assertIn(wanted, said)
            self.assertEqual(bool(wanted), bool(said), (changes, said))
        self.train(self.place / "1", epochs=1)
        self.assertIn("of the character's diagonal", self.said[0])

    def test_training_ends_early_with_small_steps_and_keeps_the_best(self) -> None:
        data = synthetic.make(self.place / "data", frames=30)
        rates: list[float] = []
        rate = Schedule.at

        def noted(schedule: Schedule, step: int, steps: int) -> float:
            rates.append(rate(schedule, step, steps))
            return rates[-1]

        for epochs, patience, wanted in ((50, 3, 7), (50, 40, 50), (8, 3, 7), (6, 3, 6), (5, 4, 5), (5, 9, 5)):
            rates.clear()
            # nothing gets better than the first epoch
            with mock.patch.object(Schedule, "at", noted), mock.patch("trainer.training.mean_loss", lambda *_: 1.0):
                report = self.train(data, epochs=epochs, patience=patience, batchSize=4, learningRate=0.01)
            self.assertEqual((report["epochs"], report["bestEpoch"]), (wanted, 1))
            falls = -np.diff(rates, append=0)  # evenly: no leap, neither where the last phase begins nor at the end
            self.assertTrue((falls > 0).all() and falls.max() < 4 * 0.01 / min(wanted, patience) / 6, (rates, wanted))
            self.assertEqual(rates[0], 0.01)
        with mock.patch("trainer.training.mean_loss", lambda *_: float("nan")):
            with self.assertRaisesRegex(TrainerError, "epoch 1 is nan.*learning rate below 0.003"):
                self.train(data)

    def test_data_that_does_not_fit_stays_on_the_disk(self) -> None:
        data = synthetic.make(self.place / "data", frames=40)
        self.train(data, epochs=2)
        held = (self.place / "model.nwrp/model.onnx").read_bytes()
        with mock.patch.object(memory, "available", lambda: 1000):
            self.train(data, epochs=2)
        self.assertTrue(any("do not fit" in line for line in self.said))
        self.assertEqual((self.place / "model.nwrp/model.onnx").read_bytes(), held)


class ShapesTest(unittest.TestCase):
    def test_fewest_shapes_by_limit_and_accuracy(self) -> None:
        """Against NumPy's own decomposition, for tall, wide and (by a smaller limit) randomized cases."""
        with tempfile.TemporaryDirectory() as place:
            for frames in (20, 160, 400):
                dataset = load_dataset(synthetic.make(Path(place) / str(frames), frames=frames))
                rows = np.arange(0, frames, 2)
                _, values, vectors = np.linalg.svd(dataset.deltas[rows].astype(float), full_matrices=False)
                parts = np.cumsum(values**2) / np.sum(values**2)
                for exact_side in (shapes.EXACT_SIDE, 1):
                    for limit, accuracy in ((20, 0.8), (20, 0.95), (2, 1.0), (1, 0.0), (500, 0.9999)):
                        with self.subTest(frames=frames, side=exact_side, limit=limit, accuracy=accuracy), \
                                mock.patch.object(shapes, "EXACT_SIDE", exact_side), \
                                mock.patch.object(shapes, "LARGE_BLOCK", 9000), \
                                mock.patch("trainer.dataset.BLOCK_BYTES", 5000):  # 15 rows, and 8
                            basis = shapes.principal_basis(dataset, rows, limit, accuracy, 1)
                            count = min(limit, int(np.searchsorted(parts, accuracy)) + 1)
                            self.check(basis, count, parts, vectors)

    def check(self, basis: shapes.Basis, count: int, parts: np.ndarray, vectors: np.ndarray) -> None:
        self.assertEqual(len(basis.shapes), count)
        self.assertAlmostEqual(basis.explained, parts[count - 1], places=7)
        np.testing.assert_allclose(basis.shapes @ basis.shapes.T, np.eye(count), atol=1e-5)
        # the same space: the shapes' own and NumPy's differ by sign only
        np.testing.assert_allclose(np.abs(np.sum(basis.shapes * vectors[:count], axis=1)), 1, atol=1e-3)
        self.assertTrue((np.max(basis.shapes, axis=1) >= -np.min(basis.shapes, axis=1)).all())

    def test_text_of_shapes_gives_the_same_floats(self) -> None:
        random = np.random.default_rng(3)
        values = (random.standard_normal((3, 300)) * 10.0 ** random.integers(-30, 30, (3, 300))).astype(np.float32)
        with tempfile.TemporaryDirectory() as place:
            export.write_shapes(Path(place), values)
            text = (Path(place) / "principal_shapes.json").read_bytes()
            read = json.loads(text)
            with np.load(Path(place) / "principal_shapes.npz") as archive:
                by_vertex, digits = archive["shapes"], archive["json_xxh3_128"]
        self.assertEqual((read["principalShapeCount"], read["principalVertCount"]), (3, 100))
        np.testing.assert_array_equal(np.array(read["principalShapes"], np.float32), values)
        np.testing.assert_array_equal(by_vertex.reshape(100, 3, 3).swapaxes(0, 1).reshape(3, 300), values)
        self.assertEqual(by_vertex.dtype, np.dtype("<f4"))
        self.assertEqual(digits.item(), xxhash.xxh3_128_hexdigest(text).encode())

    def test_halves_are_the_numbers_of_the_text(self) -> None:
        random = np.random.default_rng(3)
        values = (random.standard_normal((6, 300)) * 10.0 ** np.array([[-38], [-3], [0], [4], [30], [0]])).astype("<f4")
        values[5] = 0
        values[1, :9] *= np.float32(1e-9)  # below the least half that there is: some are -0
        made = halves.to_halves(values)
        decoded = made.decoded()
        np.testing.assert_array_less(np.abs(decoded - values).max(axis=1)[1:5], np.abs(values).max(axis=1)[1:5] / 2**11)
        with tempfile.TemporaryDirectory() as place:
            export.write_shapes(Path(place), decoded, made)
            read = json.loads((Path(place) / "principal_shapes.json").read_text())["principalShapes"]
            with np.load(Path(place) / "principal_shapes.npz") as archive:
                stored = archive["shapes"].astype(np.float32) * archive["scales"][:, None]
                self.assertEqual(archive["shapes"].dtype, np.dtype("<f2"))
        by_shape = np.ascontiguousarray(stored.transpose(1, 0, 2)).reshape(6, 300)
        np.testing.assert_array_equal(np.array(read, np.float32).view(np.uint32), by_shape.view(np.uint32))


class AdviceTest(unittest.TestCase):
    def test_says_what_the_errors_mean(self) -> None:
        def stage(mean: float, p99: float) -> dict[str, dict[str, float]]:
            return {"mean": {"mm": mean}, "p99": {"mm": p99}, "p9999": {"mm": p99}}

        stages = {"skin": stage(4, 12), "base": stage(6, 15)}
        for network, wanted in ((stage(1, 3), r"\A\Z"), (stage(1, 13), r"\(p99 and p99.99\)"),
                                (stage(5, 13), r"more than the skin would \(mean and p99 and p99.99\)")):
            self.assertRegex(" ".join(advice({**stages, "network": network})), wanted)
        said = advice({**stages, "skin": None, "network": stage(1, 16)})
        self.assertRegex(said[0], r"more than zero deltas would \(p99 and p99.99\)")

    def test_says_what_the_limit_is(self) -> None:
        def report(basis: Optional[float], network: float, trained: float, held_out: bool = True) -> dict[str, Any]:
            def stage(mean: float) -> dict[str, Any]:
                return {"mean": {"mm": mean}, "p9999": {"mm": 4 * mean}}

            errors = {"basis": None if basis is None else stage(basis), "network": stage(network)}
            return {"errors": errors, "trainedRows": stage(trained), "line": stage(7), "explained": 0.87,
                    "settings": vars(Settings()), "limit": limits.limit(errors, stage(trained), held_out)}

        for given, wanted in ((report(1, 1.4, 0.5), r"shapes are the limit: .* 0.8 and at most 20 .* 87 %"),
                              (report(1, 1.5, 0.9), "poses are the limit: .* 0.9 mm .* 1.5 mm on others"),
                              (report(1, 1.5, 1.1), "network is the limit"), (report(None, 1.5, 0.9), "poses are"),
                              (report(1, 1.5, 0.9, False), r"28 mm at p99.99\Z")):
            self.assertRegex(" ".join(limits.sentences(given)), "leaves 7 mm in the mean, .*" + wanted)


class LineTest(unittest.TestCase):
    def setUp(self) -> None:
        random = np.random.default_rng(3)
        self.controls = random.standard_normal((60, 5)).astype(np.float32)
        self.controls[:, 2] = 0
        self.still = np.arange(5) == 2
        # controls 0 and 1 are one joint and move vertices 0 to 9; 3 moves 8 to 19, 4 moves 20 to 29
        self.weights = np.zeros((5, 30, 3), np.float32)
        self.weights[:2, :10], self.weights[3, 8:20], self.weights[4, 20:] = 1, 2, 3
        self.targets = (self.controls @ self.weights.reshape(5, -1) + 5).astype(np.float32)

    def test_is_what_numpy_finds(self) -> None:
        rows = np.arange(0, 60, 2)
        found = best_line(self.controls, lambda some: self.targets[some], rows, self.still)
        np.testing.assert_allclose(found.weights.T, self.weights.reshape(5, -1), atol=1e-2)
        np.testing.assert_allclose(found.outputs(self.controls), self.targets, atol=3e-2)

    def test_neurons_see_what_moves_the_same_vertices(self) -> None:
        plugs = plugs_of(["a.m:0", "a.m:1", "b.m:0", "c.slider", "d.slider"])
        self.assertEqual([plug.tolist() for plug in plugs], [[0, 1], [2], [3], [4]])
        flat = self.weights.reshape(5, -1)
        for line, basis in ((flat.T.copy(), None), (np.eye(5, dtype=np.float32), flat)):
            near = shares(line, basis, plugs)
            # of its ten vertices joint a shares two with slider c, whose 2 is more than a's sqrt(2) there
            self.assertAlmostEqual(near[0, 2], 2 / (8 + 2 * 2**0.5 / 2), places=5)
            self.assertEqual((near[0, 3], near[1].max(), near[3, 3]), (0, 0, 1))
            seen = seen_by_neurons(near, plugs, 5, 8)
            wide, c, d = [True] * 5, [False] * 3 + [True, False], [False] * 4 + [True]
            self.assertEqual(seen[:6].tolist(), 2 * [[True, True, False, False, False], c, d])
            self.assertEqual(seen[6:].tolist(), [wide, wide])

    def test_networks_begin_at_the_line_and_neurons_stay_blind(self) -> None:
        line = best_line(self.controls, lambda some: self.targets[some], np.arange(60), self.still)
        settings = Settings(neuronsPerLayer=12, activationFunction="SiLU", linearPath=True)
        seen = np.arange(5) % 3 == np.arange(12)[:, None] % 3
        network = build(settings, 5, 90, self.still, line, seen)
        inputs, targets = torch.from_numpy(self.controls), torch.from_numpy(self.targets)
        with torch.no_grad():
            self.assertLess(float((network(inputs) - targets).abs().max()), 0.3)
        first = network.chain[0].weight
        adam = torch.optim.Adam(network.parameters(), lr=0.01)
        for _ in range(3):
            adam.zero_grad()
            (network(inputs) - 2 * targets).square().mean().backward()
            adam.step()
        np.testing.assert_array_equal(first.detach().numpy() != 0, seen & ~self.still)


class SizesTest(unittest.TestCase):
    def test_what_no_file_could_hold_is_refused(self) -> None:
        settings = Settings(neuronsPerLayer=2000)
        check_size(settings, 100, 180000)
        with self.assertRaisesRegex(TrainerError, r"1\.62 GB.*--principal-shapes.*--neurons"):
            check_size(settings, 100, 200000)
        with self.assertRaisesRegex(TrainerError, "--principal-limit"):
            export.check_shapes_size(500, 100000)


class DistancesTest(unittest.TestCase):
    def test_percentile_is_exact_or_near_the_exact_one(self) -> None:
        random = np.random.default_rng(5)
        for scale, kept, tolerance in ((1e-4, 0, 1e-3), (1.0, 0, 1e-3), (1e4, 1000, 1e-3), (1.0, 2000, 1e-12)):
            differences = (scale * random.standard_normal((50, 3 * 40))).astype(np.float32)
            distances = Distances(40)
            with mock.patch("trainer.measure.KEPT", kept):
                for first in range(0, 50, 7):
                    part = differences[first:first + 7]
                    distances.add(np.arange(first, first + len(part)), lengths_of(part))
            lengths = np.linalg.norm(differences.reshape(50, 40, 3).astype(np.float64), axis=2)
            for name, share in (("p99", 0.99), ("p9999", 0.9999)):
                ranked = np.quantile(lengths, share, method="linear" if kept == 2000 else "inverted_cdf")
                self.assertAlmostEqual(distances.figures()[name] / ranked, 1, delta=tolerance)
            self.assertEqual(distances.where, np.unravel_index(np.argmax(lengths), lengths.shape))
            self.assertAlmostEqual(distances.total / lengths.sum(), 1, places=12)


if __name__ == "__main__":
    unittest.main()
