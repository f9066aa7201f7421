# SPDX-License-Identifier: Apache-2.0
"""The module and the plug-in, which the host loads: the same bits."""

import json
import os
import subprocess
import tempfile
import unittest
from pathlib import Path

import numpy as np

import neuralwarp
from strip import FACES, POINTS, WAVE, model_in

SCRIPT = """file -open {folder}/strip.json
setAttr wave.modelRoot -type string "{folder}"
setAttr wave.models[0].modelName -type string "strip"
setAttr controls.inputList[0].input[0] 0.7
setAttr controls.inputList[0].input[1] -0.4
setAttr wave.envelope {envelope}
file -saveAs {folder}/posed.json
"""


def scene_of_floats() -> str:
    """The example's scene, whose points are doubles, with the float32 that the module takes."""
    scene = json.loads((WAVE / "wave.json").read_text())
    for node in scene["nodes"]:
        if node["name"] == "strip":
            node["values"]["inMesh"]["points"] = POINTS.ravel().tolist()
    return json.dumps(scene)


class SameBits(unittest.TestCase):
    def test_as_in_the_host(self) -> None:
        quarn = os.environ["NW_TEST_QUARN"]
        for mode in (0, 1):
            for passes in (0, 2):
                for envelope in (1.0, 0.3):
                    with self.subTest(mode=mode, passes=passes, envelope=envelope), \
                            tempfile.TemporaryDirectory() as name:
                        folder = Path(name)
                        directory = model_in(folder, deltaMode=mode, smoothingIterations=passes)
                        (folder / "strip.json").write_text(scene_of_floats())
                        (folder / "script.txt").write_text(SCRIPT.format(folder=folder, envelope=envelope))
                        subprocess.run([quarn, "exec", folder / "script.txt"], check=True, stdout=subprocess.PIPE)
                        subprocess.run([quarn, "play", folder / "posed.json", "--plug", "wave.outputGeom[0]",
                                        "--frames", "1-1", "-o", folder / "out.npy", "--quiet"], check=True)
                        deformer = neuralwarp.Deformer(neuralwarp.Model.load(directory), FACES, POINTS)
                        found = deformer.evaluate(POINTS, [0.7, -0.4], envelope=envelope)
                        self.assertGreater(float(np.abs(found - POINTS).max()), 0.05)
                        np.testing.assert_array_equal(found, np.load(folder / "out.npy").reshape(found.shape))
