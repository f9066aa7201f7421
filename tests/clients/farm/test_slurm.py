# SPDX-License-Identifier: Apache-2.0
"""What becomes of a task on a real Slurm: two nodes on this machine, for all of these tests. The program of a task is
rows.py, which is met before its last row."""

import contextlib
import os
import re
import signal
import subprocess
import sys
import tempfile
import time
import unittest
from collections.abc import Callable, Iterator
from pathlib import Path
from typing import Optional

from neuralwarp_farm import plan
from neuralwarp_farm.plan import Plan, Resources, Result, Task
from private_slurm import PrivateSlurm

HERE = Path(__file__).parent
FARM = (sys.executable, str(HERE.parents[2] / "clients/farm/neuralwarp-farm"))
BRINGER = str(HERE.parents[2] / "examples/farm/private_slurm.py")
ENDS_WITH: dict[Optional[signal.Signals], int] = {None: 0, signal.SIGINT: 130, signal.SIGTERM: 143, signal.SIGKILL: -9}
ROWS = 10
PATIENCE = 100.0  # seconds until something that has to come is given up


def wait_for(what: str, is_so: Callable[[], object], said: Callable[[], str] = str) -> None:
    until = time.monotonic() + PATIENCE
    while not is_so():
        if time.monotonic() > until:
            raise AssertionError(f"no {what} in {PATIENCE:g} s\n{said()}")
        time.sleep(0.1)


class Work:
    """A plan of tasks whose last rows wait for `finish`."""

    def __init__(self, slurm: PrivateSlurm, name: str, tasks: int = 1) -> None:
        self.slurm = slurm
        folder = Path(tempfile.mkdtemp(dir=slurm.folder, prefix=f"{name}-"))
        self.plan = Plan(folder, "export", name, "0", "0", {}, (), None, None, None, {}, tuple(
            Task(f"part-{number}", ("{python}", str(HERE / "rows.py"), f"set{number}", str(ROWS), "go"), (),
                 Result("dataset", f"set{number}"), Resources(cpus=1, memory_mb=100)) for number in range(tasks)))
        plan.write(self.plan)

    def farm(self, *words: str) -> "subprocess.CompletedProcess[str]":
        return subprocess.run([*FARM, *words], env=self.slurm.environment, capture_output=True, text=True)

    def status(self) -> "subprocess.CompletedProcess[str]":
        return self.farm("status", str(self.plan.folder))

    def submit(self, *options: str) -> None:
        done = self.farm("submit", str(self.plan.folder), *options)
        if done.returncode:
            raise AssertionError(f"submit {self.plan.name}: {done.stderr}")

    def wait_for(self, what: str, is_so: Callable[[], object]) -> None:
        wait_for(f"{what} of {self.plan.name}", is_so, lambda: self.said() + self.slurm.run("scontrol", "show", "job"))

    def written(self) -> list[list[int]]:
        """Row and process of each row of the first task that is there, in a part or in the whole."""
        for folder in ("set0.part", "set0"):
            with contextlib.suppress(FileNotFoundError):
                lines = (self.plan.folder / folder / "rows").read_text().splitlines()
                return [[int(word) for word in line.split()] for line in lines]
        return []

    def wait_for_rows(self) -> None:
        self.wait_for("rows", lambda: len(self.written()) == ROWS - 1)

    def finish(self) -> None:
        """Lets the last rows be written, and waits for them."""
        (self.plan.folder / "go").touch()
        self.wait_for("end", lambda: self.status().returncode == 0)

    def said(self) -> str:
        """What the scripts of jobs and the tasks have written."""
        return "".join(log.read_text() for log in sorted((self.plan.folder / "logs").glob("*")))


@contextlib.contextmanager
def only(slurm: PrivateSlurm, node: str) -> Iterator[None]:
    """Meanwhile nothing begins elsewhere."""
    others = ",".join(name for name in slurm.nodes if name != node)
    slurm.run("scontrol", "update", f"NodeName={others}", "State=DRAIN", "Reason=test")
    yield
    slurm.run("scontrol", "update", f"NodeName={others}", "State=RESUME")


class OnSlurm(unittest.TestCase):
    slurm: PrivateSlurm
    limited: Work  # begun before all others, as Slurm counts in minutes

    @classmethod
    def setUpClass(cls) -> None:
        ending = contextlib.ExitStack()
        cls.slurm = ending.enter_context(PrivateSlurm(cpus=4))
        cls.addClassCleanup(ending.close)
        cls.limited = Work(cls.slurm, "limited")
        with only(cls.slurm, "node1"):
            cls.limited.submit("--time", "1", "--constraint", "node1")  # where no other test meets it
            cls.limited.wait_for_rows()

    def begin(self, name: str) -> Work:
        """Work that has begun on the second node, and which the first may take over."""
        work = Work(self.slurm, name)
        with only(self.slurm, "node2"):
            work.submit()
            work.wait_for_rows()
        return work

    def check_goes_on(self, work: Work) -> None:
        """Another process takes over where the first was ended."""
        work.wait_for("second start", lambda: ", start 2: " in work.said())
        self.check_rows(work, writers=2)

    def check_rows(self, work: Work, writers: int) -> None:
        """Each row once, in order, by so many processes one after another."""
        work.finish()
        rows, processes = zip(*work.written())
        self.assertEqual(list(rows), list(range(ROWS)), work.said())
        self.assertEqual(len(set(processes)), writers, work.said())

    def test_killed(self) -> None:
        work = self.begin("killed")
        os.kill(work.written()[0][1], signal.SIGKILL)
        self.check_goes_on(work)

    def test_preempted(self) -> None:
        work = self.begin("preempted")
        self.slurm.run("sbatch", "--partition=urgent", "--nodelist=node2", "--cpus-per-task=4", "--output=/dev/null",
                       f"--chdir={self.slurm.folder}", "--wrap=sleep 1")
        self.check_goes_on(work)
        self.assertIn("asked to end", work.said())

    def test_time_limit(self) -> None:
        """TERM comes before the end. Slurm may warn a minute early."""
        self.check_goes_on(self.limited)
        self.assertRegex(self.limited.said(), r"ended with 143.* the time limit is near(.|\n)*begins again")

    def test_sent_twice(self) -> None:
        """By four at one moment: it is sent once."""
        work = Work(self.slurm, "twice", tasks=3)
        senders = [subprocess.Popen([*FARM, "submit", work.plan.folder], env=self.slurm.environment,
                                    stdout=subprocess.PIPE, text=True) for _ in range(4)]
        said = sorted(sender.communicate()[0] for sender in senders)
        self.assertEqual([sender.returncode for sender in senders], [0] * 4)
        self.assertEqual([text.partition(" ")[0] for text in said], ["Nothing"] * 3 + ["Sent"], said)
        self.check_rows(work, writers=1)
        self.assertEqual(work.said().count("begins"), 3, work.said())

    def test_node_lost(self) -> None:
        work = self.begin("lost")
        self.addCleanup(self.slurm.start_node, "node2")
        self.slurm.lose_node("node2")
        self.check_goes_on(work)

    def test_node_silent(self) -> None:
        """A node that is only thought lost: its task goes on, and its twin elsewhere is tried again until it ends."""
        work = self.begin("silent")
        self.addCleanup(os.kill, self.slurm.pids["node2"], signal.SIGCONT)
        os.kill(self.slurm.pids["node2"], signal.SIGSTOP)
        work.wait_for("twin that is tried again", lambda: re.search(r"ended with 75\n.*begins again", work.said()))
        self.check_rows(work, writers=1)

    def test_node_that_starts_nothing(self) -> None:
        """Slurm holds what the node could not start, until submit releases it."""
        work = Work(self.slurm, "held", tasks=2)
        spool, away = self.slurm.folder / "node2", self.slurm.folder / "node2.away"
        spool.rename(away)
        spool.touch()  # no folder, so that there is no place for the script
        try:
            work.submit("--constraint", "node2")
            work.wait_for("failed start", lambda: work.status().stdout.count("no node has started it") == 2)
        finally:
            spool.unlink()
            away.rename(spool)
        self.assertEqual(work.farm("submit", str(work.plan.folder)).stdout.count("Released part-"), 2)
        self.check_rows(work, writers=1)


class EndOfSlurm(unittest.TestCase):
    def test_nothing_is_left(self) -> None:
        """However the one ends who has brought a Slurm up: no daemon, no task, no folder."""
        command = 'sbatch --output=$1/out --wrap "touch $1/runs; sleep 1000" && echo $SLURM_CONF >$1/conf && cat'
        with contextlib.ExitStack() as ending:
            begun = []
            for number in ENDS_WITH:
                folder = Path(ending.enter_context(tempfile.TemporaryDirectory()))
                begun.append((number, folder, ending.enter_context(subprocess.Popen(
                    [sys.executable, BRINGER, "--nodes", "1", "sh", "-c", command, "sh", folder],
                    stdin=subprocess.PIPE, stdout=subprocess.DEVNULL, start_new_session=True))))
            for number, folder, bringer in begun:
                with self.subTest(number):
                    self.check_end(number, folder, bringer)

    def check_end(self, number: Optional[signal.Signals], folder: Path, bringer: "subprocess.Popen[bytes]") -> None:
        wait_for("task", (folder / "runs").exists)
        wait_for("command", lambda: (folder / "conf").exists() and (folder / "conf").read_text())
        configuration = (folder / "conf").read_text().strip()
        self.assertGreaterEqual(len(processes_of(configuration)), 5)
        if number == signal.SIGINT:
            os.killpg(bringer.pid, number)  # as a terminal does
        elif number:
            bringer.send_signal(number)
        assert bringer.stdin
        bringer.stdin.close()
        self.assertEqual(bringer.wait(), ENDS_WITH[number])
        wait_for("end of all", lambda: not processes_of(configuration))
        wait_for("end of its folder", lambda: not Path(configuration).parent.exists())


def processes_of(configuration: str) -> list[str]:
    """Those that find this Slurm by their environment: daemons, steps and tasks."""
    found = []
    for folder in Path("/proc").glob("[0-9]*"):
        with contextlib.suppress(OSError):  # it has ended meanwhile
            if f"SLURM_CONF={configuration}".encode() in (folder / "environ").read_bytes().split(b"\0"):
                found.append((folder / "cmdline").read_bytes().replace(b"\0", b" ").decode(errors="replace"))
    return found


if __name__ == "__main__":
    unittest.main()
