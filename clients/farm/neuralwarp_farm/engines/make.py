# SPDX-License-Identifier: Apache-2.0
"""A plan as a Makefile, for one machine or for any make that spreads its recipes."""

import shlex
from pathlib import Path
from typing import Sequence

from ..plan import Plan, Task, write_whole
from .base import Options, Printer, at_once, one_line, task_command


class Make(Printer):
    """Writes FOLDER/farm.mk: a phony target a task, since the result on disk is the truth and a stamp could lie."""

    name = "make"
    options: tuple[str, ...] = ("cpus",)

    def submit(self, plan: Plan, tasks: Sequence[Task], options: Options) -> str:
        text = makefile(plan, options)
        if options.dry_run:
            return text
        path = plan.folder / "farm.mk"
        write_whole(path, text)
        return f"Wrote {path}. Run it with:\n  {call(path, at_once(tasks, options))}"


def call(path: Path, jobs: int) -> str:
    return f"make -k -j {jobs} -f {shlex.quote(str(path))}"


def makefile(plan: Plan, options: Options) -> str:
    """All tasks of the plan: one whose result is there costs a look at it."""
    one_line(plan)
    names = " ".join(task.id for task in plan.tasks)
    recipe = shlex.join(task_command(plan, options)).replace("$", "$$")
    lines: list[str] = [
        f"# {plan.name}: a task with a result is not run again; -k goes on beside one that fails",
        "SHELL := /bin/sh",
        f".PHONY: _all {names}",
        f"_all: {names}",  # no task begins with "_"
        f"{names}:",
        f"\t@{recipe} $@",
    ]
    lines += [f"{task.id}: {' '.join(task.needs)}" for task in plan.tasks if task.needs]
    return "\n".join(lines) + "\n"
