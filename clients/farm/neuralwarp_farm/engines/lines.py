# SPDX-License-Identifier: Apache-2.0
"""A plan as lists of command lines, for xargs, GNU parallel, or whatever a studio's queue reads."""

import shlex
from pathlib import Path
from typing import Sequence

from ..plan import Plan, Task, write_whole
from .base import Options, Printer, at_once, one_line, stages, task_command


class Lines(Printer):
    """Writes FOLDER/tasks-1.txt, tasks-2.txt ...: a stage a file, a task a line, each a command of sh.

    A stage begins when the one before it has ended; nothing in a list of lines could say so, therefore the files.
    """

    name = "list"
    options: tuple[str, ...] = ("cpus",)

    def submit(self, plan: Plan, tasks: Sequence[Task], options: Options) -> str:
        one_line(plan)
        command = shlex.join(task_command(plan, options))
        texts = ["".join(f"{command} {task.id}\n" for task in stage) for stage in stages(tasks)]
        if options.dry_run:
            return "".join(f"# stage {number} of {len(texts)}\n{text}" for number, text in enumerate(texts, 1))
        paths = self._replace(plan, texts)
        told = [f"Wrote {len(paths)} {'list' if len(paths) == 1 else 'lists'} of {plan.name}. Run one after another:"]
        told += [f"  {call(path, at_once(tasks, options))}" for path in paths]
        return "\n".join(told)

    @staticmethod
    def _replace(plan: Plan, texts: Sequence[str]) -> list[Path]:
        """Lists of an earlier submit go: a queue that reads the folder would take them for these."""
        paths = [plan.folder / f"tasks-{number}.txt" for number in range(1, len(texts) + 1)]
        for old in plan.folder.glob("tasks-*.txt"):
            if old not in paths:
                old.unlink()
        for path, text in zip(paths, texts):
            write_whole(path, text)
        return paths


def call(path: Path, jobs: int) -> str:
    return f"xargs -P {jobs} -d '\\n' -I '{{}}' sh -c '{{}}' < {shlex.quote(str(path))}"
