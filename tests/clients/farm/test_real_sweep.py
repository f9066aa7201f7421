# SPDX-License-Identifier: Apache-2.0
"""A sweep of two models by the trainer itself, of which one is ended in the middle and goes on."""

import json
import os
import subprocess
import sys
import time
from pathlib import Path

from test_train import SweepCase

ROOT = Path(__file__).resolve().parents[3]
FOUND = subprocess.run([ROOT / "scripts" / "find_python.sh"], stdout=subprocess.PIPE, text=True)
if FOUND.returncode:
    print("skipped: there is no Python for the trainer")
    sys.exit(77)


class SweepTest(SweepCase):
    def test_two_models_that_the_trainer_makes_and_goes_on_with(self) -> None:
        data = self.place / "sets/grid"
        subprocess.run([FOUND.stdout.strip(), "-c", "import sys, synthetic; from pathlib import Path; "
                        "synthetic.make(Path(sys.argv[1]), frames=60)", str(data)], check=True,
                       env={**os.environ, "PYTHONPATH": str(ROOT / "tests/trainer")})
        path = self.write_list([{"name": "grid", "dataset": "sets/grid", "each": {"neurons": [4, 16]},
                                 "arguments": ["--neurons", "{neurons}", "--epochs", "300"]}])
        code, said = self.farm("plan", "train", str(path), "-o", str(self.folder), "--quarn",
                               os.environ["NW_TEST_QUARN"])
        self.assertEqual(code, 0, said)
        small = subprocess.Popen([sys.executable, "-m", "neuralwarp_farm", "task", str(self.folder), "grid.4"],
                                 stdout=subprocess.DEVNULL)
        log = self.folder / "logs/grid.4.log"
        while small.poll() is None and not (log.exists() and "epoch " in log.read_text()):
            time.sleep(0.05)
        small.terminate()
        self.assertEqual(small.wait(60), 143, log.read_text())
        self.assertEqual([self.farm("task", str(self.folder), name)[0] for name in ("grid.4", "grid.16", "merge")],
                         [0, 0, 0], log.read_text())
        self.assertIn("going on from", log.read_text())
        rows = json.loads((self.folder / "table.json").read_text())["models"]
        self.assertEqual([(row["name"], row["heldOut"], row["best"]) for row in rows],
                         [("grid.16", True, True), ("grid.4", True, False)])
