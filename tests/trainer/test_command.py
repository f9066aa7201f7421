# SPDX-License-Identifier: Apache-2.0
"""The command line as a user has it: exit codes, streams, the same files again, and processes that are killed."""

import hashlib
import json
import os
import random
import resource
import shutil
import signal
import stat
import subprocess
import sys
import tempfile
import time
import unittest
from pathlib import Path
from typing import Any
from unittest import mock

import numpy as np
import synthetic
from trainer import files, progress, report
from trainer.settings import KINDS, described

ROOT = Path(__file__).resolve().parents[2]
TRAIN = ("train", "data", "-o", "m/arm", "--quarn", "none")

# a quarn that runs the network with NumPy, and adds what $WRONG says
STAND_IN = f"""#!{sys.executable}
import os, sys
import numpy as np
from trainer.evaluator import NumpyModel
assert sys.argv[1] == "info" and sys.argv[2].endswith(".nwrp") and sys.argv[3] == "--run" and sys.argv[5] == "--outputs"
if os.environ.get("WRONG") == "crash":
    sys.exit("quarn: the model cannot be loaded")
outputs = NumpyModel(sys.argv[2] + "/model.onnx").run(np.load(sys.argv[4]))
np.save(sys.argv[6], outputs + np.float32(os.environ.get("WRONG", "0")))
"""


class ProgressTest(unittest.TestCase):
    # of a training that goes on, what is left is told by the epochs of this time
    def test_tells_what_is_left(self) -> None:
        with tempfile.TemporaryDirectory() as place, mock.patch("trainer.progress.time.monotonic") as clock:
            clock.return_value = 100.0
            file = progress.ProgressFile(Path(place) / "p.json", 20)
            states = []
            for now, done in (100.1, 11), (108.0, 14), (108.1, 15), (120.0, 20):
                clock.return_value = now
                file.keep(done)
                states.append(json.loads(file.path.read_text()))
            self.assertEqual([state["done"] for state in states], [0, 14, 14, 20])
            self.assertEqual([state["secondsLeft"] for state in states], [None, 12.0, 12.0, 0.0])
            self.assertEqual({state["total"] for state in states}, {20})
            file.path = Path(place) / "none" / "p.json"
            clock.return_value = 130.0
            file.keep(20)  # goes on


class CommandTest(unittest.TestCase):
    def setUp(self) -> None:
        place = tempfile.TemporaryDirectory()
        self.addCleanup(place.cleanup)
        self.place = Path(place.name)
        synthetic.make(self.place / "data", frames=60, train={"epochs": 4})

    def environment(self, **more: str) -> dict[str, str]:
        kept = {key: value for key, value in os.environ.items() if key != "QUARN"}
        return {**kept, "PYTHONPATH": f"{ROOT}", **more}

    def start(self, *arguments: object, largest_file: int = resource.RLIM_INFINITY,
              **environment: str) -> "subprocess.Popen[str]":
        def prepare() -> None:
            resource.setrlimit(resource.RLIMIT_FSIZE, (largest_file, resource.RLIM_INFINITY))
            # a shell ignores it in what it puts in the background
            signal.signal(signal.SIGINT, signal.default_int_handler)

        return subprocess.Popen([sys.executable, "-m", "trainer", *map(str, arguments)], cwd=self.place, text=True,
                                stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.PIPE,
                                env=self.environment(**environment), preexec_fn=prepare)

    def run_trainer(self, *arguments: object, status: int = 0, **environment: Any) -> tuple[str, str]:
        process = self.start(*arguments, **environment)
        out, err = process.communicate()
        self.assertEqual(process.returncode, status, out + err)
        return out, err

    def refused(self, *arguments: object, status: int = 1, **environment: Any) -> str:
        out, err = self.run_trainer(*arguments, status=status, **environment)
        self.assertRegex(err, r"\Atrainer: [^\n]+\n\Z")
        return err

    def digest(self, name: str = "arm.nwrp") -> str:
        """Of the names and bytes of a model directory."""
        digest = hashlib.sha256()
        for path in sorted((self.place / "m" / name).iterdir()):
            digest.update(path.name.encode() + path.read_bytes())
        return digest.hexdigest()

    def test_same_data_and_seed_give_the_same_files(self) -> None:
        for more in ((), ("--principal-shapes", "--principal-accuracy", "0.95", "--dropout", "0.1")):
            digests = []
            for last, threads in ((("--no-preload",), "1"), ((), "2"), (("--seed", "2"), "1")):
                self.run_trainer(*TRAIN, *more, *last, OMP_NUM_THREADS=threads)
                digests.append(self.digest())
            self.assertEqual(digests[0], digests[1])
            self.assertNotEqual(digests[0], digests[2])
        self.run_trainer(*TRAIN, "--direct", "--progress", "p.json")
        state = json.loads((self.place / "p.json").read_text())
        self.assertEqual([state[key] for key in ("what", "done", "total")], ["epochs", 4, 4])
        self.assertEqual(sorted(os.listdir(self.place / "m")), ["arm.nwrp", "arm.report"])
        self.assertFalse((self.place / "m/arm.nwrp/principal_shapes.json").exists())

    def test_killed_at_any_time(self) -> None:
        longer = (*TRAIN, "--epochs", "300", "--patience", "300")
        self.run_trainer(*longer)
        wanted = self.digest()
        self.run_trainer(*TRAIN, "--seed", "2")
        before = self.digest()
        moments = random.Random(4)
        checkpoint = self.place / "m/arm.checkpoint"
        for wait in (1, 10):
            process = self.start(*longer, "--checkpoint-every", "0", "--resume")
            end = time.monotonic() + wait
            while time.monotonic() < end and process.poll() is None and not (wait > 1 and checkpoint.exists()):
                time.sleep(moments.uniform(0, 0.05))
            process.kill()
            process.communicate()
            self.assertIn(self.digest(), (before, wanted))
        self.assertTrue(checkpoint.exists())
        self.assertIn("going on from m/arm.checkpoint", self.run_trainer(*longer, "--resume")[0])
        self.assertEqual(self.digest(), wanted)
        self.assertEqual(sorted(os.listdir(self.place / "m")), ["arm.nwrp", "arm.report"])

    def test_interrupted(self) -> None:
        """Both leave a checkpoint, and Ctrl-C the best network so far where there is one."""
        for number, after, status, said, left in (
                (signal.SIGTERM, "validating on", 143, "", ["arm.checkpoint"]),
                (signal.SIGINT, "validating on", 130, "trainer: interrupted", ["arm.checkpoint"]),
                (signal.SIGINT, "epoch 2000 of", 130, "ends with the best network so far",
                 ["arm.checkpoint", "arm.nwrp", "arm.report"])):
            # epochs of one step, or of many slow ones
            more = ("--batch-size", "100000") if "arm.nwrp" in left else ("--batch-size", "1", "--neurons", "1500")
            process = self.start(*TRAIN, "--epochs", "40000", "--patience", "40000", *more)
            assert process.stdout
            while after not in process.stdout.readline():
                self.assertIsNone(process.poll())
            process.send_signal(number)
            out, err = process.communicate()
            self.assertEqual(process.returncode, status, out + err)
            self.assertIn(said, err)
            self.assertEqual(sorted(os.listdir(self.place / "m")), left, err)
            if "arm.nwrp" in left:
                report, metadata = (json.loads((self.place / "m" / name).read_text())
                                    for name in ("arm.report/report.json", "arm.nwrp/metadata.json"))
                self.assertTrue(report["interrupted"] and 2000 <= report["epochs"] < 40000)
                self.assertEqual(metadata["interruptedAfterEpochs"], report["epochs"])

    def test_what_another_process_writes(self) -> None:
        process = self.start(*TRAIN, "--epochs", "40000", "--patience", "40000", "--batch-size", "1")
        assert process.stdout
        while "validating on" not in process.stdout.readline():
            self.assertIsNone(process.poll())
        for arguments in (TRAIN, ("zero", "data", "-o", "m/arm")):
            self.assertIn("another process is writing m/arm.", self.refused(*arguments, status=75))
        process.send_signal(signal.SIGTERM)
        process.communicate()
        self.assertEqual(process.returncode, 143)
        # a data set of quarn that is not complete; several, of which all or not all are tried again
        (self.place / "sets").mkdir()
        with files.whole_folder(self.place / "begun", ()), files.whole_folder(self.place / "models/grid.nwrp", ()):
            self.assertIn("begun is not complete yet", self.refused("info", "begun", status=75))
            shutil.copytree(self.place / "data", self.place / "sets/data")
            self.refused("train", "sets", "--quiet", "--epochs", "1", status=75)
            (self.place / "sets/none").mkdir()
            (self.place / "sets/none/dataset.json").write_text("[]")
            self.refused("train", "sets", "--quiet", "--epochs", "1", status=1)
        self.refused("info", "begun", status=1)

    def test_a_full_home_costs_the_picture_alone(self) -> None:
        """matplotlib writes a list of fonts there when it is first used."""
        (self.place / "home").mkdir()
        out, err = self.run_trainer(*TRAIN, "--epochs", "1", "--principal-shapes", "--neurons", "2", largest_file=15000,
                                    MPLCONFIGDIR=str(self.place / "home"))
        self.assertRegex(out, r"no loss.png, as matplotlib does not start \(.*File too large\)")
        self.assertEqual(err, "")
        self.assertTrue((self.place / "m/arm.report/losses.csv").exists())
        self.assertFalse((self.place / "m/arm.report/loss.png").exists())

    def test_a_full_disk_is_told_with_the_file(self) -> None:
        subprocess.run([sys.executable, "-c", "import matplotlib.font_manager"], check=True)  # see the test before
        synthetic.make(self.place / "two", frames=60, affect=[1, 2])
        shapes = ("--principal-shapes", "--neurons", "2")
        for name, size, data, more in (
                ("trained_poses.npy", 500, "data", ()), ("metadata.json", 1000, "data", ()),
                ("model.onnx", 5000, "data", ()), ("loss.png", 15000, "data", shapes),
                ("principal_shapes.json", 3000, "data", shapes), ("report.json", 2500, "two", ("--neurons", "1"))):
            error = self.refused("train", data, *TRAIN[2:], "--quiet", "--epochs", "1", *more, largest_file=size)
            self.assertRegex(error, rf"arm\.\w+\.part/{name}: File too large")
            self.assertEqual(os.listdir(self.place / "m"), [])

    def test_streams_and_errors(self) -> None:
        self.assertEqual(self.run_trainer(*TRAIN, "--quiet"), ("", ""))
        out, err = self.run_trainer(*TRAIN, "--json", "--report", "elsewhere")
        self.assertEqual(json.loads(out), json.loads((self.place / "elsewhere/report.json").read_text()))
        self.assertIn("not verified", err)
        self.assertIn("60 frames, 3 controls, 48 deltas (Surface", self.run_trainer("info", "data")[0])
        self.assertEqual(json.loads(self.run_trainer("info", "data", "--json")[0])["frameCount"], 60)
        for arguments, wanted in (
                (("train", "nowhere", "-o", "m"), "nowhere is not a training"),
                ((*TRAIN, "--learning-rate", "0"), "learning rate is 0"),
                ((*TRAIN, "--activation", "swish"), "--activation is 'swish'"),
                ((*TRAIN, "--neurons", "100000"), "40.06 GB"), ((*TRAIN, "--threads", "0"), "--threads is 0"),
                ((*TRAIN, "--quarn", "nowhere"), "--quarn names nowhere"),
                (("evaluate", "data", "data", "--quarn", "none"), "data is not a model directory"),
                (("train", "data", "-o", "data/dataset.json/m"), "dataset.json")):
            self.assertIn(wanted, self.refused(*arguments))
        for arguments, wanted in (((), "required"), (("dance",), "dance"),
                                  ((*TRAIN, "--epochs", "many"), "invalid int value: 'many'")):
            self.assertIn(wanted, self.refused(*arguments, status=2))
        for command in ((), ("train",)):
            said = " ".join(self.run_trainer(*command, "--help")[0].split())
            for name in KINDS:
                self.assertTrue(name == "outputModelName" or described(name) in said, (command, name))

    def test_every_data_set_below_a_folder(self) -> None:
        """A model each, under the names that the deformer has for them; one that fails keeps no other from it."""
        sets: dict[str, dict[str, Any]] = {"all/face/set": {"outputModelName": "head"}, "all/body": {},
                                           "all/arm": {"outputModelName": ""}, "all/old.part": {}}
        for place, train in sets.items():
            synthetic.make(self.place / place, frames=60, geometry="limb", train={"epochs": 4, **train})
        (self.place / "all/body/deltas.npy").unlink()
        every = ("train", "all", "-o", "m", "--quarn", "none")
        error = self.refused(*every, "--quiet")
        self.assertRegex(error, r"1 of 3 data sets became no model; body: .*deltas\.npy")
        written = ["head.nwrp", "head.report", "limb.nwrp", "limb.report"]
        self.assertEqual(sorted(os.listdir(self.place / "m")), written)
        together = self.digest("head.nwrp")
        self.run_trainer("train", "all/face/set", "-o", "m/head", "--quarn", "none")
        self.assertEqual(self.digest("head.nwrp"), together)

        synthetic.make(self.place / "all/body/again", frames=60, train={"outputModelName": "head"})
        (self.place / "all/body/dataset.json").unlink()
        self.assertIn("body/again and face/set in all would both become head.nwrp", self.refused(*every))
        shutil.rmtree(self.place / "all/body")
        for name in ("arm", "face/set"):  # each with the one of its name
            synthetic.make(self.place / "held" / name, frames=10 + len(name), seed=9)
        out, err = self.run_trainer(*every, "--json", "--report", "reports", "--validation-set", "held")
        self.assertEqual([(one["split"]["train"], one["split"]["validation"], one["split"]["test"])
                          for one in json.loads(out)], [(60, 7, 6), (60, 9, 9)])
        self.assertEqual([one["dataSet"] for one in json.loads(out)], ["arm", "face/set"])
        self.assertRegex(err, r"(?s)arm, 1 of 2\n.*face/set: [\d.]+ mm in the mean with zero deltas, .* with m/head")
        self.assertEqual(sorted(os.listdir(self.place / "reports")), ["head", "limb"])
        self.assertIn("-o m/x.nwrp is one model, and all has 2", self.refused("train", "all", "-o", "m/x.nwrp"))

    def test_zero_model_and_evaluation(self) -> None:
        self.run_trainer("zero", "data", "-o", "m/zero")
        self.run_trainer(*TRAIN)
        zero = json.loads(self.run_trainer("evaluate", "data", "m/zero.nwrp", "--json", "--quarn", "none")[0])
        arm = json.loads(self.run_trainer("evaluate", "data", "m/arm.nwrp", "--json", "--quarn", "none")[0])
        self.assertEqual(zero["network"], zero["base"])
        out, _ = self.run_trainer("evaluate", "data", "m/arm.nwrp", "--json", "--quarn", "none", "--report", "errors")
        errors = self.place / "errors"
        self.assertEqual(json.loads((errors / "report.json").read_text()), json.loads(out))
        self.assertEqual(sorted(os.listdir(errors)), sorted(report.ERROR_NAMES))
        frames, vertices = (np.load(errors / f"{what}Errors.npy") for what in ("frame", "vertex"))
        self.assertEqual((frames.shape, vertices.shape), ((60, 2), (48, 2)))
        for values in (frames, vertices):
            self.assertAlmostEqual(float(values[:, 0].mean()) / arm["network"]["mean"]["mm"], 1, places=4)
            self.assertAlmostEqual(float(values[:, 1].max()) / arm["network"]["max"]["mm"], 1, places=4)
        self.assertEqual(np.load(errors / "frames.npy")[np.argmax(frames[:, 1])], arm["network"]["worstFrame"])
        self.assertEqual(np.load(errors / "vertices.npy")[np.argmax(vertices[:, 1])], arm["network"]["worstVertex"])
        (errors / "mine").touch()
        self.assertIn("holds mine", self.refused("evaluate", "data", "m/arm.nwrp", "--quarn", "none", "--report",
                                                 "errors"))
        self.assertLess(arm["network"]["mean"]["mm"], arm["base"]["mean"]["mm"])
        synthetic.make(self.place / "part", affect=[1, 2])
        self.assertIn("do not belong together", self.refused("evaluate", "part", "m/arm.nwrp", "--quarn", "none"))
        self.assertIn("part cannot validate data: its ", self.refused(*TRAIN, "--validation-set", "part"))

    def test_quarn_has_the_last_word(self) -> None:
        quarn = self.place / "quarn"
        quarn.write_text(STAND_IN)
        quarn.chmod(quarn.stat().st_mode | stat.S_IXUSR)
        train = ("train", "data", "-o", "m/arm")
        out, _ = self.run_trainer(*train, "--json", QUARN=str(quarn))
        self.assertTrue(json.loads(out)["verifiedWithQuarn"])
        before = self.digest()
        self.assertIn("is not published", self.refused(*train, "--seed", "2", QUARN=str(quarn), WRONG="0.001"))
        self.assertIn("the model cannot be loaded", self.refused(*train, "--quarn", quarn, WRONG="crash"))
        self.assertEqual(self.digest(), before)
        self.assertEqual(sorted(os.listdir(self.place / "m")), ["arm.nwrp", "arm.report"])
        self.assertIn("ran with quarn", self.run_trainer("evaluate", "data", "m/arm.nwrp", QUARN=str(quarn))[0])

    def test_the_real_quarn_runs_every_kind_of_model(self) -> None:
        quarn = os.environ.get("NW_TEST_QUARN", "")
        if not quarn or "--run" not in subprocess.run([quarn, "info", "--help"], capture_output=True, text=True,
                                                      check=False).stdout:
            self.skipTest("the quarn of this build cannot run models")
        for more in (("--activation", "Sigmoid"), ("--activation", "Tanh"), ("--activation", "ReLU"),
                     ("--activation", "Linear"), ("--activation", "SiLU", "--linear-path", "--guard", "fade"),
                     ("--principal-shapes",), ("--principal-shapes", "--half-shapes"),
                     ("--principal-shapes", "--basis-budget", "2")):
            out, _ = self.run_trainer("train", "data", "-o", "m/arm", "--quarn", quarn, "--json", *more)
            self.assertTrue(json.loads(out)["verifiedWithQuarn"])
        found = json.loads(subprocess.run([quarn, "info", self.place / "m/arm.nwrp", "--json"], capture_output=True,
                                          check=True).stdout)
        self.assertEqual((found["principalShapesFile"], found["notes"]), ("principal_shapes.npz", []))
        by_quarn = json.loads(self.run_trainer("evaluate", "data", "m/arm.nwrp", "--json", "--quarn", quarn)[0])
        by_numpy = json.loads(self.run_trainer("evaluate", "data", "m/arm.nwrp", "--json", "--quarn", "none")[0])
        self.assertAlmostEqual(by_quarn["network"]["mean"]["mm"], by_numpy["network"]["mean"]["mm"], places=5)


if __name__ == "__main__":
    unittest.main()
