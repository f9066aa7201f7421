# SPDX-License-Identifier: Apache-2.0
"""Scenes in Python: values, several side by side, threads, and what is refused."""

import json
import math
import os
import re
import shutil
import subprocess
import sys
import tempfile
import threading
import unittest
from pathlib import Path
from typing import Any, Callable

import numpy as np

import neuralwarp
from strip import POINTS, WAVE

JOINT = {"name": "arm", "type": "joint", "values": {"translateX": 2.0, "rotateOrder": 1}}
HAND = {"name": "hand", "type": "joint", "values": {"translateX": 1.0}, "locked": ["scaleX"]}
FACE = {"name": "face", "type": "sliders", "values": {"slider[0].sliderName": "smile"}}
CURVE = {"name": "time2arm", "type": "animCurve", "values": {"keyTimes": [1, 11], "keyValues": [0, 10]}}
OUTPUT, INPUTS = "wave.outputGeom[0]", "controls.inputList[0].input"


def strip_scene(folder: Path, model_root: str = "models") -> Path:
    """The scene of examples/wave with its model beside it, and a small rig that moves nothing but the first control."""
    scene = json.loads((WAVE / "wave.json").read_text())
    for node in scene["nodes"]:
        if node["name"] == "wave":
            node["values"]["modelRoot"] = model_root
    scene["nodes"] += [JOINT, HAND, FACE]
    scene["connections"] += [["arm.worldMatrix", "hand.parentMatrix"], ["arm.translateY", INPUTS + "[0]"]]
    folder.mkdir(exist_ok=True)
    (folder / "strip.json").write_text(json.dumps(scene))
    shutil.copytree(WAVE / "models", folder / "models", dirs_exist_ok=True)
    return folder / "strip.json"


class SceneTest(unittest.TestCase):
    def setUp(self) -> None:
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = Path(folder.name).resolve()

    def open(self, name: str = "scene", **changes: str) -> neuralwarp.Scene:
        return neuralwarp.Scene.open(strip_scene(self.folder / name, **changes))

    def refused(self, call: Callable[[], object], kind: type[Exception], said: str) -> None:
        with self.assertRaisesRegex(kind, re.escape(said), msg=said):
            call()


class Values(SceneTest):
    def test_are_read_back_as_they_were_set(self) -> None:
        scene = self.open()
        turned = [[0, 1, 0, 0], [-1, 0, 0, 0], [0, 0, 1, 0], [5, 6, 7, 1]]
        for plug, value, found in (
                ("hand.rotateX", 0.1, 0.1), ("hand.rotateX", np.float32(-30), -30.0), ("hand.scaleZ", 2, 2.0),
                ("hand.translate", (1, 2, -3e-300), [1.0, 2.0, -3e-300]), ("hand.rotateOrder", "zyx", 5),
                ("hand.rotateOrder", 2, 2), ("wave.models[0].modelActive", False, 0), ("face.smile", 0.25, 0.25),
                ("face.slider[0].sliderName", 'a "b" -c', 'a "b" -c'), (INPUTS + "[1]", 1e-3, 1e-3)):
            with self.subTest(plug=plug, value=value):
                scene.set(plug, value)
                self.assertEqual(scene.get(plug), found)
                self.assertIs(type(scene.get(plug)), type(found))
        scene.set("hand.restMatrix", turned)
        np.testing.assert_array_equal(scene.get("hand.restMatrix"), np.array(turned, float))
        self.assertEqual(scene.get("hand.worldMatrix")[3, 0], 3.0)
        self.assertEqual(scene.get("controls.output"), [0.0, 1e-3])

    def test_many_at_once(self) -> None:
        scene = self.open()
        plugs = scene.plugs(["hand.translateX", "arm.translateY", "hand.rotateOrder", "face.smile"])
        np.testing.assert_array_equal(plugs.get(), [1, 0, 0, 0])
        plugs.set([4, 0.5, 3, 0.75])
        np.testing.assert_array_equal(plugs.get(), [4, 0.5, 3, 0.75])
        self.assertEqual((len(plugs), plugs.get().dtype, scene.get("face.smile")), (4, np.float64, 0.75))
        np.testing.assert_array_equal(scene.controls(), np.array([0.5, 0], np.float32))
        wrong: list[tuple[list[float], str]] = [([1, 2, 3], "expected [4] numbers, got an array of (3,)"),
                                                ([9, 9, 9, math.nan], "face.smile cannot be set: nan")]
        for values, said in wrong:
            self.refused(lambda: plugs.set(values), ValueError, said)
        self.assertEqual(plugs.get()[0], 4, "nothing is set")
        self.refused(lambda: scene.plugs(["hand.worldMatrix"]), ValueError, "hand.worldMatrix does not hold one number")

    def test_what_the_scene_is_made_of(self) -> None:
        scene = self.open()
        self.assertIn(("wave", "neuralWarp"), scene.nodes())
        self.assertEqual(scene.joints(), [{"name": "arm", "parent": -1, "rotateOrder": "yzx"},
                                          {"name": "hand", "parent": 0, "rotateOrder": "xyz"}])
        geometry = {"index": 0, "name": "strip", "input": "strip.outMesh", "original": "wave.originalGeometry[0]",
                    "output": OUTPUT}
        self.assertEqual(scene.deformers(), [{"node": "wave", "geometries": [geometry]}])
        self.assertEqual(scene.control_names(), ["arm.translateY", INPUTS + "[1]"])
        counts, corners = scene.faces(OUTPUT)
        self.assertEqual((counts.sum(), counts.dtype, corners[:4].tolist()), (len(corners), np.int32, [0, 1, 42, 41]))
        self.assertIsNone(scene.vertex_map())

    def test_the_map_of_vertices_lies_beside_the_scene(self) -> None:
        path = strip_scene(self.folder / "mapped")
        scene = json.loads(path.read_text())
        scene["nodes"].append({"name": "character", "type": "character", "values": {"vertexMapFile": "map.{mesh}.npy"}})
        path.write_text(json.dumps(scene))
        np.save(path.with_name("map.strip.npy"), np.arange(400, dtype="<i4")[::-1])
        found = neuralwarp.Scene.open(path).vertex_map()
        assert found is not None
        self.assertEqual(found.tolist()[:2], [399, 398])
        path.with_name("map.strip.npy").unlink()
        self.refused(neuralwarp.Scene.open(path).vertex_map, ValueError, "map.strip.npy")


class Points(SceneTest):
    def test_are_those_of_the_deformer(self) -> None:
        scene = self.open()
        model = neuralwarp.Model.load(WAVE / "models" / "wave.nwrp")
        deformer = neuralwarp.Deformer(model, scene.faces("strip.outMesh"), scene.points("wave.originalGeometry[0]"))
        np.testing.assert_array_equal(scene.points("strip.outMesh"), POINTS)
        for y in (0.0, 0.7, -0.3):
            scene.set("arm.translateY", y)
            found = scene.points(OUTPUT)
            np.testing.assert_allclose(found, deformer.evaluate(POINTS, scene.controls()), atol=1e-6)
            self.assertEqual(bool(np.abs(found - POINTS).max() > 0.05), y != 0)
            np.testing.assert_array_equal(found, scene.get(OUTPUT))

    def test_go_where_they_are_wanted(self) -> None:
        scene = self.open()
        out = np.full((2, len(POINTS), 3), 9, np.float32)
        self.assertIs(scene.points("strip.outMesh", out[1]).base, out)
        np.testing.assert_array_equal(out[1], POINTS)
        self.assertEqual(out[0].max(), 9)
        locked = np.zeros_like(POINTS)
        locked.flags.writeable = False
        wrongs: list[Any] = [out, np.zeros((len(POINTS), 3)), np.zeros((len(POINTS), 6), np.float32)[:, ::2], locked]
        for wrong in wrongs:
            self.refused(lambda: scene.points("strip.outMesh", wrong), ValueError, "out: expected float32 [369, 3]")

    def test_frame_by_frame(self) -> None:
        path = strip_scene(self.folder / "moving")
        scene = json.loads(path.read_text())
        scene["nodes"].append(CURVE)
        scene["connections"] += [["time1.outTime", "time2arm.time"], ["time2arm.output", "arm.translateY"]]
        path.write_text(json.dumps(scene))
        with neuralwarp.Scene.open(path) as moving:
            frames = moving.play(OUTPUT, (frame for frame in (3, 1, 1.5)))
            self.assertEqual((frames.shape, frames.dtype, moving.time), ((3, 369, 3), np.float32, 1.0))
            for frame, points in zip((3, 1, 1.5), frames):
                moving.time = frame
                np.testing.assert_array_equal(points, moving.points(OUTPUT))
            self.assertGreater(np.abs(frames[0] - frames[1]).max(), 0.1)
            self.assertIs(moving.play(OUTPUT, [1, 2, 3], out=frames), frames)
            moving.set("wave.modelRoot", "elsewhere")
            self.refused(lambda: moving.play(OUTPUT, [7]), RuntimeError, "elsewhere")
            self.assertEqual(moving.time, 1.5)


class SideBySide(SceneTest):
    def test_each_has_nodes_a_time_and_a_folder_of_its_own(self) -> None:
        first, second = self.open("one"), self.open("two")
        for scene, number in ((first, 1.0), (second, 2.0)):
            scene.set("arm.translateY", number)
            scene.time = number
        plugs = first.plugs(["arm.translateY"])
        self.assertEqual((first.get("arm.translateY"), first.time), (1.0, 1.0))
        self.assertEqual((second.get("arm.translateY"), second.time), (2.0, 2.0))
        for scene, name in ((first, "one"), (second, "two")):
            self.assertEqual(scene.get("wave.modelRoot"), str(self.folder / name / "models"))
        before = second.points(OUTPUT)
        first.close()
        first.close()
        for call in (first.nodes, plugs.get, lambda: first.points(OUTPUT), lambda: plugs.set([3])):
            self.refused(call, RuntimeError, "one/strip.json is closed")
        self.assertTrue(first.closed)
        second.set("arm.translateX", 0)
        np.testing.assert_array_equal(second.points(OUTPUT), before)

    def test_on_any_thread(self) -> None:
        scenes = [self.open(str(number)) for number in range(3)]
        failed: list[Any] = []

        def work(number: int) -> None:
            try:
                for step in range(40):
                    scene = scenes[(number + step) % 3]
                    scene.set("hand.translateX", number)
                    own = self.folder / str(number) / "strip.json"
                    with neuralwarp.Scene.open(own) as opened:
                        opened.set("arm.translateY", 0.1 * number)
                        expected = np.array([0.1 * number, 0], np.float32)
                        np.testing.assert_array_equal(opened.controls(), expected)
                        opened.points(OUTPUT)
            except Exception as error:
                failed.append(error)

        threads = [threading.Thread(target=work, args=(number,)) for number in range(3)]
        for thread in threads:
            thread.start()
        for thread in threads:
            thread.join()
        self.assertEqual(failed, [])

    def test_the_current_folder_is_neither_used_nor_changed(self) -> None:
        path = strip_scene(self.folder / "scene")
        before = os.getcwd()
        gone = self.folder / "gone"
        gone.mkdir()
        self.addCleanup(os.chdir, before)
        os.chdir(path.parent)
        scene = neuralwarp.Scene.open("strip.json")
        self.assertEqual((scene.path, os.getcwd()), (str(path), str(path.parent)))
        os.chdir(gone)
        gone.rmdir()
        scene.set("arm.translateY", 0.5)
        self.assertGreater(np.abs(scene.points(OUTPUT) - POINTS).max(), 0.05)
        self.assertGreater(len(neuralwarp.Scene.open(path).points(OUTPUT)), 0)
        self.refused(lambda: neuralwarp.Scene.open("strip.json"), FileNotFoundError, "strip.json")
        scene.set("wave.modelRoot", "nothing")
        self.assertEqual(scene.get("wave.modelRoot"), str(path.parent / "nothing"))


class Refused(SceneTest):
    def test_what_is_no_scene(self) -> None:
        (self.folder / "text.json").write_text('{"openquarnScene": 1,\n "nodes": 3')
        for name, kind, said in (("none.json", FileNotFoundError, "none.json"), (".", ValueError, "is not a file"),
                                 ("text.json", ValueError, "text.json: ")):
            self.refused(lambda: neuralwarp.Scene.open(self.folder / name), kind, said)

    def test_values_and_plugs(self) -> None:
        scene = self.open()
        for plug, value, kind, said in (
                ("arm.bend", 1, ValueError, "arm.bend"), ("leg.rotateX", 1, ValueError, "leg.rotateX"),
                ("hand.rotateX", "fast", TypeError, "rotateX takes a number, not str"),
                ("hand.rotateX", [1, 2], TypeError, "not list"), ("hand.rotateX", math.inf, ValueError, "inf"),
                ("hand.rotateOrder", 1.5, ValueError, "1.5"), ("hand.rotateOrder", "up", ValueError, "up"),
                ("hand.scaleX", 2, ValueError, "locked"), ("hand.worldMatrix", np.eye(4), ValueError, "output"),
                ("hand.restMatrix", np.eye(3), ValueError, "not 9"),
                ("hand.restMatrix", None, TypeError, "NoneType"),
                (INPUTS + "[0]", 1, ValueError, "connected"), ("hand.translate", [1, 2], ValueError, "3 parts, not 2"),
                ("wave.modelRoot", 5, TypeError, "takes a text, not int"),
                ("strip.inMesh", POINTS, ValueError, "strip")):
            with self.subTest(plug=plug, value=value):
                self.refused(lambda: scene.set(plug, value), kind, said)
        for call, said in ((lambda: scene.get("arm"), "arm"), (lambda: scene.points("hand.rotateX"), "is no mesh"),
                           (lambda: scene.controls("arm"), "no deformer arm"),
                           (lambda: scene.play(OUTPUT, [1, math.nan]), "nan is not a finite number"),
                           (lambda: setattr(scene, "time", math.nan), "nan")):
            self.refused(call, ValueError, said)

    def test_a_model_that_is_missing_as_long_as_it_is(self) -> None:
        scene = self.open("scene", model_root="elsewhere")
        for _ in range(2):
            self.refused(lambda: scene.points(OUTPUT), RuntimeError, "elsewhere")
        self.assertEqual(scene.points("strip.outMesh").shape, POINTS.shape)
        scene.set("wave.modelRoot", "models")
        self.assertEqual(scene.points(OUTPUT).shape, POINTS.shape)

    def test_says_nothing_by_itself_and_ends_with_scenes_open(self) -> None:
        path = strip_scene(self.folder / "scene", model_root="elsewhere")
        scene = json.loads(path.read_text())
        scene["nodes"].append({"name": "odd", "type": "unheardOf"})
        path.write_text(json.dumps(scene))
        script = ("import neuralwarp, sys, threading\nscenes = []\n"
                  "first = threading.Thread(target=lambda: scenes.append(neuralwarp.Scene.open(sys.argv[1])))\n"
                  "first.start()\nfirst.join()\nscene, = scenes\n"
                  f"try: scene.points('{OUTPUT}')\nexcept RuntimeError: print(*scene.warnings)")
        run = subprocess.run([sys.executable, "-c", script, str(path)], capture_output=True, encoding="utf-8")
        self.assertEqual((run.returncode, run.stderr), (0, ""))
        self.assertIn("unheardOf", run.stdout)
