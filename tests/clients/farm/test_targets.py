# SPDX-License-Identifier: Apache-2.0
"""Parts of targets: what a program is told, what is taken of it and what is not, seams, ends in the middle."""

import contextlib
import io
import json
import os
import signal
import struct
import subprocess
import sys
import tempfile
import time
import unittest
from array import array
from pathlib import Path
from typing import Any, Optional

from neuralwarp_farm import __main__, npy, plan
from neuralwarp_farm.errors import FarmError

LAST, VERTICES = 12, 2

# the words that a part asks quarn for; the skin of frame F is F everywhere
QUARN = """
import json, sys
from pathlib import Path
from neuralwarp_farm import npy
from array import array
words = sys.argv[1:]
if words[:2] == ["info", "--build"]:
    print(json.dumps({"version": "0.9.0", "build": "abc", "instructionSet": "AVX2"}))
    sys.exit()
if words[0] == "info":
    print(json.dumps({"files": [words[1]], "missing": [], "frames": "1-12", "framesPerSecond": 24, "deformer": "warp",
                      "geometries": ["arm", "hat"]}))
    sys.exit()
if words[0] == "merge":
    rows = [row for part in words[1:-2] for row in npy.rows(npy.read_head(Path(part)))]
    with open(words[-1], "wb") as file:
        npy.write_head(file, len(rows), 2)
        file.write(b"".join(rows))
    sys.exit()
first, last = map(int, words[words.index("--frames") + 1].split("-"))
with open(words[-1], "xb") as file:
    if words[0] == "play":
        npy.write_head(file, last - first + 1, 2)
        for frame in range(first, last + 1):
            file.write(array("f", [frame] * 6).tobytes())
"""
# a program that adds up what it has seen, as a simulation does; a window of three frames is all that it remembers
PROGRAM = """
import json, sys
from array import array
from pathlib import Path
from neuralwarp_farm import npy
request = json.load(open(sys.argv[-1]))
skin = [array("f", row)[0] for row in npy.rows(npy.read_head(Path(request["skin"]["file"])))]
first = request["skin"]["firstFrame"]
asked = request["frames"]
values = [sum(skin[max(0, frame - first - 2):frame - first + 1]) for frame in asked]
kind, shape, content = "<f4", (len(asked), 2, 3), array("f", [v for v in values for _ in range(6)]).tobytes()
{change}
head = repr({{"descr": kind, "fortran_order": False, "shape": shape}}) + "\\n"
with open(request["write"], "wb") as file:
    file.write(b"\\x93NUMPY\\x01\\x00" + len(head).to_bytes(2, "little") + head.encode() + content)
"""
SCENE: dict[str, Any] = {
    "nodes": [{"type": "character", "name": "c", "values": {"sourceFile": "arm.glb", "metersPerUnit": 0.01}},
              {"type": "skinCluster", "name": "skin"}],
    "connections": [["skin.outputGeom[0]", "warp.input[1].inputGeometry"], ["arm.outMesh", "warp.originalGeometry[1]"]]}


class TargetCase(unittest.TestCase):
    def setUp(self) -> None:
        place = tempfile.TemporaryDirectory()
        self.addCleanup(place.cleanup)
        self.place = Path(place.name)
        self.scene = self.place / "poses.json"
        self.scene.write_text(json.dumps(SCENE))
        self.script("quarn", QUARN)

    def script(self, name: str, text: str) -> Path:
        path = self.place / name
        path.write_text(f"#!{sys.executable}\n{text}")
        path.chmod(0o755)
        return path

    def begin(self, change: str = "", first: int = 1, last: int = LAST, preroll: int = 0) -> "subprocess.Popen[str]":
        program = self.script("program", PROGRAM.format(change=change))
        return subprocess.Popen(
            [sys.executable, "-m", "neuralwarp_farm.kinds.target_part", "--quarn", str(self.place / "quarn"),
             "--scene", str(self.scene), "--deformer", "warp", "--geometry", "arm", "--order", "scene", "--first",
             str(first), "--last", str(last), "--whole", "1", str(LAST), "--preroll", str(preroll), "--seam",
             "--threads", "1", "--output", str(self.output(first)), "--", str(program), "--", "word"],
            stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True)

    def part(self, *arguments: Any, **named: Any) -> tuple[int, str]:
        process = self.begin(*arguments, **named)
        said = process.communicate(timeout=60)[0]
        return process.returncode, said

    def output(self, first: int = 1) -> Path:
        return self.place / f"{first}.npy"

    def values(self, first: int = 1) -> list[float]:
        return [array("f", row)[-1] for row in npy.rows(npy.read_head(self.output(first)))]


class PartTest(TargetCase):
    def test_what_is_not_what_was_asked_for_is_refused_and_leaves_nothing(self) -> None:
        cases = [("sys.exit(3)", 1, "ended with status 3"), ("sys.exit(75)", 75, "ended with status 75"),
                 ("import os; os.kill(os.getpid(), 9)", 1, "ended by signal 9"),
                 ("sys.exit(0)", 1, "has not written"),
                 ("import os; os.symlink(request['skin']['file'], request['write']); sys.exit()", 1,
                  "has not written"),
                 ("shape, content = (11, 2, 3), content[24:]", 1, "[11, 2, 3], and was asked for [12"),
                 ("shape = (12, 1, 6)", 1, "not of [frames, vertices, 3]"),
                 ("kind = '<i4'", 1, "numbers of the kind '<i4'"),
                 ("content = content[:-1]", 1, "bytes, and its head says"),
                 ("content += b'more'", 1, "bytes, and its head says"),
                 ("shape = (2**41, 2, 3)", 1, "not of [frames, vertices, 3]"),
                 ("content = content[:40] + b'\\0\\0\\x80\\x7f' + content[44:]", 1, "in row 1, of vertex 1"),
                 ("kind, content = '<f8', array('d', [1e300] * 72).tobytes()", 1, "no finite number, in row 0")]
        for change, status, sentence in cases:
            with self.subTest(change):
                code, said = self.part(change)
                self.assertEqual((code, sentence in said), (status, True), said)
                self.assertFalse(self.output().exists() or list(self.place.glob("1.npy.part/scratch.*")))
        self.assertEqual(self.part("kind, content = '<f8', array('d', array('f', content)).tobytes()")[0], 0)
        self.assertEqual(self.values(), [1, 3] + [3 * frame - 3 for frame in range(3, LAST + 1)])
        self.assertEqual(sorted(path.name for path in self.place.glob("1.npy*")), ["1.npy", "1.npy.part.json"])

    def test_what_the_program_is_told(self) -> None:
        self.part("import shutil; shutil.copy(sys.argv[-1], sys.argv[0] + '.request')", 5, 8, 2)
        request = json.loads((self.place / "program.request").read_text())
        part = self.place / "5.npy.part"
        self.assertEqual({**request, "write": ""}, {
            "format": "neuralWarp target request", "version": 1, "mesh": "arm", "scene": str(self.scene),
            "character": str(self.place / "arm.glb"),
            "skeleton": {"file": str(part / "skeleton.glb"), "format": "glb"},
            "skin": {"file": str(part / "skin.npy"), "format": "npy <f4", "shape": [7, 2, 3], "firstFrame": 3,
                     "metersPerUnit": 0.01, "axes": "as in the character's file", "order": "scene",
                     "rest": str(part / "rest.npy")},
            "frames": [5, 6, 7, 8, 9], "write": ""})

    def test_a_seam_shows_in_the_records_where_preroll_is_too_short(self) -> None:
        def sums(preroll: int) -> tuple[Optional[str], str, Optional[str]]:
            records = []
            for first, last in ((1, 6), (7, LAST)):
                self.output(first).unlink(missing_ok=True)
                self.assertEqual(self.part(first=first, last=last, preroll=preroll)[0], 0)
                records.append(json.loads((self.place / f"{first}.npy.part.json").read_text()))
            self.assertEqual([record["of"] for record in records], [f"1-{LAST}"] * 2)
            self.assertEqual(records[0]["setupSum"], records[1]["setupSum"])
            return records[0]["nextSum"], records[1]["firstSum"], records[1]["nextSum"]
        for preroll, fits in ((1, False), (2, True)):
            following, first, last = sums(preroll)
            self.assertEqual((following == first, last), (fits, None), preroll)
        self.assertEqual(self.values(1) + self.values(7), [1, 3] + [3 * frame - 3 for frame in range(3, LAST + 1)])

    def test_one_that_is_ended_takes_its_program_along_and_goes_on(self) -> None:
        for number, status in ((signal.SIGTERM, 143), (signal.SIGKILL, -9)):
            pid = self.place / f"pid.{status}"
            first = self.begin("import os, time, subprocess; child = subprocess.Popen(['sleep', '300']); "
                               f"open('{pid}.new', 'w').write(str(child.pid)); os.rename('{pid}.new', '{pid}'); "
                               "time.sleep(300)")
            self.wait_for(pid)
            self.assertEqual(self.part()[0], 75)
            first.send_signal(number)
            self.assertEqual(first.wait(30), status)
            if number == signal.SIGTERM:
                self.wait_for(Path(f"/proc/{pid.read_text()}"), there=False)
            else:  # nobody is left to end it
                os.killpg(os.getpgid(int(pid.read_text())), signal.SIGKILL)
            assert first.stdout
            first.stdout.close()
            self.assertFalse(self.output().exists())
        self.assertEqual(self.part()[0], 0)

    def wait_for(self, path: Path, there: bool = True) -> None:
        for _ in range(3000):
            if path.exists() == there:
                return
            time.sleep(0.01)
        self.fail(f"{path} is {'not ' if there else ''}there")


class PlanTest(TargetCase):
    """A plan of it, carried out."""

    def farm(self, *words: str) -> tuple[int, str]:
        with contextlib.redirect_stdout(io.StringIO()) as said, contextlib.redirect_stderr(said):
            return __main__.main(list(words)), said.getvalue()

    def plan(self, *words: str, scene: Any = SCENE) -> tuple[int, str]:
        self.scene.write_text(json.dumps(scene))
        program = self.script("program", PROGRAM.format(change="import os; assert os.environ['LICENCE'] == 'a b'; "
                                                        "assert '--jobs=2' in sys.argv"))
        return self.farm("plan", "targets", str(self.scene), "-o", str(self.place / "night"), "--quarn",
                         str(self.place / "quarn"), "--preroll", "2", "--env", "LICENCE=a b", *words, "--",
                         os.path.relpath(program), "--jobs={threads}", "--", "x")

    def test_a_plan_carried_out_gives_what_one_part_gives(self) -> None:
        for cutting, parts in ((("--parts", "3"), 3), (("--minutes", "1000"), 1)):
            code, said = self.plan("--geometry", "arm", "--overwrite", *cutting)
            self.assertEqual(code, 0, said)
            made = plan.read(self.place / "night")
            self.assertEqual(len(made.tasks), parts + 1)
            for task in made.tasks:
                self.assertEqual(self.farm("task", str(made.folder), task.id)[0], 0, made.log(task).read_text())
            self.output().unlink(missing_ok=True)
            self.part()
            self.assertEqual((made.folder / "result.npy").read_bytes(), self.output().read_bytes())
        self.assertEqual(made.tasks[0].command[-4:], (str(self.place / "program"), "--jobs={threads}", "--", "x"))
        (made.folder / "parts/0001.npy").unlink()
        self.script("program", "another")
        self.assertEqual(self.farm("task", str(made.folder), "part-0001")[0], 1)
        self.assertIn("program has changed", made.log(made.tasks[0]).read_text())

    def test_what_cannot_be_planned(self) -> None:
        cached = {**SCENE, "nodes": [{"type": "pointCache", "name": "skin"}]}
        bare: dict[str, Any] = {**SCENE, "connections": []}
        for words, scene, status, sentence in (
                ((), SCENE, 2, "deforms arm, hat"), (("--geometry", "leg"), SCENE, 2, "--geometry, not leg"),
                (("--geometry", "arm", "--env", "NO_SUCH"), SCENE, 2, "no such variable"),
                (("--geometry", "arm", "--frames", "1-9x2"), SCENE, 2, "leaves frames out"),
                (("--geometry", "arm", "--result", "a.pc2"), SCENE, 2, "ends in .npy"),
                (("--geometry", "arm"), cached, 1, "another tool's cache"),
                (("--geometry", "hat"), SCENE, 1, "no skin"),
                (("--geometry", "arm"), bare, 1, "no skin"), (("--geometry", "arm"), [], 1, "no scene file")):
            with self.subTest(sentence):
                code, said = self.plan("--parts", "2", *words, scene=scene)
                self.assertEqual((code, sentence in said), (status, True), said)
                self.assertFalse((self.place / "night").exists())


class HeadTest(unittest.TestCase):
    def test_heads_that_lie(self) -> None:
        good = b"{'descr': '<f4', 'fortran_order': False, 'shape': (1, 1, 3)}"
        long = struct.pack("<I", 2**31) + good
        cases = [b"", b"\x93NUMPY", b"\x93NUMPX\x01\x00\x02\x00{}", b"\x93NUMPY\x01\x00\xff\xff{}",
                 b"\x93NUMPY\x02\x00" + long, b"\x93NUMPY\x01\x00\x02\x00[]", b"\x93NUMPY\x01\x00\x04\x00open",
                 b"\x93NUMPY\x01\x00" + struct.pack("<H", len(good)) + good.replace(b"False", b"True ") + bytes(12),
                 b"\x93NUMPY\x01\x00" + struct.pack("<H", len(good)) + good.replace(b" 1, 3", b"-1, 3") + bytes(12)]
        with tempfile.TemporaryDirectory() as folder:
            path = Path(folder) / "a.npy"
            for content in cases:
                path.write_bytes(content)
                with self.subTest(content), self.assertRaisesRegex(FarmError, "a.npy"):
                    npy.read_head(path)
            path.write_bytes(b"\x93NUMPY\x01\x00" + struct.pack("<H", len(good)) + good + bytes(12))
            self.assertEqual(npy.read_head(path)[1:4], ("<f4", 1, 1))
