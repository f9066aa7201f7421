# SPDX-License-Identifier: Apache-2.0
"""The example goes the whole way: data, training, frames, a picture."""

import re
import subprocess
import sys
import tempfile
import unittest
from pathlib import Path

SCRIPT = Path(__file__).resolve().parents[3] / "examples" / "python" / "bend_a_tube.py"


class Example(unittest.TestCase):
    def test_the_network_gives_back_what_skinning_loses(self) -> None:
        with tempfile.TemporaryDirectory() as folder:
            done = subprocess.run([sys.executable, SCRIPT, folder, "40"], check=True, stdout=subprocess.PIPE, text=True)
            skin, neural, expected = map(float, re.findall(r"([0-9.]+) mm", done.stdout))
            self.assertLess(neural, 0.25 * skin, done.stdout)
            self.assertLess(expected, 0.25 * skin, done.stdout)
            self.assertGreater(skin, 2.0)
            picture = (Path(folder) / "tube.png").read_bytes()
            self.assertEqual((picture[:4], picture[16:24]), (b"\x89PNG", b"\x00\x00\x04\xb0\x00\x00\x01\x90"))
