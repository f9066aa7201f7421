# SPDX-License-Identifier: Apache-2.0
"""A plan given to engines: what make and xargs do with what is written for them, what a job template holds, and what a
Slurm is told, here by tools that only take notes."""

import contextlib
import io
import json
import os
import re
import shlex
import signal
import subprocess
import sys
import time
import unittest
from pathlib import Path
from typing import Any, Optional
from unittest import mock

from neuralwarp_farm import engines, plan
from neuralwarp_farm.__main__ import main
from neuralwarp_farm.engines import Options
from neuralwarp_farm.engines.slurm.script import script
from neuralwarp_farm.errors import FarmError, UsageError
from neuralwarp_farm.plan import Plan, Resources, Result, Task
from neuralwarp_farm.submit import megabytes, minutes
from site_of_a_farm import FarmTest

FAILING = {2: "[ -e go ] || exit 3; ", 3: "[ -e go ] || kill -9 $$; sleep 1; "}


class EnginesTest(FarmTest):
    def parts(self, count: int, before: dict[int, str] = {}, folder: str = "it's a #1 $HOME %j") -> Plan:
        """Parts that note when they are made, and a merge of them."""
        tasks = [Task(f"part-{number}", ("sh", "-c", f"{before.get(number, '')}echo {number} >> made; "
                                                     f"echo \"$SHOW\" > part-{number}"),
                      (), Result("cache", f"part-{number}"), Resources(1, 100, 0, 2)) for number in range(1, count + 1)]
        merge = Task("merge", ("sh", "-c", "sort -n made > whole; echo merge >> made"),
                     tuple(task.id for task in tasks), Result("cache", "whole"), Resources(2, 300))
        made = Plan(self.place / folder, "export", "hand.export", "1.0", "abc", {}, (), None, None, None,
                    {"SHOW": "it's $HOME"}, (*tasks, merge))
        plan.write(made)
        return made

    def here(self, *words: Any, code: int = 0) -> str:
        """What the program says; it must answer `code`. In this process, which is what many calls have time for."""
        said = io.StringIO()
        before = os.umask(0o022)
        try:
            with contextlib.redirect_stdout(said), contextlib.redirect_stderr(said):
                answered = main([*map(str, words)])
        finally:
            os.umask(before)
        self.assertEqual(answered, code, said.getvalue())
        return said.getvalue()

    def made(self, of: Plan) -> list[str]:
        return sorted((of.folder / "made").read_text().split())


class PrintersTest(EnginesTest):
    def test_make_and_lists_go_on_beside_what_fails(self) -> None:
        for engine, failed in (("make", 2), ("list", 123)):
            with self.subTest(engine):
                of = self.parts(4, FAILING, f"{engine} it's a #1 $HOME")
                statuses = [subprocess.run(["sh", "-c", line], capture_output=True).returncode
                            for line in self.calls(of, engine)]
                self.assertEqual(statuses[0], failed)
                self.assertEqual(self.made(of), ["1", "4"])
                (of.folder / "go").touch()
                for line in self.calls(of, engine):
                    subprocess.run(["sh", "-c", line], check=True, capture_output=True)
                self.assertEqual(self.made(of), ["1", "2", "3", "4", "merge"])
                self.assertEqual((of.folder / "whole").read_text(), "1\n2\n3\n4\n")
                self.assertEqual((of.folder / "part-1").read_text(), "it's $HOME\n")
                self.assertIn("is complete", self.here("submit", of.folder, "--engine", engine))

    def calls(self, of: Plan, engine: str) -> list[str]:
        told = self.here("submit", of.folder, "--engine", engine)
        return [re.sub(r"-([jP]) \d+", r"-\1 9", line.strip()) for line in told.splitlines() if line.startswith("  ")]

    def test_a_list_holds_what_is_left(self) -> None:
        of = self.parts(3)
        self.here("task", of.folder, "part-2")
        (of.folder / "tasks-3.txt").write_text("of an earlier submit")
        self.here("submit", of.folder, "--engine", "list", "--cpus", "3")
        lists = {path.name: [line.split()[-1] for line in path.read_text().splitlines()]
                 for path in of.folder.glob("tasks-*.txt")}
        self.assertEqual(lists, {"tasks-1.txt": ["part-1", "part-3"], "tasks-2.txt": ["merge"]})
        self.assertIn("task --threads 3 ", (of.folder / "tasks-1.txt").read_text())

    def test_options(self) -> None:
        of = self.parts(1)
        for words, said in ((("--engine", "make", "--gpus", "1"), "--gpus means nothing to the engine make"),
                            (("--engine", "lsf"), 'no engine "lsf": there are slurm, make, list, openjd'),
                            (("--memory", "4X"), "'4X' is no size"), (("--cpus", "0"), "it is 0")):
            self.assertIn(said, self.here("submit", of.folder, *words, code=2))
        for text, wanted in (("90", 90.0), ("1:30", 1.5), ("2:00:30", 120.5), ("1-2:00:00", 1560.0)):
            self.assertEqual(minutes(text), wanted)
        for text in ("", "0", "x", "1:2:3:4", "1-2", "-5"):
            with self.assertRaises(Exception, msg=text):
                minutes(text)
        self.assertEqual([megabytes(text) for text in ("500", "500M", "2g", "1T")], [500, 500, 2048, 1048576])


class TemplateTest(EnginesTest):
    def template(self, of: Plan, **options: Any) -> dict[str, Any]:
        text = engines.find("openjd").submit(of, of.tasks, Options(dry_run=True, **options))
        result: dict[str, Any] = json.loads(text)
        return result

    def test_rules_of_the_format(self) -> None:
        """Those that we know of: no foreign reader of templates is to be had here."""
        of = self.parts(2500, folder="farm")
        template = self.template(of, gpus=1, memory_mb=4000, time=1.5, constraint="attr.worker.os.version=12")
        self.assertEqual(set(template), {"specificationVersion", "name", "description", "jobEnvironments", "steps"})
        self.assertEqual(template["specificationVersion"], "jobtemplate-2023-09")
        self.assertEqual(template["jobEnvironments"][0]["variables"], of.environment)
        names: list[str] = []
        seen: list[str] = []
        for step in template["steps"]:
            self.assertRegex(step["name"], r"\A[^\n]{1,64}\Z")
            self.assertNotIn(step["name"], names)
            for dependency in step.get("dependencies", []):
                self.assertIn(dependency["dependsOn"], names)
            parameter, = step["parameterSpace"]["taskParameterDefinitions"]
            self.assertRegex(parameter["name"], r"\A[A-Za-z_][A-Za-z0-9_]{0,63}\Z")
            self.assertIn(len(parameter["range"]), range(1, 1025))
            run = step["script"]["actions"]["onRun"]
            self.assertEqual(re.findall(r"{{(.*?)}}", " ".join([run["command"], *run["args"]])),
                             [f"Task.Param.{parameter['name']}"])
            self.assertEqual(run["timeout"], 90)
            self.assertIn(run["cancelation"]["notifyPeriodInSeconds"], range(1, 601))
            needs = step["hostRequirements"]
            self.assertEqual({amount["name"]: amount["min"] for amount in needs["amounts"]},
                             {"amount.worker.vcpu": 2 if step["name"] == "merge" else 1, "amount.worker.memory": 4000,
                              "amount.worker.gpu": 1})
            self.assertIn({"name": "attr.worker.os.version", "anyOf": ["12"]}, needs["attributes"])
            names.append(step["name"])
            seen += parameter["range"]
        self.assertEqual(seen, [task.id for task in of.tasks])
        self.assertEqual([dependency["dependsOn"] for dependency in template["steps"][-1]["dependencies"]], names[:-1])

    def test_what_a_template_cannot_hold(self) -> None:
        with self.assertRaisesRegex(UsageError, "{{"):
            self.template(self.parts(1, folder="a {{b}}"))
        with self.assertRaisesRegex(UsageError, "attr.NAME=VALUE"):
            self.template(self.parts(1), constraint="avx512")


class AtFakeSlurm(EnginesTest):
    def setUp(self) -> None:
        super().setUp()
        tools = self.place / "bin"
        tools.mkdir()
        program = Path(__file__).with_name("fake_slurm.py").read_text()
        for name in ("sbatch", "squeue", "scancel", "scontrol"):
            (tools / name).write_text(f"#!{sys.executable} -SE\n{program}")
            (tools / name).chmod(0o755)
        environment = mock.patch.dict(os.environ, SLURM_CONF=str(self.place), SQUEUE_FORMAT="%i", SECRET="1",
                                      SBATCH_QOS="night", PATH=f"{tools}:{os.environ['PATH']}")
        environment.start()
        self.addCleanup(environment.stop)


class SlurmTest(AtFakeSlurm):
    def jobs(self) -> list[dict[str, Any]]:
        path = self.place / "jobs.json"
        jobs: list[dict[str, Any]] = json.loads(path.read_text()) if path.exists() else []
        return jobs

    def set_states(self, *states: list[str]) -> None:
        jobs = self.jobs()
        for job, those in zip(jobs, states):
            job["states"] = those
        (self.place / "jobs.json").write_text(json.dumps(jobs))

    def tasks_of(self, job: dict[str, Any]) -> list[str]:
        found = re.search(r"^tasks=\((.*)\)$", Path(job["script"]).read_text(), re.MULTILINE)
        assert found
        return shlex.split(found[1])

    def test_arrays_are_sent_once_and_carry_the_plan_out(self) -> None:
        of = self.parts(7)
        both = [self.start("submit", of.folder) for _ in range(2)]
        told = [each.communicate(timeout=60)[0] for each in both]
        self.assertEqual([each.returncode for each in both], [0, 0], told)
        self.assertEqual(sum("Nothing to send: 8 tasks" in each for each in told), 1, told)
        jobs = self.jobs()
        self.assertEqual([self.tasks_of(job) for job in jobs],
                         [["part-1", "part-2", "part-3"], ["part-4", "part-5", "part-6"], ["part-7"], ["merge"]])
        self.assertEqual([job["options"].get("array") for job in jobs], ["0-2", "0-2", None, None])
        self.assertEqual([job["options"].get("dependency") for job in jobs], [None] * 3 + ["afterany:1:2:3"])
        self.assertEqual(jobs[0]["options"]["output"], f"{of.folder}/logs".replace("%j", "%%j") + "/slurm-%A_%a.log")
        self.assertEqual([jobs[0]["options"][name] for name in ("time", "mem", "signal")], ["14", "100M", "B:USR1@60"])
        self.assertIn("SBATCH_QOS", jobs[0]["environment"])
        self.assertFalse({"SECRET", "SQUEUE_FORMAT"} & set(jobs[0]["environment"]))
        self.assertEqual(set(engines.states(of).values()), {"pending"})
        for job in jobs:
            for index in range(len(job["states"])):
                environment = {"PATH": os.environ["PATH"], "SLURM_JOB_ID": "9", "SLURM_ARRAY_TASK_ID": str(index)}
                subprocess.run(["bash", job["script"]], env=environment, check=True, capture_output=True)
        self.assertEqual((of.folder / "whole").read_text(), "1\n2\n3\n4\n5\n6\n7\n")

    def test_what_failed_is_sent_anew_and_merged_after(self) -> None:
        of = self.parts(3)
        self.here("submit", of.folder)
        for part in ("part-1", "part-3"):
            self.here("task", of.folder, part)
        self.set_states(["COMPLETED", "NODE_FAIL", "COMPLETED"], ["PENDING"])
        self.assertEqual(engines.states(of), {"part-1": "gone", "part-2": "failed", "part-3": "gone",
                                              "merge": "pending"})
        self.here("submit", of.folder, "--time", "1", "--partition", "night", "--gpus", "2", "--cpus", "4")
        jobs = self.jobs()
        self.assertEqual([job["states"] for job in jobs[1:]], [["CANCELLED"], ["PENDING"], ["PENDING"]])
        self.assertEqual([self.tasks_of(job) for job in jobs[2:]], [["part-2"], ["merge"]])
        self.assertEqual(jobs[3]["options"]["dependency"], "afterany:3:2")
        # the old merge had begun, and the new one was taken out by hand
        self.set_states([], ["RUNNING"], ["PENDING"], ["CANCELLED"])
        self.assertEqual(engines.states(of)["merge"], "running")
        asked = {name: jobs[2]["options"][name] for name in ("time", "signal", "partition", "gres", "cpus-per-task")}
        self.assertEqual(list(asked.values()), ["1", "B:USR1@15", "night", "gpu:2", "4"])

    def test_what_a_node_did_not_start_is_released(self) -> None:
        of = self.parts(3)
        self.here("submit", of.folder)
        held = "PENDING launch failed requeued held"
        self.set_states(["PENDING", held, "PENDING JobHeldUser"], ["PENDING Dependency"])
        self.assertEqual(list(engines.states(of).values()), ["pending", "held", "pending", "pending"])
        self.assertIn("part-2: failed: no node has started it", self.here("status", of.folder, code=1))
        self.assertEqual(self.here("submit", of.folder, "--dry-run"), "scontrol release 1_1\n")
        self.assertIn("Released part-2 in job 1", self.here("submit", of.folder))
        self.assertEqual((self.place / "released").read_text(), "1_1\n")
        self.set_states(["PENDING"] * 3, [held])
        self.assertIn("Released merge in job 2", self.here("submit", of.folder))
        self.assertEqual((self.place / "released").read_text(), "1_1\n2\n")
        self.set_states(["NODE_FAIL"] + ["PENDING"] * 2, [held])  # what it waits for is sent anew, and so is it
        self.assertNotIn("Released", self.here("submit", of.folder))
        self.assertEqual([job["states"][0].split()[0] for job in self.jobs()[1:]], ["CANCELLED", "PENDING", "PENDING"])
        self.set_states(["PENDING"] * 3)
        self.assertIn("Cancelled 3 jobs", self.here("cancel", of.folder))

    def test_what_sbatch_refuses_or_takes_without_an_answer(self) -> None:
        for trouble, said in (("refuse", "invalid partition"), ("lose", "Socket timed out")):
            with self.subTest(trouble):
                (self.place / "jobs.json").unlink(missing_ok=True)
                (self.place / trouble).write_text("2")
                of = self.parts(7, folder=f"{trouble}d")
                told = self.here("submit", of.folder, "--partition", "nihgt", code=1)
                for words in (said, "--partition=nihgt", "Sent job 1: part-1 to part-3 (3 tasks)"):
                    self.assertIn(words, told)
                self.here("submit", of.folder)
                tasks = [task for job in self.jobs() for task in self.tasks_of(job)]
                self.assertEqual(tasks, [task.id for task in of.tasks])
                waits = self.jobs()[-1]["options"]["dependency"].split(":")
                self.assertEqual((waits[0], sorted(waits[1:])), ("afterany", ["1", "2", "3"]))
                self.assertIn("Cancelled 4 jobs", self.here("cancel", of.folder))
                self.assertEqual({state for job in self.jobs() for state in job["states"]}, {"CANCELLED"})

    def test_a_job_with_the_id_of_ours_is_left_alone(self) -> None:
        of = self.parts(2)
        self.here("submit", of.folder)
        jobs = self.jobs()
        jobs[0]["options"]["job-name"] = "another's"
        (self.place / "jobs.json").write_text(json.dumps(jobs))
        self.assertEqual(engines.states(of), {"part-1": "gone", "part-2": "gone", "merge": "pending"})
        self.assertIn("Cancelled 1 job of hand.export: 2.", self.here("cancel", of.folder))
        self.assertEqual([job["states"] for job in self.jobs()], [["PENDING", "PENDING"], ["CANCELLED"]])
        self.assertIn("Nothing of hand.export", self.here("cancel", of.folder))

    def test_a_dry_run_writes_nothing(self) -> None:
        of = self.parts(2)
        for engine in ("slurm", "make", "list", "openjd"):
            told = self.here("submit", of.folder, "--engine", engine, "--dry-run")
            self.assertIn("part-2", told)
        self.assertEqual([path.name for path in of.folder.iterdir()], ["plan.json"])
        self.assertEqual(self.jobs(), [])
        (self.place / "bin/squeue").unlink()
        os.environ["PATH"] = str(self.place / "bin")
        (of.folder / "state").mkdir()
        (of.folder / "state/slurm.json").write_text('{"format": "neuralWarp farm slurm jobs", "version": 1, "jobs": '
                                                    '[{"name": "a", "submitted": "", "id": "1", "tasks": ["merge"]}]}')
        with self.assertRaisesRegex(FarmError, "squeue is not on the PATH"):
            engines.states(of)


class ScriptTest(AtFakeSlurm):
    def run_script(self, program: str, restarts: int, number: Optional[int] = None) -> tuple[int, str]:
        """Its status and what it says; `number` is sent to it, twice, as soon as the program has begun."""
        text = script("a\ntitle", ["sh", "-c", program], ["x", "y"], {"SHOW": "it's"})
        environment = {"PATH": os.environ["PATH"], "SLURM_CONF": str(self.place), "SLURM_RESTART_COUNT": str(restarts),
                       "SLURM_JOB_ID": "9", "SLURM_ARRAY_JOB_ID": "5", "SLURM_ARRAY_TASK_ID": "1"}
        process = subprocess.Popen(["bash", "-c", text], cwd=self.place, env=environment, text=True,
                                   stdout=subprocess.PIPE, stderr=subprocess.STDOUT)
        if number is not None:
            self.wait_until((self.place / "begun").exists)
            (self.place / "begun").unlink()
            process.send_signal(number)
            time.sleep(0.1)
            process.send_signal(number)  # while the program is ending
        said = process.communicate(timeout=60)[0]
        return process.returncode, said

    def test_what_begins_again(self) -> None:
        keeps = "trap 'sleep 0.3; exit 143' TERM; : > begun; while :; do sleep 0.05; done"
        ends_well = "trap 'sleep 0.3; exit 0' TERM; : > begun; while :; do sleep 0.05; done"
        table = [("exit 0", 0, None, 0, False), ("exit 3", 0, None, 3, False), ("exit 75", 0, None, 75, True),
                 ("exit 75", 4, None, 75, True), ("exit 75", 5, None, 75, False), ("kill -9 $$", 0, None, 137, True),
                 (keeps, 0, signal.SIGUSR1, 143, True), (keeps, 5, signal.SIGUSR1, 143, False),
                 (keeps, 0, signal.SIGTERM, 143, False), (ends_well, 0, signal.SIGUSR1, 0, False)]
        for program, restarts, number, code, again in table:
            with self.subTest(program=program, restarts=restarts, number=number):
                status, said = self.run_script(program, restarts, number)
                self.assertEqual((status, "scontrol requeue 5_1\n" in said), (code, again), said)
                self.assertIn(f"job 5_1, start {restarts + 1}: y ended with {code}", said)

    def test_a_busy_controller_is_asked_again(self) -> None:
        for heard, again in [(3, True), (20, False)]:
            (self.place / "hear").write_text(str(heard))
            with self.subTest(heard=heard), mock.patch("neuralwarp_farm.engines.slurm.script.REQUEUE_PAUSE", 0):
                status, said = self.run_script("exit 75", 0)
                self.assertEqual((status, "scontrol requeue 5_1\n" in said), (75, again), said)
                self.assertEqual(said.count("requeue 5_1 failed, try "), 2 if again else 8, said)


if __name__ == "__main__":
    unittest.main()
