# SPDX-License-Identifier: Apache-2.0
"""A task on a node: what it checks, what it runs, what it leaves when it is ended, and what status says of it."""

import fcntl
import json
import os
import resource
import signal
import stat
import unittest
from dataclasses import replace
from pathlib import Path
from unittest import mock

from neuralwarp_farm import results, sums
from neuralwarp_farm.plan import Plan, Result, SourceFile
from neuralwarp_farm.results import State
from site_of_a_farm import FarmTest


class TaskTest(FarmTest):
    def states(self, plan: Plan, code: int) -> dict[str, str]:
        answer = json.loads(self.farm("status", plan.folder, "--json", code=code))
        self.assertEqual(answer["complete"], code == 0)
        return {task["id"]: f"{task['state']}: {task['detail']}" if task["detail"] else task["state"]
                for task in answer["tasks"]}

    def log(self, plan: Plan, identifier: str = "a") -> list[str]:
        return plan.log(plan.task(identifier)).read_text().splitlines()

    def test_a_task_makes_its_result_once(self) -> None:
        plan = self.plan(self.task("a", "{threads}", "{folder}", "{other}"))
        self.farm("task", plan.folder, "a", SLURM_CPUS_PER_TASK="7", SLURM_ARRAY_JOB_ID="12", SLURM_ARRAY_TASK_ID="0")
        self.farm("task", plan.folder / "plan.json", "a")
        made = json.loads((plan.folder / "made/a/dataset.json").read_text())
        self.assertEqual(made, {"words": ["7", str(plan.folder), "{other}"], "OMP_NUM_THREADS": "7",
                                "OPENBLAS_NUM_THREADS": "7", "SHOW": "all"})
        first, build, said, last = self.log(plan)
        self.assertRegex(first, r"^# 20..-..-.. ..:..:.. [+-]....: a on .+, job 12_0, attempt 1$")
        self.assertEqual([build, said], ["# quarn 1.0, build abc, none", "made made/a"])
        self.assertRegex(last, r"^# ended with 0 after [0-9]+\.[0-9] s$")
        self.assertTrue((plan.folder / "made/a").stat().st_mode & stat.S_IWGRP)
        self.assertEqual(self.states(plan, 0), {"a": "done"})

    def test_threads(self) -> None:
        plan = self.plan(self.task("a", "{threads}"), self.task("b", "{threads}"))
        self.farm("task", plan.folder, "a")
        self.farm("task", plan.folder, "b", "--threads", "5", SLURM_CPUS_PER_TASK="7")
        for identifier, wanted in (("a", "3"), ("b", "5")):
            made = json.loads((plan.folder / f"made/{identifier}/dataset.json").read_text())
            self.assertEqual(made["words"], [wanted])
        self.farm("task", plan.folder, "b", "--threads", "0", code=2)

    def test_what_has_changed_since_the_plan(self) -> None:
        plan = self.plan(self.task("a"), files=(SourceFile(str(self.scene), 5, "missing"),))
        self.assertIn("has appeared since", self.farm("task", plan.folder, "a", code=1))
        self.assertRegex(self.states(plan, 1)["a"], "failed: ended with 1: .*scene.json has appeared")

    def test_a_scene_that_changes_between_tasks(self) -> None:
        plan = self.plan(self.task("a"), self.task("b"), self.task("c"))
        os.utime(self.scene, (1, 1))  # as a copy has it
        with mock.patch.object(sums, "SETTLED", -1.0):  # remembered at once, and not read again
            self.farm("task", plan.folder, "a")
            sums.check(plan)
            with mock.patch.object(sums, "sum_of", side_effect=AssertionError("it is read")):
                sums.check(plan)
        with mock.patch("socket.gethostname", return_value="another"):  # host, of the same file system
            sums.remember(plan, self.scene.stat().st_ctime)
            with self.assertRaises(AssertionError), mock.patch.object(sums, "sum_of", side_effect=AssertionError):
                sums.check(plan)
            sums.remember(plan, self.scene.stat().st_ctime + 3)
            with mock.patch.object(sums, "sum_of", side_effect=AssertionError("it is read")):
                sums.check(plan)
        old = self.scene.stat()
        self.scene.write_text("SCENE")  # as long as it was, and, of a copy, of the same time
        os.utime(self.scene, ns=(old.st_atime_ns, old.st_mtime_ns))
        self.assertIn("scene.json has changed since the plan was made", self.farm("task", plan.folder, "b", code=1))
        self.scene.unlink()
        self.assertIn("scene.json, which the plan was made with, is not there",
                      self.farm("task", plan.folder, "b", code=1))
        self.scene.write_text("scene")
        self.farm("task", plan.folder, "b")
        self.assertEqual(self.states(plan, 3), {"a": "done", "b": "done", "c": "missing"})

    def test_another_build_on_a_node(self) -> None:
        plan = self.plan(self.task("a"))
        (self.place / "build").write_text("abd")
        said = self.farm("task", plan.folder, "a", code=1)
        self.assertRegex(said, "quarn 1.0, build abd, and the plan was made with 1.0, build abc")
        self.quarn.unlink()
        self.assertIn("could not be run", self.farm("task", plan.folder, "a", code=1))
        self.assertFalse((plan.folder / "made").exists())

    def test_a_task_that_is_ended_goes_on(self) -> None:
        plan = self.plan(self.task("a", "wait"), self.task("merge", needs=("a",)))
        self.assertRegex(self.farm("merge", plan.folder, code=1), "merge needs what is not there yet: a$")
        for number, code in ((signal.SIGTERM, 143), (signal.SIGINT, 130)):
            with self.subTest(signal=number):
                first = self.start("task", plan.folder, "a")
                self.wait_until((plan.folder / "made/a.part/row").exists)
                self.wait_until(lambda: self.log(plan)[-1] == "waiting")
                # two of a task, and what needs it: try again
                self.assertIn("another process is running a", self.farm("task", plan.folder, "a", code=75))
                self.assertIn("a, which is being written", self.farm("merge", plan.folder, code=75))
                self.assertRegex(self.states(plan, 3)["a"], "^being written by another: 20.* on .*, attempt")
                first.send_signal(number)
                first.communicate(timeout=60)
                self.assertEqual(first.returncode, code)
                self.assertRegex(self.states(plan, 3)["a"], f"^begun: ended with {code}: stopped by")
                (plan.folder / "made/a.part/row").unlink()
        (plan.folder / "made/a.part/row").write_text("kept")
        self.farm("task", plan.folder, "a")
        self.assertIn(", attempt 3", [line for line in self.log(plan) if "attempt" in line][-1])
        self.farm("merge", plan.folder)
        self.assertEqual(self.states(plan, 0), {"a": "done", "merge": "done"})

    def test_a_task_that_is_killed(self) -> None:
        plan = self.plan(self.task("a", "wait"))
        first = self.start("task", plan.folder, "a")
        self.wait_until((plan.folder / "made/a.part/row").exists)
        child = int(Path(f"/proc/{first.pid}/task/{first.pid}/children").read_text())
        first.kill()
        first.communicate(timeout=60)
        os.kill(child, signal.SIGKILL)
        self.assertRegex(self.states(plan, 1)["a"], "failed: ended without a word")
        self.farm("task", plan.folder, "a")
        self.assertEqual(self.states(plan, 0), {"a": "done"})

    def test_programs_that_fail(self) -> None:
        plan = self.plan(self.task("a", "end", "4"), self.task("b", "end", "75"), self.task("c", "die"),
                         replace(self.task("d"), result=Result("dataset", "made/other")),
                         replace(self.task("e"), command=("{train}",)), replace(self.task("f"), command=("/no/such",)))
        codes = {"a": 4, "b": 75, "c": 137, "d": 1, "e": 1, "f": 1}
        for identifier, code in codes.items():
            self.farm("task", plan.folder, identifier, code=code)
        states = self.states(plan, 1)
        self.assertEqual([states["a"], states["b"], states["c"]], [
            "failed: ended with 4: why it ends", "missing: ended with 75: why it ends", "failed: ended with 137"])
        for identifier, why in (("d", "ended with 0, and .*other is not there"), ("e", "no program of that name"),
                                ("f", "/no/such could not be run")):
            self.assertRegex(states[identifier], f"^failed: ended with 1: .*{why}")

    def test_a_disk_that_is_full(self) -> None:
        plan = self.plan(self.task("a"))
        limits = resource.getrlimit(resource.RLIMIT_FSIZE)
        resource.setrlimit(resource.RLIMIT_FSIZE, (0, limits[1]))
        try:
            with self.assertRaises(OSError):
                (self.place / "file").write_text("x")
            said = self.start("task", plan.folder, "a")
        finally:
            resource.setrlimit(resource.RLIMIT_FSIZE, limits)
        self.assertIn("a.log could not be written: File too large", said.communicate(timeout=60)[0])
        self.assertEqual(said.returncode, 1)
        self.assertEqual(self.states(plan, 3), {"a": "begun"})
        self.farm("task", plan.folder, "a")


class StateTest(FarmTest):
    def test_what_lies_there_says_it(self) -> None:
        cases: list[tuple[Result, list[str], State]] = [
            (Result("dataset", "a"), [], State.MISSING),
            (Result("dataset", "a"), ["a.part/rows"], State.BEGUN),
            (Result("dataset", "a"), ["a/half"], State.MISSING),
            (Result("dataset", "a"), ["a/dataset.json"], State.DONE),
            (Result("cache", "a.npy"), ["a.npy.part/points.npy"], State.BEGUN),
            (Result("cache", "a.npy"), ["a.npy"], State.DONE),
            (Result("frames", "a", ("1", "2")), ["a/3"], State.MISSING),
            (Result("frames", "a", ("1", "2")), ["a/2"], State.BEGUN),
            (Result("frames", "a", ("1", "2")), ["a/1", "a/2"], State.DONE),
            (Result("model", "a.nwrp"), ["a.checkpoint"], State.BEGUN),
            (Result("model", "a.nwrp"), ["a.nwrp/metadata.json"], State.DONE),
        ]
        for number, (result, files, wanted) in enumerate(cases):
            task = replace(self.task("a"), result=result)
            plan = replace(self.plan(self.task("a")), folder=self.place / str(number), tasks=(task,))
            for file in files:
                (plan.folder / file).parent.mkdir(parents=True, exist_ok=True)
                (plan.folder / file).write_text("{}")
            with self.subTest(result=result, files=files):
                self.assertEqual(results.state_of(plan, task), wanted)
        (plan.folder / "a.nwrp/metadata.json").write_text('{"interruptedAfterEpochs": 3}')
        self.assertEqual(results.state_of(plan, task), State.BEGUN)

    def test_who_writes_holds_a_lock(self) -> None:
        for lock in ("made/a.part/lock", "state/a.lock"):
            plan = self.plan(self.task("a"))
            path = plan.folder / lock
            path.parent.mkdir(parents=True, exist_ok=True)
            handle = os.open(path, os.O_CREAT | os.O_RDWR)
            fcntl.flock(handle, fcntl.LOCK_EX)
            self.assertEqual(results.state_of(plan, plan.tasks[0]), State.WRITING)
            os.close(handle)
            self.assertNotEqual(results.state_of(plan, plan.tasks[0]), State.WRITING)


if __name__ == "__main__":
    unittest.main()
