# SPDX-License-Identifier: Apache-2.0
"""How far a plan is: what lies on the disk first, then what an engine knows, then what logs say."""

import os
from collections import Counter
from dataclasses import dataclass
from pathlib import Path
from typing import Any, Optional

from . import codes, engines, results
from .errors import FarmError
from .plan import Plan, Task
from .results import State
from .task import ENDED, MARK

# in the order in which they are counted
WORDS = ("done", "running", "being written by another", "queued", "failed", "begun", "missing")
WORD_OF_STATE = {State.DONE: "done", State.WRITING: "being written by another", State.BEGUN: "begun",
                 State.MISSING: "missing"}
TAIL = 1 << 16   # bytes of a log's end
LISTED = 20      # tasks of one word that a text names
# what goes on when it is started again; also where a result was there, and somebody has taken it away since
NO_FAILURES = (codes.DONE, codes.LOCKED, codes.INTERRUPTED, codes.TERMINATED)


@dataclass(frozen=True)
class Line:
    task: Task
    state: str        # one of WORDS
    detail: str = ""


@dataclass(frozen=True)
class Report:
    plan: Plan
    lines: tuple[Line, ...]
    note: str = ""    # why an engine says nothing

    @property
    def code(self) -> int:
        words = {line.state for line in self.lines}
        return codes.FAILED if "failed" in words else codes.DONE if words == {"done"} else codes.NOT_YET

    def counts(self) -> dict[str, int]:
        count = Counter(line.state for line in self.lines)
        return {word: count[word] for word in WORDS if count[word]}

    def text(self) -> str:
        lines = [f"{self.plan.name}: " + ", ".join(f"{number} {word}" for word, number in self.counts().items())
                 + f", of {len(self.lines)} tasks", *([self.note] if self.note else [])]
        for word in WORDS[1:]:
            those = [line for line in self.lines if line.state == word]
            lines += [f"  {line.task.id}: {word}" + (f": {line.detail}" if line.detail else "")
                      for line in those[:LISTED]]
            if len(those) > LISTED:
                lines.append(f"  and {len(those) - LISTED} more are {word}")
        return "\n".join(lines)

    def to_json(self) -> dict[str, Any]:
        return {"plan": str(self.plan.folder), "name": self.plan.name, "kind": self.plan.kind,
                "complete": self.code == codes.DONE, "counts": self.counts(), "note": self.note or None,
                "tasks": [{"id": line.task.id, "state": line.state, "detail": line.detail or None,
                           "frames": line.task.frames, "result": str(self.plan.absolute(line.task.result.path)),
                           "log": str(self.plan.log(line.task))} for line in self.lines]}


def report_of(plan: Plan) -> Report:
    known: dict[str, str] = {}
    note = ""
    try:
        known = engines.states(plan)
    except FarmError as error:
        note = str(error)
    return Report(plan, tuple(line_of(plan, task, known.get(task.id)) for task in plan.tasks), note)


def line_of(plan: Plan, task: Task, known: Optional[str]) -> Line:
    """`known`: what the engine says of it, "running", "pending", "held", "failed" or "gone"."""
    state = results.state_of(plan, task)
    if state is State.DONE:
        return Line(task, "done")
    log = Log(plan.log(task))
    if known == "running":
        return Line(task, "running", log.begun)
    if state is State.WRITING:
        return Line(task, WORD_OF_STATE[state], log.begun)
    if known == "pending":
        return Line(task, "queued")
    if known == "held":
        return Line(task, "failed", "no node has started it, and its engine holds it: submit releases it")
    if known == "failed" or log.failed:
        return Line(task, "failed", log.why or f"its engine says so, and {log.path} says nothing")
    return Line(task, WORD_OF_STATE[state], log.why)


class Log:
    """What the end of a task's log says of its last attempt."""

    def __init__(self, path: Path) -> None:
        self.path = path
        self.begun = ""               # when and where
        self.code: Optional[int] = None  # None: it has not ended, or there was none
        self.said = ""                # the last line that is not the farm's
        lines = tail(path)
        self.is_empty = not lines
        for line in lines:
            if line.startswith(ENDED):
                self.code = number_in(line[len(ENDED):])
            elif line.startswith(MARK) and ", attempt " in line:
                self.begun, self.code, self.said = line[len(MARK):], None, ""
            elif line.strip() and not line.startswith(MARK):
                self.said = line.strip()

    @property
    def failed(self) -> bool:
        """Also one that has begun and not ended, as nobody is at work: it was killed."""
        return not self.is_empty and self.code not in NO_FAILURES

    @property
    def why(self) -> str:
        if self.is_empty:
            return ""
        how = "ended without a word, as if it were killed" if self.code is None else f"ended with {self.code}"
        return how + (f": {self.said}" if self.said else "")


def tail(path: Path) -> list[str]:
    try:
        with open(path, "rb") as file:
            size = file.seek(0, os.SEEK_END)
            file.seek(max(0, size - TAIL))
            text = file.read(TAIL).decode(errors="replace")
    except OSError:
        return []
    return text.replace("\r", "\n").splitlines()


def number_in(text: str) -> Optional[int]:
    word = text.partition(" ")[0]
    return int(word) if word.isascii() and word.isdigit() and len(word) < 5 else None


# --- what a plan is, in a sentence ---

def sentence(plan: Plan) -> str:
    several = len(plan.tasks) != 1
    text = f"{plan.folder}: {plan.name}, {len(plan.tasks)} task{'s' if several else ''}"
    if plan.seconds_a_frame is not None and plan.start_seconds is not None:
        longest = max(task.resources.minutes for task in plan.tasks)
        text += (f"; {plan.start_seconds:.2g} s to start and {plan.seconds_a_frame:.2g} s a frame, "
                 f"at most {longest:.2g} minutes a task")
    return text
