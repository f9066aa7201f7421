#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""demo.py HAND.glb: a night on a farm in a minute or two. A Slurm of two nodes comes up on this machine; the rigged
hand is posed, and its targets, its data set and two trainings are made in parts by neuralwarp-farm, one of them killed
on purpose; then all of it is made once more without a farm, and has to be the same, byte for byte.

Run with a Python that has NumPy and SciPy, for the program of the targets (scripts/find_python.sh)."""

import argparse
import json
import os
import shutil
import signal
import subprocess
import sys
import time
from collections.abc import Callable
from dataclasses import dataclass
from pathlib import Path

from private_slurm import PrivateSlurm, SlurmError

ROOT = Path(__file__).resolve().parents[2]
HAND = ROOT / "examples/hand"
FARM = ROOT / "clients/farm/neuralwarp-farm"
TRAINER = ROOT / "scripts/neuralwarp-train"
SKIN = "l_handMeshNode_skin.outputGeom[0]"
NETWORK = ("--principal-shapes", "--activation", "SiLU", "--linear-path", "--local-neurons", "--seed", "1")
# sums are made in the order that the number of threads gives: as of a task with one core
ONE_THREAD = ("OMP_NUM_THREADS=1", "OPENBLAS_NUM_THREADS=1")
SHARED = ("PATH", "HOME", "USER", "LOGNAME", "LANG", "TMPDIR", "SLURM_CONF")
WIDTHS = (64, 128)
PATIENCE = 3600.0  # seconds without which a plan has to be complete


class DemoError(Exception):
    """What went wrong, in a sentence."""


@dataclass
class Step:
    """A line of the table that the demo ends with."""

    name: str
    tasks: int
    on_the_farm: float
    here: float
    bytes: int


def main() -> int:
    arguments = parse_arguments()
    signal.signal(signal.SIGTERM, lambda *_: sys.exit(143))
    try:
        begin = time.monotonic()
        # a core a task, and all cores between the nodes
        with PrivateSlurm(cpus=max(1, (os.cpu_count() or 1) // 2)) as slurm:
            say(f"a Slurm of two nodes, brought up as {user()}", time.monotonic() - begin)
            table = Demo(arguments, slurm).run()
        print(text_of(table))
        return 0
    except (DemoError, SlurmError) as error:
        print(f"demo.py: {error}", file=sys.stderr)
    except OSError as error:
        print(f"demo.py: {error.filename}: {error.strerror}", file=sys.stderr)
    except KeyboardInterrupt:
        print("\ndemo.py: interrupted; the farm is down", file=sys.stderr)
        return 130
    return 1


def parse_arguments() -> argparse.Namespace:
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("hand", metavar="HAND.glb", type=Path, help="what scripts/fetch_hand.sh fetches")
    parser.add_argument("-o", "--output", metavar="FOLDER", type=Path, required=True, help="what is made; an earlier "
                        "demo's is replaced")
    parser.add_argument("--quarn", metavar="PATH", required=True)
    parser.add_argument("--samples", metavar="N", type=int, default=400, help="poses (default: 400)")
    parser.add_argument("--parts", metavar="N", type=int, default=6, help="that they are cut into (default: 6)")
    parser.add_argument("--epochs", metavar="N", type=int, default=60, help="of each training (default: 60)")
    return parser.parse_args()


class Demo:
    def __init__(self, arguments: argparse.Namespace, slurm: PrivateSlurm) -> None:
        self.arguments = arguments
        # as small as that of a task: a shell may have what changes how sums are made (OPENBLAS_CORETYPE)
        self.environment = {name: value for name, value in slurm.environment.items() if name in SHARED}
        self.environment |= {"NW_PYTHON": sys.executable, "QUARN": arguments.quarn}
        self.folder = arguments.output.absolute()
        self.scenes, self.plans, self.farm, self.here = (
            self.folder / name for name in ("scenes", "plans", "farm", "one-machine"))
        for folder in (self.scenes, self.plans, self.farm, self.here):
            shutil.rmtree(folder, ignore_errors=True)
            folder.mkdir(parents=True)

    def run(self) -> list[Step]:
        self.poses()
        return [self.targets(), self.data_set(), self.trainings()]

    # --- the steps ---

    def poses(self) -> None:
        begin = time.monotonic()
        hand = str(self.scenes / "hand.json")
        self.quarn("import", str(self.arguments.hand), "-o", hand, "--neural-warp", "--parents",
                   str(HAND / "parents.json"), "--limits", str(HAND / "limits.json"), "--smoothing", "5")
        self.quarn("pose", hand, "--samples", str(self.arguments.samples), "--activation-rate", "0.8", "--limit-rate",
                   "0.3", "--seed", "1", "-o", str(self.scenes / "poses.json"))
        say(f"{self.arguments.samples} poses of the hand", time.monotonic() - begin)

    def targets(self) -> Step:
        poses, made, other = str(self.scenes / "poses.json"), self.farm / "targets.npy", self.here / "targets.npy"

        def alone() -> None:
            skin = str(self.here / "skin.npy")
            self.quarn("bake", poses, SKIN, "-o", skin)
            self.call(sys.executable, str(HAND / "targets.py"), poses, skin, "-o", str(other))
        step = self.step("targets", [(made, other)], alone, "targets", poses, "--result", str(made), *self.cut(),
                         "--", sys.executable, str(HAND / "target_command.py"), meanwhile=self.kill_one)
        self.quarn("target", poses, "--cache", str(made), "-o", str(self.scenes / "targets.json"))
        return step

    def data_set(self) -> Step:
        scene, made, other = str(self.scenes / "targets.json"), self.farm / "set", self.here / "set"
        return self.step("data set", [(made, other)], lambda: self.quarn("export", scene, "-o", str(other)),
                         "export", scene, "--result", str(made), *self.cut())

    def trainings(self) -> Step:
        words = [*NETWORK, "--epochs", str(self.arguments.epochs)]
        listed = self.plans / "sweep.json"
        listed.write_text(json.dumps([{"name": "hand", "dataset": str(self.farm / "set"),
                                       "arguments": [*words, "--neurons", "{neurons}"], "each": {"neurons": WIDTHS}}]))
        models = [f"models/hand.{width}.nwrp" for width in WIDTHS]

        def alone() -> None:
            for width, model in zip(WIDTHS, models):
                self.call("env", *ONE_THREAD, str(TRAINER), "train", str(self.farm / "set"), "-o",
                          str(self.here / model), "--threads", "1", *words, "--neurons", str(width))
        return self.step("trainings", [(self.plans / "train" / model, self.here / model) for model in models], alone,
                         "train", str(listed), "--memory", "1000")

    def step(self, name: str, results: list[tuple[Path, Path]], alone: Callable[[], None], kind: str, *words: str,
             meanwhile: Callable[[Path], None] = lambda plan: None) -> Step:
        """A plan carried out by Slurm, and the same by `alone`: both leave the same bytes in `results`."""
        begin = time.monotonic()
        plan = self.plans / kind
        self.call(sys.executable, str(FARM), "plan", kind, *words[:1], "-o", str(plan), *words[1:])
        self.call(sys.executable, str(FARM), "submit", str(plan))
        meanwhile(plan)
        tasks = self.wait_for(plan)
        on_the_farm = time.monotonic() - begin
        say(f"{name} on the farm, in {tasks} tasks", on_the_farm)
        begin = time.monotonic()
        alone()
        here = time.monotonic() - begin
        say(f"{name} without it", here)
        return Step(name, tasks, on_the_farm, here, sum(compared(made, other) for made, other in results))

    # --- what they need ---

    def wait_for(self, plan: Path) -> int:
        """Until a plan is complete; the number of its tasks."""
        until = time.monotonic() + PATIENCE
        while True:
            done = subprocess.run([sys.executable, FARM, "status", plan, "--json"], env=self.environment,
                                  capture_output=True, text=True)
            report = json.loads(done.stdout) if done.stdout else {}
            if done.returncode == 0:
                return len(report["tasks"])
            if done.returncode != 3 or time.monotonic() > until:
                said = [f"{task['id']} {task['state']}: {task['detail']}; {task['log']}"
                        for task in report.get("tasks", []) if task["state"] == "failed"]
                raise DemoError(f"{plan}: " + ("\n".join(said) or done.stderr or f"not complete in {PATIENCE:g} s"))
            time.sleep(0.3)

    def kill_one(self, plan: Path) -> None:
        """What the second part's task runs is killed in the middle of its work."""
        part = json.loads((plan / "plan.json").read_text())["tasks"][1]
        place = str(plan / part["result"]["path"])
        until = time.monotonic() + PATIENCE
        while not (list(Path(f"{place}.part").glob("scratch.*")) and (found := programs_with(place))):
            if time.monotonic() > until:
                raise DemoError(f"{part['id']} has not begun in {PATIENCE:g} s: {plan}/logs")
            time.sleep(0.02)
        os.killpg(found[0], signal.SIGKILL)
        say(f"killed: {part['id']}, process {found[0]}")

    def cut(self) -> list[str]:
        return ["--parts", str(self.arguments.parts), "--cpus", "1", "--memory", "500"]

    def quarn(self, *words: str) -> None:
        self.call(self.arguments.quarn, *words)

    def call(self, *words: str) -> None:
        done = subprocess.run(words, env=self.environment, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                              stderr=subprocess.STDOUT, text=True)
        if done.returncode:
            raise DemoError(f"{' '.join(words)}\nended with {done.returncode}: {done.stdout[-2000:]}")


def programs_with(word: str) -> list[int]:
    """Processes that lead a group of their own, as the program of a task does, and have this word on their command
    line."""
    found = []
    for folder in Path("/proc").glob("[0-9]*"):
        try:
            words = (folder / "cmdline").read_bytes().split(b"\0")
            if word.encode() in words and os.getpgid(int(folder.name)) == int(folder.name):
                found.append(int(folder.name))
        except OSError:  # it has ended meanwhile
            pass
    return found


def compared(made: Path, other: Path) -> int:
    """How many bytes are the same in a file, or in all files of a folder. Raises DemoError for the first difference."""
    files = {place: sorted(file.relative_to(place) for file in place.rglob("*") if file.is_file())
             if place.is_dir() else [Path()] for place in (made, other)}
    if files[made] != files[other]:
        raise DemoError(f"{made} and {other} have other files: {set(files[made]) ^ set(files[other])}")
    total = 0
    for file in files[made]:
        content = (made / file).read_bytes()
        if content != (other / file).read_bytes():
            raise DemoError(f"{made / file} and {other / file} are not the same")
        total += len(content)
    return total


def text_of(table: list[Step]) -> str:
    lines = [f"{'':12}{'tasks':>8}{'farm':>10}{'without':>10}{'the same':>14}"]
    lines += [f"{step.name:12}{step.tasks:8}{step.on_the_farm:8.1f} s{step.here:8.1f} s{step.bytes / 1e6:10.2f} MB"
              for step in table]
    return "\n".join(lines)


def say(what: str, seconds: float = -1) -> None:
    print(f"   {what:52}{f'{seconds:6.1f} s' if seconds >= 0 else ''}", flush=True)


def user() -> str:
    return "root" if os.geteuid() == 0 else f"the user {os.environ.get('USER', os.geteuid())}"


if __name__ == "__main__":
    sys.exit(main())
