# SPDX-License-Identifier: Apache-2.0
"""What the module takes, and what it refuses."""

import gc
import os
import random
import re
import signal
import tempfile
import threading
import time
import tracemalloc
import unittest
from concurrent.futures import ThreadPoolExecutor
from pathlib import Path
from typing import Any, Callable, Optional, Union

import numpy as np

import neuralwarp
from strip import CERTIFICATE, FACES, N, POINTS, WAVE, model_in

CONTROLS = np.array([1.0, -0.5], np.float32)
ENDLESS = 2_000_000_000  # passes


class Core(unittest.TestCase):
    def setUp(self) -> None:
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = Path(folder.name)
        self.model = neuralwarp.Model.load(WAVE / "models" / "wave.nwrp")

    def deformer(self, **metadata: object) -> neuralwarp.Deformer:
        return neuralwarp.Deformer(neuralwarp.Model.load(model_in(self.folder, **metadata)), FACES, POINTS)

    def refused(self, call: Callable[[], object], kind: type[Exception], said: str) -> None:
        with self.assertRaisesRegex(kind, re.escape(said), msg=said):
            call()


class ModelTest(Core):
    def test_says_what_it_was_trained_on(self) -> None:
        before = os.getcwd()
        os.chdir(self.folder)
        self.addCleanup(os.chdir, before)
        model_in(self.folder, controlNames=["wave", "fold"], certificate=CERTIFICATE, subsetState="partial",
                 affectMap=[5, 3, 300], affectCount=3)
        model = neuralwarp.Model.load("strip.nwrp")
        self.assertEqual(os.getcwd(), os.path.realpath(self.folder))
        self.assertEqual(model.directory, os.path.join(os.getcwd(), "strip.nwrp"))
        self.assertEqual((model.control_count, model.control_names, model.vertex_count, model.delta_mode,
                          model.smoothing_iterations), (2, ["wave", "fold"], N, "Surface", 2))
        self.assertEqual(model.metadata["certificate"], CERTIFICATE)
        assert model.ranges is not None
        self.assertEqual(model.ranges.tolist(), [[-1, 1], [0, 2]])
        figures = {"mean": 1.0, "p99": 2.0, "p9999": 3.0, "max": 4.0}
        self.assertEqual(model.errors, [{"frames": 3, "heldOut": "drawn at random", "poses": "drawn",
                                         "network": figures, "skin": figures}])
        self.assertEqual([model.distance(c) for c in ([0, 1], [2, 1], [0, -1])], [0.0, 0.5, 0.5])
        self.assertIsNone(model.expected_error([0, 1]))
        self.assertIn("trained poses", model.certificate_problem)

    def test_lives_as_long_as_its_arrays(self) -> None:
        model: Optional[neuralwarp.Model] = neuralwarp.Model.load(
            model_in(self.folder, subsetState="partial", affectMap=[5, 3, 300]))
        assert model is not None
        vertices, name = model.vertices, repr(model)
        self.assertIs(vertices.base, model)
        model = None
        gc.collect()
        self.assertEqual((vertices.tolist(), repr(vertices.base)), ([5, 3, 300], name))
        with self.assertRaisesRegex(ValueError, "read-only"):
            vertices[0] = 1

    def test_what_is_missing_or_damaged_is_named(self) -> None:
        broken = model_in(self.folder)
        (broken / "model.onnx").write_bytes(b"text")
        for directory, kind, said in ((self.folder / "none.nwrp", FileNotFoundError, "none.nwrp' does not exist"),
                                      (self.folder, FileNotFoundError, "metadata.json' does not exist"),
                                      (broken, ValueError, "model.onnx' cannot be used"),
                                      (3, TypeError, "directory: ")):
            self.refused(lambda: neuralwarp.Model.load(directory), kind, said)  # type: ignore[arg-type]
        self.refused(lambda: self.model.distance([0, 0]), ValueError, "does not know its ranges")
        self.refused(lambda: self.model.distance([0]), ValueError, "controls: expected float32 [2], got int64 [1]")


class DeformerTest(Core):
    def test_any_kind_of_array_gives_the_same_bits(self) -> None:
        deformer = neuralwarp.Deformer(self.model, FACES, POINTS)
        expected = deformer.evaluate(POINTS, CONTROLS)
        self.assertGreater(float(np.abs(expected - POINTS).max()), 0.1)
        wide = np.zeros((2 * N, 4), np.float32)
        wide[::2, :3] = POINTS
        odd = np.frombuffer(b"x" + POINTS.tobytes(), np.float32, offset=1, count=3 * N).reshape(N, 3)
        for points in (POINTS.astype(float), np.asfortranarray(POINTS), wide[::2, :3], POINTS.tolist(),
                       POINTS.astype(">f4"), odd, POINTS[::-1][::-1]):
            out = np.empty((N, 3), np.float32)
            self.assertIs(deformer.evaluate(points, CONTROLS.tolist(), out), out)
            np.testing.assert_array_equal(out, expected)
        counts = np.full(len(FACES), 4, np.uint8)
        pair = neuralwarp.Deformer(self.model, (counts, FACES.ravel().tolist()), POINTS)
        np.testing.assert_array_equal(pair.evaluate(POINTS, CONTROLS), expected)
        for points in (POINTS, np.asfortranarray(POINTS)):
            tracemalloc.start()
            deformer.evaluate(points, CONTROLS, out)
            most = tracemalloc.get_traced_memory()[1]
            tracemalloc.stop()
            self.assertEqual(most > POINTS.nbytes, points is not POINTS)

    def test_frames_and_characters_are_those_of_single_calls(self) -> None:
        deformers = [neuralwarp.Deformer(self.model, FACES, POINTS) for _ in range(5)]
        points = [POINTS + np.float32(0.1 * i) for i in range(5)]
        controls = [np.array([0.1 * i, -0.2 * i], np.float32) for i in range(5)]
        weights = np.linspace(0, 1, N, dtype=np.float32)
        half: dict[str, Any] = {"envelope": 0.5, "weights": weights}
        expected = [deformers[0].evaluate(p, c, **half) for p, c in zip(points, controls)]
        np.testing.assert_array_equal(deformers[0].evaluate_batch(np.stack(points), np.stack(controls), **half),
                                      expected)
        out = np.empty((5, N, 3), np.float32)
        found = neuralwarp.evaluate_characters(deformers, points, controls, list(out), 0.5, [weights] * 5)
        np.testing.assert_array_equal(found, expected)
        np.testing.assert_array_equal(out, expected)
        with ThreadPoolExecutor(5) as threads:
            beside = list(threads.map(lambda i: deformers[i].evaluate(points[i], controls[i], **half), range(5)))
        np.testing.assert_array_equal(beside, expected)
        plain = deformers[0].evaluate(POINTS, CONTROLS)
        np.testing.assert_array_equal(deformers[0].evaluate(POINTS, CONTROLS, envelope=0.0), POINTS)
        np.testing.assert_allclose(deformers[0].evaluate(POINTS, CONTROLS, **half),
                                   POINTS + (plain - POINTS) * 0.5 * weights[:, None], atol=1e-6)

    def test_misuse_is_named(self) -> None:
        deformer = neuralwarp.Deformer(self.model, FACES, POINTS)
        other = neuralwarp.Deformer(self.model, FACES, POINTS)
        evaluate: Any = deformer.evaluate
        # what no type checker lets pass
        characters: Any = neuralwarp.evaluate_characters
        make: Any = neuralwarp.Deformer

        def point(value: float) -> np.ndarray:
            points = POINTS.copy()
            points[7, 1] = value
            return points

        points = POINTS.copy()
        many = np.zeros((4, N, 3), np.float32)
        floats = f"expected float32 [{N}, 3], got "
        writable = f"out: expected a writable C-contiguous float32 [{N}, 3], got "
        constant = np.zeros((N, 3), np.float32)
        constant.flags.writeable = False
        inner: list[tuple[Callable[[], object], str]] = [
            (lambda: evaluate(POINTS[1:], CONTROLS), f"points: {floats}float32 [{N - 1}, 3]"),
            (lambda: evaluate(POINTS.ravel(), CONTROLS), f"points: {floats}float32 [{3 * N}]"),
            (lambda: evaluate(POINTS * 1j, CONTROLS), f"points: {floats}complex64 [{N}, 3]"),
            (lambda: evaluate(POINTS > 0, CONTROLS), f"points: {floats}bool [{N}, 3]"),
            (lambda: evaluate("text", CONTROLS), f"points: {floats}<U4 []"),
            (lambda: evaluate(None, CONTROLS), f"points: {floats}object []"),
            (lambda: evaluate([[1, 2], [3]], CONTROLS), f"points: {floats}a list"),
            (lambda: evaluate(point(np.nan), CONTROLS), "points: vertex 7 has the value nan"),
            (lambda: evaluate(POINTS.astype(float) * 1e39, CONTROLS), "points: vertex 4 has the value inf"),
            (lambda: evaluate(POINTS, [1.0]), "controls: expected float32 [2], got float64 [1]"),
            (lambda: evaluate(POINTS, [0.0, -np.inf]), "controls: control 1 is -inf"),
            (lambda: evaluate(POINTS, CONTROLS, weights=np.ones(3)), f"weights: expected float32 [{N}], got float64"),
            (lambda: evaluate(POINTS, CONTROLS, weights=point(np.nan)[:, 1]), "weights: vertex 7 has the value nan"),
            (lambda: evaluate(POINTS, CONTROLS, envelope=np.nan), "envelope is nan"),
            (lambda: evaluate(points, CONTROLS, points), "out: expected memory of its own, got some of points"),
            (lambda: evaluate(many.ravel()[3:3 * N + 3].reshape(N, 3), CONTROLS, many[0]), "got some of points"),
            (lambda: evaluate(POINTS, many.ravel()[:2], many[0]), "got some of controls"),
            (lambda: evaluate(many.ravel()[2:3 * N + 2].reshape(N, 3), many.ravel()[:2],
                              many.ravel()[5:3 * N + 5].reshape(N, 3)), "got some of points"),
            (lambda: evaluate(POINTS, CONTROLS, many[0], weights=many[0, :, 0].ravel()[:0]), "weights: expected"),
            (lambda: evaluate(POINTS, CONTROLS, many), writable + f"float32 [4, {N}, 3]"),
            (lambda: evaluate(POINTS, CONTROLS, POINTS.astype(float)), writable + f"float64 [{N}, 3]"),
            (lambda: evaluate(POINTS, CONTROLS, np.asfortranarray(POINTS)), writable + "one with gaps"),
            (lambda: evaluate(POINTS, CONTROLS, constant), writable + "one that is read-only"),
            (lambda: evaluate(POINTS, CONTROLS, POINTS.tolist()), writable + "a list"),
            (lambda: deformer.evaluate_batch(many, [CONTROLS] * 3), "controls: expected float32 [4, 2], got float32"),
            (lambda: deformer.evaluate_batch([POINTS, point(np.nan)], [CONTROLS] * 2),
             "frame 1: points: vertex 7 has the value nan"),
            (lambda: characters([deformer, other, deformer], [POINTS] * 3, [CONTROLS] * 3),
             "character 2 has the deformer of character 0"),
            (lambda: characters([deformer, other], [POINTS], [CONTROLS] * 2),
             "points: expected 2 elements, one for each character, got 1"),
            (lambda: characters([deformer, other], [POINTS] * 2, [CONTROLS] * 2, [many[0]] * 2),
             "out[1]: expected memory of its own, got some of out[0]"),
            (lambda: characters([deformer, other], [POINTS, POINTS[1:]], [CONTROLS] * 2),
             f"points[1]: {floats}"),
            (lambda: characters([deformer, None], [POINTS] * 2, [CONTROLS] * 2),
             "deformers[1]: expected a Deformer, got a NoneType"),
            (lambda: make(self.model, FACES, POINTS[1:]), f"rest: {floats}float32 [{N - 1}, 3]"),
            (lambda: make(self.model, FACES + 1, POINTS), f"faces: expected vertices from 0 to {N} - 1, "
             f"got {N} at corner"),
            (lambda: make(self.model, FACES - 1, POINTS), "got -1 at corner 0"),
            (lambda: make(self.model, FACES * 1.0, POINTS), "faces: expected whole numbers"),
            (lambda: make(self.model, ([4, 4], FACES.ravel()), POINTS), "the 8 corners"),
            (lambda: make(self.model, ([4, -4], [0] * 8), POINTS), "got -4 for face 1"),
            (lambda: make(self.model, (FACES,), POINTS), "a tuple of 1"),
            (lambda: neuralwarp.smooth(POINTS, FACES, POINTS[1:], 1), f"points: expected float32 [{N - 1}, 3]"),
            (lambda: neuralwarp.smooth(POINTS, FACES, POINTS, -1), "iterations: expected 0 or more, got -1"),
            (lambda: neuralwarp.vertex_frames(point(np.nan), FACES, POINTS), "points: vertex 7 has the value nan")]
        for call, said in inner:
            with self.subTest(said):
                self.refused(call, ValueError, said)
        self.refused(lambda: make(None, FACES, POINTS), TypeError, "model")

    def test_ctrl_c_ends_long_work_and_a_second_thread_is_refused(self) -> None:
        deformer = self.deformer(smoothingIterations=ENDLESS, deltaMode=0)
        bad = np.full((N, 3), np.nan, np.float32)
        refused: list[str] = []

        def interrupt() -> None:  # once the other thread works: the deformer is claimed before arguments are looked at
            while not refused:
                try:
                    deformer.evaluate(bad, CONTROLS)
                except RuntimeError as error:
                    refused.append(str(error))
                except ValueError:
                    time.sleep(0.001)
            signal.pthread_kill(threading.main_thread().ident or 0, signal.SIGINT)

        thread = threading.Thread(target=interrupt)
        thread.start()
        with self.assertRaises(KeyboardInterrupt):
            while True:
                try:
                    deformer.evaluate(POINTS, CONTROLS)
                except RuntimeError:  # the other thread was in it
                    continue
        thread.join()
        self.assertIn("in use on another thread", refused[0])
        np.testing.assert_array_equal(deformer.evaluate(POINTS, CONTROLS, envelope=0.0), POINTS)

    def test_nothing_that_is_given_ends_the_process(self) -> None:
        dice = random.Random(197)
        deformers = [neuralwarp.Deformer(self.model, FACES, POINTS) for _ in range(2)]

        def anything(shape: tuple[int, ...], good: str = "f4") -> Any:
            if dice.random() < 0.7:
                return np.zeros(shape, good)
            kind = dice.choice(["f4", "f4", "f4", "f8", "i4", "u8", ">f4", "c8", "?", "O", "S3", "M8[s]"])
            lengths = [dice.choice([n, n, n, n, 0, 1, n + 1]) for n in shape][:dice.choice([4, 4, 4, 1])]
            array = np.zeros(lengths, kind)
            if dice.random() < 0.2 and array.ndim:
                array = array[::dice.choice([-1, 2])]
            return dice.choice([array, array, array, array.T, array.tolist(), None, "x", {}])

        def run() -> Any:
            batch = dice.choice([1, 3])
            return dice.choice([
                lambda: deformers[0].evaluate(anything((N, 3)), anything((2,)), anything((N, 3)),
                                              dice.choice([1.0, 0.0, -1e300]), anything((N,))),
                lambda: deformers[0].evaluate_batch(anything((batch, N, 3)), anything((batch, 2))),
                lambda: neuralwarp.evaluate_characters(deformers[:batch], [anything((N, 3))] * 2,
                                                       [anything((2,))] * 2, [anything((N, 3)), None]),
                lambda: neuralwarp.Deformer(self.model, anything((len(FACES), 4), "i4"), anything((N, 3))),
                lambda: neuralwarp.smooth(anything((N, 3)), (anything((5,), "u8"), anything((0,), "i8")), POINTS, 2)])()

        done: dict[Union[str, type], int] = {"well": 0}
        for _ in range(3000):
            try:
                run()
                done["well"] += 1
            except (ValueError, TypeError) as error:
                done[type(error)] = done.get(type(error), 0) + 1
        self.assertGreater(done["well"], 300)


class SurfaceTest(Core):
    def test_smoothing_and_frames_are_those_of_the_deformer(self) -> None:
        moved = POINTS + np.sin(5 * POINTS[:, ::-1])
        deformer = self.deformer(deltaMode=0, smoothingIterations=3)
        np.testing.assert_array_equal(deformer.evaluate(moved, [0, 0]), neuralwarp.smooth(moved, FACES, POINTS, 3))
        frames = neuralwarp.vertex_frames(moved, FACES, POINTS)
        x, y, z, origin = (frames[:, row, :3] for row in range(4))
        np.testing.assert_allclose(np.cross(x, y), -z, atol=1e-6)
        np.testing.assert_array_equal(origin, moved)
        np.testing.assert_array_equal(frames[:, :, 3], [[0, 0, 0, 1]] * N)
