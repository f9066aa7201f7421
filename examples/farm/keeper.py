#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""keeper.py FOLDER: starts programs, and ends them and all that they have started when its standard input ends; then
removes their folder.

Each line of its input is a JSON array, the words of a program and, before them, the file that its output goes to; the
answer to each is a line with its process id, or with what went wrong. The input ends when whoever holds its other end
closes it or dies, in any way: nothing is left then that was started here. Where this process itself is killed, the
programs die with it; what those have started in their turn, and the folder, are left.

Linux alone: orphans are handed to this process (prctl(2), PR_SET_CHILD_SUBREAPER), and the programs get a signal when
it dies (PR_SET_PDEATHSIG)."""

import ctypes
import json
import os
import shutil
import signal
import subprocess
import sys
import time
from pathlib import Path

PR_SET_PDEATHSIG, PR_SET_CHILD_SUBREAPER = 1, 36
GRACE = 5.0  # seconds between being asked to end and being ended

_libc = ctypes.CDLL(None, use_errno=True)


def main() -> None:
    for number in (signal.SIGINT, signal.SIGHUP):  # of a terminal that is not ours to listen to
        signal.signal(number, signal.SIG_IGN)
    signal.signal(signal.SIGTERM, lambda *_: sys.exit(143))
    signal.signal(signal.SIGCHLD, lambda *_: reap())
    _libc.prctl(PR_SET_CHILD_SUBREAPER, 1)
    try:
        for line in sys.stdin:
            print(start(*json.loads(line)), flush=True)
    except BrokenPipeError:
        os.dup2(os.open(os.devnull, os.O_WRONLY), sys.stdout.fileno())  # nobody reads: nothing is flushed into it
    finally:
        signal.signal(signal.SIGTERM, signal.SIG_IGN)
        end_all()
        shutil.rmtree(sys.argv[1], ignore_errors=True)


def start(log: str, *command: str) -> str:
    try:
        with open(log, "ab") as output:
            # in the folder, with which the core goes that one of them may leave
            child = subprocess.Popen(command, cwd=sys.argv[1], stdin=subprocess.DEVNULL, stdout=output, stderr=output,
                                     start_new_session=True, preexec_fn=die_with_the_keeper)
    except OSError as error:
        return f"{error.filename}: {error.strerror}"
    return str(child.pid)


def die_with_the_keeper() -> None:
    for number in (signal.SIGINT, signal.SIGHUP):
        signal.signal(number, signal.SIG_DFL)
    _libc.prctl(PR_SET_PDEATHSIG, signal.SIGKILL)


def reap() -> None:
    """Takes note of the children that have ended, those that others left to this process among them."""
    try:
        while os.waitpid(-1, os.WNOHANG)[0]:
            pass
    except ChildProcessError:
        pass


def end_all() -> None:
    for number in (signal.SIGTERM, signal.SIGKILL):
        until = time.monotonic() + GRACE
        asked: set[int] = set()
        while time.monotonic() < until:
            reap()
            left = descendants()
            if not left:
                return
            for process in left - asked:  # also those that came up meanwhile
                send(process, number)
            asked |= left
            time.sleep(0.02)


def send(process: int, number: signal.Signals) -> None:
    try:
        os.kill(process, number)
    except ProcessLookupError:
        pass


def descendants() -> set[int]:
    """Every process below this one."""
    children: dict[int, list[int]] = {}
    for folder in Path("/proc").glob("[0-9]*"):
        try:
            parent = int((folder / "stat").read_text(errors="replace").rpartition(")")[2].split()[1])
        except (OSError, IndexError):  # it has ended meanwhile
            continue
        children.setdefault(parent, []).append(int(folder.name))
    found: set[int] = set()
    below = [os.getpid()]
    while below:
        mine = children.get(below.pop(), [])
        found.update(mine)
        below.extend(mine)
    return found


if __name__ == "__main__":
    main()
