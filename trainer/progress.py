# SPDX-License-Identifier: Apache-2.0
"""What a user sees of a training while it runs, and how it is ended: epochs counted, and Ctrl-C."""

import contextlib
import json
import os
import signal
import sys
import time
from contextlib import contextmanager
from pathlib import Path
from types import FrameType
from typing import Callable, Iterator, Optional

from tqdm import tqdm

from .files import sibling, write_bytes
from .state import History

LINES = 20    # where there is no terminal to draw a bar on
APART = 0.5   # seconds between two states of a file of progress


@contextmanager
def counted(epochs: int, say: Callable[[str], None], shown: bool,
            file: Optional[Path] = None) -> Iterator[Callable[[History], None]]:
    """Gives what fit() calls after each epoch: it moves a bar on a terminal; where there is none it says some lines.
    file: is kept at what is done, for programs that look on"""
    kept = ProgressFile(file, epochs) if file else None
    with contextlib.ExitStack() as stack:
        is_bar = shown and sys.stderr.isatty()
        bar = stack.enter_context(tqdm(total=epochs, unit="epoch", leave=False)) if is_bar else None

        def on_epoch(history: History) -> None:
            if kept:
                kept.keep(len(history.train))
            if bar is None:
                say_line(len(history.train), epochs, history, say)
            else:
                move(bar, history)

        yield on_epoch


class ProgressFile:
    """A file of JSON that says how far a training is, as those of quarn: written anew as a whole, twice a second at
    most."""

    def __init__(self, path: Path, epochs: int) -> None:
        self.path, self.epochs = path, epochs
        self.begin = self.written = time.monotonic()
        self.before: Optional[int] = None  # epochs that were there already: of a training that goes on
        self.write(0, None)

    def keep(self, done: int) -> None:
        """done: epochs, 1 or more. What cannot be written is nothing that a training should end for."""
        now = time.monotonic()
        if self.before is None:
            self.before = done - 1
        if now - self.written < APART and done < self.epochs:
            return
        self.written = now
        with contextlib.suppress(OSError):
            self.write(done, (now - self.begin) / (done - self.before) * (self.epochs - done))

    def write(self, done: int, left: Optional[float]) -> None:
        part = sibling(self.path, ".part")
        state = {"what": "epochs", "done": done, "total": self.epochs, "seconds": time.monotonic() - self.begin,
                 "secondsLeft": left}
        write_bytes(part, (json.dumps(state, indent=1) + "\n").encode())
        os.replace(part, self.path)


def move(bar: tqdm, history: History) -> None:
    bar.set_postfix(loss=f"{history.train[-1]:.2e}", best=f"{history.best_loss:.2e}", refresh=False)
    bar.update()


def say_line(done: int, epochs: int, history: History, say: Callable[[str], None]) -> None:
    if done * LINES // epochs > (done - 1) * LINES // epochs:
        say(f"epoch {done} of {epochs}: loss {history.train[-1]:.2e}, best {history.best_loss:.2e}")


@contextmanager
def noted_signals() -> Iterator[Callable[[], int]]:
    """Gives what tells which signal has come in the meantime: SIGINT (Ctrl-C), SIGTERM, or none (0). A second one ends
    the program at once."""
    asked: list[int] = []
    before = {number: signal.getsignal(number) for number in (signal.SIGINT, signal.SIGTERM)}

    def on_signal(number: int, frame: Optional[FrameType]) -> None:
        asked.append(number)
        signal.signal(signal.SIGINT, signal.default_int_handler)
        signal.signal(signal.SIGTERM, before[signal.SIGTERM])
        if number == signal.SIGINT:
            print("trainer: interrupted: the training ends with the best network so far (Ctrl-C again: without)",
                  file=sys.stderr, flush=True)

    for number, handler in before.items():
        if handler is not signal.SIG_IGN:  # as in a job that a script has put into the background
            signal.signal(number, on_signal)
    try:
        yield lambda: asked[0] if asked else 0
    finally:
        for number, handler in before.items():
            signal.signal(number, handler)
