# SPDX-License-Identifier: Apache-2.0
"""Training, in a process of its own: what asks for it goes on by itself, and needs none of the trainer's libraries."""

import json
import os
import re
import subprocess
import sys
import threading
import time
from collections import deque
from pathlib import Path
from signal import SIGINT, SIGKILL
from typing import Any, Callable, Optional, Sequence, Union

StrPath = Union[str, "os.PathLike[str]"]
# epoch, of how many, seconds that are left
Progress = Callable[[int, int, float], object]

PACKAGE = "neuralwarp_trainer"
INTERRUPTED = 130
USAGE = 2
# the trainer lies beside this package; it comes last, so that the libraries of another interpreter are its own
START = (f"import runpy, sys; sys.path[:] = [p for p in sys.path if p] + [sys.argv.pop(1)]; "
         f"runpy.run_module('{PACKAGE}', run_name='__main__', alter_sys=True)")
EPOCH = re.compile(r"epoch (\d+) of (\d+): ")
KEPT_LINES = 20
PATIENCE = 10  # seconds


def train(dataset: StrPath, output: StrPath, *, interpreter: Optional[StrPath] = None, epochs: Optional[int] = None,
          seed: Optional[int] = None, options: Sequence[str] = (), report: Optional[StrPath] = None,
          progress: Optional[Progress] = None) -> dict[str, Any]:
    """Trains a model of a data set, and returns the trainer's report (docs/trainer.md).

    dataset: a folder that `quarn export` wrote. output: the model, NAME.nwrp.
    interpreter: the Python that runs the trainer, with PyTorch and ONNX; this one if not given.
    epochs, seed: the trainer's --epochs and --seed. options: further words of its command line, as
    ["--linear-path", "--threads", "2"]. report: the folder of the report; NAME.report beside the model if not given.
    progress: called with the epoch, the number of epochs and the seconds that are left, some twenty times.

    Ctrl-C ends the training with the best network so far, which is published as any other; then KeyboardInterrupt is
    raised. A second one ends it at once, and publishes nothing. What `progress` raises ends it at once, too.

    Raises FileNotFoundError without a data set; ValueError for an argument that the trainer does not take; RuntimeError
    with the trainer's last lines when the training fails. Relative paths count from the current folder.
    """
    words = [*_command(interpreter), "train", *_arguments(dataset, output, epochs, seed, options, report), "--json"]
    # in a group of its own, so that a Ctrl-C of the terminal reaches it once, from here
    with subprocess.Popen(words, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.PIPE,
                          encoding="utf-8", errors="replace", start_new_session=True) as child:
        try:
            answer, said = _follow(child, progress)
        except BaseException:
            _end(child)
            raise
    return _outcome(child.returncode, answer, said)


def _command(interpreter: Optional[StrPath]) -> list[str]:
    python = os.fspath(interpreter or sys.executable)
    place = Path(__file__).parent.parent
    if not (place / PACKAGE / "__main__.py").exists():
        raise RuntimeError(f"the trainer is missing: there is no {place / PACKAGE}")
    if not os.access(python, os.X_OK):
        raise ValueError(f"interpreter is {python!r}, which is no program")
    return [python, "-c", START, str(place)]


def _arguments(dataset: StrPath, output: StrPath, epochs: Optional[int], seed: Optional[int], options: Sequence[str],
               report: Optional[StrPath]) -> list[str]:
    folder = Path(dataset)
    if not (folder / "dataset.json").is_file():
        raise FileNotFoundError(2, "no training data set (dataset.json)", str(folder))
    if isinstance(options, str) or not all(isinstance(word, str) for word in options):
        raise ValueError(f"options has to be a list of words, not {options!r}")
    words = [str(folder.absolute()), "-o", str(Path(output).absolute()), *options]
    for name, value, least in (("epochs", epochs, 1), ("seed", seed, 0)):
        if value is None:
            continue
        if isinstance(value, bool) or not isinstance(value, int) or value < least:
            raise ValueError(f"{name} has to be a whole number from {least} on, not {value!r}")
        words += [f"--{name}", str(value)]
    return words + (["--report", str(Path(report).absolute())] if report else [])


def _follow(child: "subprocess.Popen[str]", progress: Optional[Progress]) -> tuple[str, list[str]]:
    """Standard output, and the last lines of what it said meanwhile. KeyboardInterrupt when the child has ended
    after one."""
    answer: list[str] = []
    said: deque[str] = deque(maxlen=KEPT_LINES)
    # the answer is larger than a pipe holds
    assert child.stdout and child.stderr
    reader = threading.Thread(target=lambda out: answer.append(out.read()), args=(child.stdout,), daemon=True)
    reader.start()
    clock = _Clock()
    interrupted: Optional[KeyboardInterrupt] = None
    while True:
        try:
            for line in child.stderr:
                said.append(line.rstrip("\n"))
                epoch = EPOCH.match(line)
                if epoch and progress and not interrupted:
                    done, epochs = int(epoch[1]), int(epoch[2])
                    progress(done, epochs, clock.left(done, epochs))
            child.wait()
            reader.join()
            break
        except KeyboardInterrupt as error:
            if interrupted:
                raise
            interrupted = error
            child.send_signal(SIGINT)
    if interrupted:
        raise interrupted
    return answer[0], list(said)


def _end(child: "subprocess.Popen[str]") -> None:
    """At once: without a model, and without the parts of one."""
    try:
        child.terminate()
        child.wait(PATIENCE)
    except subprocess.TimeoutExpired:
        pass
    finally:
        if child.poll() is None:
            os.killpg(child.pid, SIGKILL)  # with the quarn that it may have started


class _Clock:
    """How long a training still takes, by what its epochs have taken; the first that is told of has a start before."""

    def __init__(self) -> None:
        self.begin, self.before = time.monotonic(), 0

    def left(self, done: int, epochs: int) -> float:
        now = time.monotonic()
        left = (now - self.begin) / (done - self.before) * (epochs - done)
        if not self.before:
            self.begin, self.before = now, done
        return left


def _outcome(status: int, answer: str, said: Sequence[str]) -> dict[str, Any]:
    if status in (0, INTERRUPTED) and answer.strip():
        report: dict[str, Any] = json.loads(answer)
        return report
    errors = [line.removeprefix("trainer: ") for line in said if line.startswith("trainer: ")]
    if status == USAGE:
        raise ValueError("\n".join(errors or said))
    why = f"signal {-status}" if status < 0 else f"status {status}"
    raise RuntimeError(f"the training ended with {why}: " + "\n".join(said[-KEPT_LINES:]))
