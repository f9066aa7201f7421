# SPDX-License-Identifier: Apache-2.0
"""Train: `quarn run` as a process of its own, which outlives Blender.

What is known of it is in the folder of the sampling: `job.json` says which process it is, `train.log` has what it said,
and `ended` its status once it has ended. So a job is found again after Blender was closed; one that was ended in the
middle goes on where it was when it is started again, as quarn run does.
"""

from __future__ import annotations

import contextlib
import os
import re
import shlex
import signal
import subprocess
import time
from dataclasses import dataclass
from pathlib import Path
from typing import Any, Dict, List, Optional

from . import preferences
from .refused import Refused
from .run_folder import RunFolder, read_json, write_json

# waits for the program, also when both get a signal, and writes down how it ended
KEEPER = 'trap : TERM INT HUP; "$@"; echo $? >"$0.part"; mv "$0.part" "$0"'
CANCELLED = {130, 128 + signal.SIGINT, 128 + signal.SIGTERM}
TAIL = 4  # lines of the log that are shown

_children: Dict[int, "subprocess.Popen[bytes]"] = {}  # those of this Blender, to be waited for


@dataclass(frozen=True)
class Status:
    state: str  # "none", "runs", "done", "failed", "cancelled", or "stopped": without having said how it ended
    said: str = ""  # of a job that runs, how far it is; of one that failed, why


def start(folder: RunFolder, epochs: int = 0, with_report: bool = True) -> None:
    """Starts the training of what was sampled, or goes on with it: 0 epochs are as many as usual, and the report with
    its pictures can be left out. Refused where it cannot."""
    if not folder.is_sampled:
        raise Refused(f"{folder.path.name} has no samples: sample first")
    if status(folder).state == "runs":
        raise Refused(f"the training of {folder.path.stem} runs already")
    paths = preferences.paths()
    if not paths.quarn:
        raise Refused("the program quarn was not found: say where it is in the add-on's preferences")
    folder.ended.unlink(missing_ok=True)
    words = [paths.quarn, "run", "--recipe", str(folder.recipe), "-o", str(folder.run)]
    if epochs:
        words += ["--epochs", str(epochs)]
    if not with_report:
        words += ["--until", "evaluate"]
    began = time.time()
    with open(folder.log, "wb") as log:
        try:
            child = subprocess.Popen(["/bin/sh", "-c", KEEPER, str(folder.ended), *words], stdin=subprocess.DEVNULL,
                                     stdout=log, stderr=log, start_new_session=True,
                                     env={**os.environ, **trainer(paths, folder)})
        except OSError as error:
            raise Refused(f"the training cannot be started: {error.strerror}") from None
    _children[child.pid] = child
    write_json(folder.job, {"pid": child.pid, "born": born(child.pid), "began": began})


def trainer(paths: preferences.Paths, folder: RunFolder) -> Dict[str, str]:
    """The environment in which quarn run finds the trainer for the Python of the preferences: in an installed tree the
    script beside quarn, with another Python a package that is installed there, in a checkout its own."""
    if not paths.python:
        return {}
    if not os.access(paths.python, os.X_OK):
        raise Refused(f"{paths.python}, the Python of the preferences, cannot be started")
    beside = Path(paths.quarn).resolve().parent / "neuralwarp-train"
    words: List[str] = []
    if beside.is_file():
        words = [paths.python, str(beside)]
    elif has_trainer(paths.python):
        words = [paths.python, "-m", "neuralwarp_trainer"]
    if not words:
        return {"NW_PYTHON": paths.python}
    script = folder.path / "neuralwarp-train"
    script.write_text("#!/bin/sh\nexec " + " ".join(map(shlex.quote, words)) + ' "$@"\n', encoding="utf-8")
    script.chmod(0o755)
    return {"NW_PYTHON": paths.python, "NEURALWARP_TRAINER": str(script)}


def has_trainer(python: str) -> bool:
    finding = "import importlib.util as u, sys; sys.exit(u.find_spec('neuralwarp_trainer') is None)"
    with contextlib.suppress(OSError, subprocess.TimeoutExpired):
        return subprocess.run([python, "-c", finding], capture_output=True, timeout=20).returncode == 0
    return False


def born(pid: int) -> str:
    """Names a process among all that ever had this number: the boot, and its time of start; empty when there is none,
    or when it has ended and nobody has waited for it."""
    try:
        fields = Path(f"/proc/{pid}/stat").read_text(encoding="ascii", errors="replace").rpartition(")")[2].split()
        boot = Path("/proc/sys/kernel/random/boot_id").read_text(encoding="ascii").strip()
    except OSError:
        return ""
    return "" if fields[0] in "ZX" else f"{boot} {fields[19]}"


def running(folder: RunFolder) -> Optional[int]:
    """The process of the folder's job."""
    job = read_json(folder.job)
    pid = job.get("pid")
    if not isinstance(pid, int):
        return None
    child = _children.get(pid)
    if child is not None and child.poll() is not None:
        del _children[pid]
    return pid if job.get("born") and born(pid) == job["born"] else None


def status(folder: RunFolder) -> Status:
    if not folder.job.is_file():
        return Status("none")
    if running(folder) is not None:
        return Status("runs", progress(folder))
    try:
        code = int(folder.ended.read_text(encoding="ascii"))
    except (OSError, ValueError):
        return Status("stopped", "the training was stopped; started again it goes on")
    if code == 0:
        return Status("done")
    if code in CANCELLED:
        return Status("cancelled", "the training was cancelled; started again it goes on")
    said = run_says(folder).get("error") or " / ".join(log_lines(folder)[-TAIL:])
    return Status("failed", said or f"quarn run ended with status {code}")


def cancel(folder: RunFolder, patience: float = 15.0) -> None:
    """Ends a job and what it has started, and waits for it. Refused where none runs."""
    pid = running(folder)
    if pid is None:
        raise Refused(f"no training of {folder.path.stem} runs")
    with contextlib.suppress(ProcessLookupError):
        os.killpg(pid, signal.SIGTERM)
    end = time.monotonic() + patience
    while running(folder) is not None and time.monotonic() < end:
        time.sleep(0.05)
    if running(folder) is not None:
        with contextlib.suppress(ProcessLookupError):
            os.killpg(pid, signal.SIGKILL)


def wait(folder: RunFolder) -> Status:
    """For scripts: until the job has ended."""
    while (now := status(folder)).state == "runs":
        time.sleep(0.2)
    return now


def log_lines(folder: RunFolder) -> List[str]:
    try:
        text = folder.log.read_text(encoding="utf-8", errors="replace")
    except OSError:
        return []
    return [line.strip() for line in re.split(r"[\r\n]+", text) if line.strip()]


def progress(folder: RunFolder) -> str:
    """How far the run is, by what quarn writes of it: "train, step 7 of 15, epochs: 120 of 400, 2 minutes left"."""
    now = run_says(folder)
    if now.get("state") != "running":
        return "the training begins"
    text = f"{now.get('step')}, step {now.get('number')} of {now.get('of')}"
    if now.get("total"):
        text += f", {now.get('what')}: {now.get('done')} of {now.get('total')}"
    left = now.get("secondsLeft")
    return text + (f", {minutes(left)} left" if isinstance(left, (int, float)) else "")


def run_says(folder: RunFolder) -> Dict[str, Any]:
    """The run's progress.json, unless it is of an earlier run."""
    file = folder.run / "progress.json"
    try:
        is_of_now = file.stat().st_mtime >= float(read_json(folder.job).get("began", 0.0))
    except OSError:
        return {}
    return read_json(file) if is_of_now else {}


def minutes(seconds: float) -> str:
    whole = round(seconds / 60)
    return "less than a minute" if seconds < 60 else f"{whole} minute{'s' if whole > 1 else ''}"
