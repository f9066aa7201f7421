# SPDX-License-Identifier: Apache-2.0
"""A folder with a plan whose program is a small one: it does what words tell it to."""

import io
import os
import subprocess
import sys
import tempfile
import time
import unittest
from contextlib import redirect_stderr, redirect_stdout
from pathlib import Path
from typing import Callable, Optional, Union
from unittest import mock

from neuralwarp_farm import plan, sums
from neuralwarp_farm.__main__ import main
from neuralwarp_farm.plan import Plan, Resources, Result, SourceFile, Task

# quarn FOLDER WORD...: makes a data set, after what the words say
PROGRAM = r"""#!/usr/bin/env python3
import json, os, signal, sys, time
from pathlib import Path
if sys.argv[1:3] == ["info", "--build"]:
    print(json.dumps({"version": "1.0", "build": Path(__file__).with_name("build").read_text(),
                      "instructionSet": "none"}))
    sys.exit()
if sys.argv[1] == "info":
    geometries = ["arm", "hat"] if "--deformer" in sys.argv else ["arm"]
    print(json.dumps({"files": [sys.argv[2]], "missing": [], "frames": None, "deformer": "warp",
                      "geometries": geometries}))
    sys.exit()
folder, words = Path(sys.argv[1]), sys.argv[2:]
if words[:1] == ["end"]:
    print("why it ends")
    sys.exit(int(words[1]))
if words[:1] == ["die"]:
    os.kill(os.getpid(), signal.SIGKILL)
part = folder.with_name(folder.name + ".part")
part.mkdir(parents=True, exist_ok=True)
def stop(number, frame):
    print("stopped by", number, flush=True)
    sys.exit(128 + number)
signal.signal(signal.SIGTERM, stop)
signal.signal(signal.SIGINT, stop)
if words[:1] == ["wait"] and not (part / "row").exists():
    (part / "row").write_text("kept")
    print("waiting", flush=True)
    time.sleep(60)
names = ("OMP_NUM_THREADS", "OPENBLAS_NUM_THREADS", "SHOW")
(part / "dataset.json").write_text(json.dumps({"words": words, **{name: os.environ.get(name) for name in names}}))
os.rename(part, folder)
print("made", folder, end="")
"""


class FarmTest(unittest.TestCase):
    def setUp(self) -> None:
        place = tempfile.TemporaryDirectory()
        self.addCleanup(place.cleanup)
        self.place = Path(place.name).resolve()
        self.quarn = self.place / "quarn"
        self.quarn.write_text(PROGRAM)
        self.quarn.chmod(0o755)
        (self.place / "build").write_text("abc")
        self.scene = self.place / "scene.json"
        self.scene.write_text("scene")

    def task(self, identifier: str = "a", *words: str, needs: tuple[str, ...] = ()) -> Task:
        path = f"made/{identifier}"
        return Task(identifier, ("{quarn}", path, *words), needs, Result("dataset", path), Resources(cpus=3))

    def plan(self, *tasks: Task, files: Optional[tuple[SourceFile, ...]] = None) -> Plan:
        made = Plan(self.place / "farm", "export", "scene.export", "1.0", "abc", {"quarn": str(self.quarn)},
                    (sums.source_file(str(self.scene)),) if files is None else files, "1-3", None, None,
                    {"SHOW": "all"}, tasks)
        plan.write(made)
        return plan.read(made.folder)

    def farm(self, *words: Union[str, Path], code: int = 0, **environment: str) -> str:
        """What the program says, on both of its channels. It must end with `code`."""
        said = io.StringIO()
        with redirect_stdout(said), redirect_stderr(said), mock.patch.dict(os.environ, environment):
            ended = main([str(word) for word in words])
        self.assertEqual(ended, code, said.getvalue())
        return said.getvalue()

    def start(self, *words: Union[str, Path]) -> "subprocess.Popen[str]":
        """The same in a process of its own."""
        process = subprocess.Popen([sys.executable, "-m", "neuralwarp_farm", *map(str, words)], text=True,
                                   stdout=subprocess.PIPE, stderr=subprocess.STDOUT)
        self.addCleanup(process.communicate)
        self.addCleanup(process.kill)
        return process

    def wait_until(self, holds: Callable[[], bool]) -> None:
        deadline = time.monotonic() + 60
        while not holds():
            self.assertLess(time.monotonic(), deadline, "waited for in vain")
            time.sleep(0.02)
