# SPDX-License-Identifier: Apache-2.0
"""What a user sees of a training while it runs, and how it is ended: epochs counted, and Ctrl-C."""

import signal
import sys
from contextlib import contextmanager
from types import FrameType
from typing import Callable, Iterator, Optional

from tqdm import tqdm

from .state import History

LINES = 20  # where there is no terminal to draw a bar on


@contextmanager
def counted(epochs: int, say: Callable[[str], None], shown: bool) -> Iterator[Callable[[History], None]]:
    """Gives what fit() calls after each epoch: it moves a bar on a terminal; where there is none it says some lines."""
    if shown and sys.stderr.isatty():
        with tqdm(total=epochs, unit="epoch", leave=False) as bar:
            yield lambda history: move(bar, history)
    else:
        yield lambda history: say_line(len(history.train), epochs, history, say)


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
