#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""private_slurm.py [--nodes N] [--cpus N] [COMMAND [ARGS...]]: a Slurm of one's own on this machine, for as long as a
command (by default a shell) runs: controller, nodes and credentials as the user who calls, all of it in one temporary
folder, reachable from this machine alone. What is in /etc is neither read nor written. In the command, sbatch, squeue
and the others find it by SLURM_CONF."""

import argparse
import contextlib
import getpass
import json
import os
import shutil
import signal
import socket
import subprocess
import sys
import tempfile
import time
from collections.abc import Callable, Mapping, Sequence
from pathlib import Path
from types import TracebackType
from typing import Optional

PROGRAMS = ("munged", "slurmctld", "slurmd", "srun", "sbatch", "scontrol", "squeue", "scancel", "sinfo")
SEARCHED = os.pathsep.join([os.environ.get("PATH", os.defpath), "/usr/sbin", "/sbin"])
READY_SECONDS = 60.0
LONGEST_SOCKET = 107  # bytes of a path in sockaddr_un

# What a Slurm that lives for minutes, without cgroups and a database, wants other than a cluster.
SETTINGS = """\
ClusterName=private
SlurmctldHost={host}(127.0.0.1)
SlurmctldPort={ports[0]}
SlurmUser={user}
SlurmdUser={user}
# heard on this machine alone
CommunicationParameters=NoCtldInAddrAny,NoInAddrAny
AuthType=auth/munge
# a requeued job waits until its credential has run out: seven seconds with six, two minutes without a word
AuthInfo=socket={folder}/munge/socket,cred_expire=6
CredType=cred/munge
StateSaveLocation={folder}/state
SlurmdSpoolDir={folder}/%n
SlurmctldPidFile={folder}/slurmctld.pid
SlurmdPidFile={folder}/%n.pid
SlurmctldLogFile={folder}/slurmctld.log
SlurmdLogFile={folder}/%n.log
ProctrackType=proctrack/linuxproc
TaskPlugin=task/none
JobAcctGatherType=jobacct_gather/none
AccountingStorageType=accounting_storage/none
MpiDefault=none
SelectType=select/cons_tres
SelectTypeParameters=CR_CPU_Memory
# nodes say of themselves what is written here, not what this machine has
SlurmdParameters=config_overrides
# a dead node is noticed after the first, one that hangs when messages to it have timed out besides
SlurmdTimeout=5
MessageTimeout=4
KillWait=5
JobRequeue=1
ReturnToService=2
PreemptType=preempt/partition_prio
PreemptMode=REQUEUE
SchedulerParameters=batch_sched_delay=0,sched_interval=1,bf_interval=1
DefMemPerCPU=100
"""
NODE = ("NodeName={name} NodeHostname={host} NodeAddr=127.0.0.1 Port={port} CPUs={cpus} RealMemory=16000 "
        "Feature={name}\n")
# what is asked of `urgent` takes the place of what runs in `farm`, which is requeued
PARTITIONS = """\
PartitionName=farm Nodes=ALL Default=YES PriorityTier=1 MaxTime=INFINITE DefaultTime=60 State=UP
PartitionName=urgent Nodes=ALL PriorityTier=2 PreemptMode=OFF MaxTime=INFINITE DefaultTime=60 State=UP
"""


class SlurmError(Exception):
    """What went wrong, in a sentence."""


def missing_programs() -> list[str]:
    return [name for name in PROGRAMS if shutil.which(name, path=SEARCHED) is None]


class PrivateSlurm:
    """Two nodes, or more, from `with` to its end: `environment` is what a command needs to find them."""

    def __init__(self, nodes: int = 2, cpus: int = 2, settings: str = "") -> None:
        """`cpus` of each node, whatever this machine has; `settings` are further lines of slurm.conf."""
        self.nodes = [f"node{number + 1}" for number in range(nodes)]
        self.pids: dict[str, int] = {}  # of munged, slurmctld and the nodes
        self._cpus = cpus
        self._settings = settings
        self._ending = contextlib.ExitStack()

    def __enter__(self) -> "PrivateSlurm":
        if missing := missing_programs():
            raise SlurmError(f"no {', '.join(missing)} here: ./run deps installs Slurm (Debian: slurm-wlm, munge)")
        with contextlib.ExitStack() as ending:
            self.folder = Path(tempfile.mkdtemp(prefix="nw-slurm-"))
            self.configuration = self.folder / "slurm.conf"
            self.environment = {**without_slurm(os.environ), "SLURM_CONF": str(self.configuration), "PATH": SEARCHED}
            self._keeper = ending.enter_context(contextlib.closing(Keeper(self.folder, self.environment)))
            self._configure()
            self._start_munged()
            self._start("slurmctld", "-D", "-i")
            for node in self.nodes:
                self.start_node(node)
            self._wait_until_ready()
            self._ending = ending.pop_all()
        return self

    def __exit__(self, kind: Optional[type[BaseException]], error: Optional[BaseException],
                 trace: Optional[TracebackType]) -> None:
        self._ending.close()

    def run(self, *command: str, seconds: float = 60) -> str:
        """What one of Slurm's commands prints. Raises SlurmError with what it says where it fails."""
        try:
            done = subprocess.run(command, env=self.environment, capture_output=True, text=True, timeout=seconds)
        except subprocess.TimeoutExpired as error:
            raise SlurmError(f"{' '.join(command)}: no answer in {seconds:g} s") from error
        if done.returncode:
            raise SlurmError(f"{' '.join(command)}: {done.stderr.strip() or f'ended with {done.returncode}'}")
        return done.stdout

    def start_node(self, name: str) -> None:
        """Starts one of `nodes`, also anew where its slurmd is dead."""
        (self.folder / name).mkdir(exist_ok=True)
        self._start("slurmd", "-D", "-N", name, name=name)

    def lose_node(self, name: str) -> None:
        """Ends one of `nodes` as a loss of power does: its slurmd, and all that runs there."""
        os.kill(self.pids[name], signal.SIGKILL)
        for process in self._processes_on(name):
            with contextlib.suppress(ProcessLookupError):
                os.kill(process, signal.SIGKILL)

    def _processes_on(self, name: str) -> list[int]:
        """The job steps of a node, then what runs in them."""
        marks = {f"SLURMD_NODENAME={name}".encode(), f"SLURM_CONF={self.configuration}".encode()}
        steps, tasks = set(), []
        for folder in Path("/proc").glob("[0-9]*"):
            with contextlib.suppress(OSError, IndexError):  # it has ended meanwhile, or is another's
                if marks <= set((folder / "environ").read_bytes().split(b"\0")):
                    tasks.append(int(folder.name))
                    parent = (folder / "stat").read_text().rpartition(")")[2].split()[1]
                    if Path("/proc", parent, "comm").read_text().startswith("slurmstepd"):
                        steps.add(int(parent))
        return [*steps, *tasks]

    # --- bringing it up ---

    def _configure(self) -> None:
        user, host = getpass.getuser(), socket.gethostname().split(".")[0]
        ports = free_ports(1 + len(self.nodes))
        text = SETTINGS.format(host=host, ports=ports, user=user, folder=self.folder)
        for name, port in zip(self.nodes, ports[1:]):
            text += NODE.format(name=name, host=host, port=port, cpus=self._cpus)
        self.configuration.write_text(text + PARTITIONS + self._settings)
        (self.folder / "state").mkdir()

    def _start_munged(self) -> None:
        place = self.folder / "munge"
        if len(os.fsencode(place / "socket")) > LONGEST_SOCKET:
            raise SlurmError(f"{place}/socket: too long a path for a socket; set TMPDIR to a shorter one")
        place.mkdir(mode=0o700)
        key = place / "key"
        key.touch(mode=0o600)
        key.write_bytes(os.urandom(128))
        files = {"key-file": "key", "socket": "socket", "pid-file": "pid", "seed-file": "seed", "log-file": "log"}
        # forced: it wants everybody to reach its socket, which is ours alone
        self._start("munged", "--foreground", "--force", *(f"--{name}={place / file}" for name, file in files.items()))
        self._wait_until("munged listens", lambda: (place / "socket").exists())

    def _wait_until_ready(self) -> None:
        """sinfo says that nodes are idle before they answer: only a job on all of them tells."""
        self._wait_until("a job on all nodes", self._runs_everywhere)

    def _runs_everywhere(self) -> bool:
        try:
            self.run("srun", f"-N{len(self.nodes)}", "--immediate=5", "true", seconds=20)
        except SlurmError:
            return False
        return True

    def _wait_until(self, what: str, is_so: Callable[[], bool]) -> None:
        until = time.monotonic() + READY_SECONDS
        while not is_so():
            ended = [name for name, pid in self.pids.items() if not Path(f"/proc/{pid}/exe").exists()]
            if ended or time.monotonic() > until:
                said = f"{ended[0]} has ended" if ended else f"no sign of it in {READY_SECONDS:g} s"
                raise SlurmError(f"bringing up Slurm, {what}: {said}\n{self._last_words(ended or list(self.pids))}")
            time.sleep(0.1)

    def _last_words(self, names: Sequence[str]) -> str:
        logs = [self.folder / f"{name}{ending}" for name in names for ending in (".log", ".out")]
        lines = [f"{log.name}: {line}" for log in logs if log.exists()
                 for line in log.read_text(errors="replace").splitlines()[-5:]]
        return "\n".join(lines)

    def _start(self, program: str, *words: str, name: str = "") -> None:
        name = name or program
        path = shutil.which(program, path=SEARCHED)
        self.pids[name] = self._keeper.start(self.folder / f"{name}.out", str(path), *words)


class Keeper:
    """keeper.py at work: when this process closes it or dies, what it has started is ended, with all that came of it,
    and the folder is removed."""

    def __init__(self, folder: Path, environment: Mapping[str, str]) -> None:
        # a group of its own: the Ctrl-C that ends this process is not meant for it
        self._process = subprocess.Popen(
            [sys.executable, str(Path(__file__).with_name("keeper.py")), str(folder)], env=environment, text=True,
            stdin=subprocess.PIPE, stdout=subprocess.PIPE, start_new_session=True)

    def start(self, log: Path, *command: str) -> int:
        assert self._process.stdin and self._process.stdout
        self._process.stdin.write(json.dumps([str(log), *command]) + "\n")
        self._process.stdin.flush()
        answer = self._process.stdout.readline().strip()
        if not answer.isdecimal():
            raise SlurmError(f"{command[0]} cannot be started: {answer or 'its keeper is gone'}")
        return int(answer)

    def close(self) -> None:
        """Comes back when everything has ended; a Ctrl-C meanwhile makes it no shorter."""
        assert self._process.stdin and self._process.stdout
        with contextlib.suppress(BrokenPipeError):
            self._process.stdin.close()
        interrupted = False
        while self._process.poll() is None:
            try:
                self._process.wait()
            except KeyboardInterrupt:
                interrupted = True
        self._process.stdout.close()
        if interrupted:
            raise KeyboardInterrupt


def without_slurm(environment: Mapping[str, str]) -> dict[str, str]:
    """Of another cluster, of which this process may be a job, nothing is passed on."""
    beginnings = ("SLURM", "SBATCH_", "SRUN_", "SALLOC_", "SQUEUE_", "SINFO_", "SCANCEL_", "SCONTROL_", "MUNGE")
    return {name: value for name, value in environment.items() if not name.startswith(beginnings)}


def free_ports(count: int) -> list[int]:
    """Ports that nobody listens at now, all of them different."""
    with contextlib.ExitStack() as held:
        sockets = [held.enter_context(socket.socket()) for _ in range(count)]
        for each in sockets:
            each.bind(("127.0.0.1", 0))
        ports = [each.getsockname()[1] for each in sockets]
    return ports


def main() -> int:
    parser = argparse.ArgumentParser(description=__doc__)
    parser.add_argument("--nodes", metavar="N", type=int, default=2, help="how many (default: 2)")
    parser.add_argument("--cpus", metavar="N", type=int, default=2, help="of each node (default: 2)")
    parser.add_argument("command", metavar="COMMAND", nargs=argparse.REMAINDER, help="what is run (default: a shell)")
    arguments = parser.parse_args()
    # an end by a signal is an end as any other: what was brought up is taken down
    signal.signal(signal.SIGTERM, lambda *_: sys.exit(143))
    try:
        with PrivateSlurm(arguments.nodes, arguments.cpus) as slurm:
            command = arguments.command or [os.environ.get("SHELL", "/bin/sh")]
            return subprocess.run(command, env=slurm.environment).returncode
    except SlurmError as error:
        print(f"private_slurm.py: {error}", file=sys.stderr)
    except OSError as error:
        print(f"private_slurm.py: {error.filename}: {error.strerror}", file=sys.stderr)
    except KeyboardInterrupt:
        return 130
    return 1


if __name__ == "__main__":
    sys.exit(main())
