# SPDX-License-Identifier: Apache-2.0
"""Arrays of jobs for sbatch: which tasks go together, what is asked for them, what they wait for."""

import math
import re
import secrets
import shlex
from datetime import datetime
from typing import Optional, Sequence

from ...errors import FarmError
from ...plan import Plan, Resources, Task, write_whole
from ..base import Options, stages
from . import jobs as job_list
from .jobs import Job
from .queue import ALIVE, Queue
from .script import script
from .tools import call, job_environment

WARNING_SECONDS = 60  # before its time limit a task is asked to end


def groups(tasks: Sequence[Task], options: Options, most: int) -> list[list[Task]]:
    """Arrays: tasks of one stage and the same resources, at most so many each."""
    result = []
    for stage in stages(tasks):
        alike: dict[tuple[object, ...], list[Task]] = {}
        for task in stage:
            resources = options.over(task.resources)
            key = (resources.cpus, resources.memory_mb, resources.gpus, bool(resources.minutes), task.needs)
            alike.setdefault(key, []).append(task)
        for group in alike.values():
            result += [group[first:first + most] for first in range(0, len(group), most)]
    return result


class Sender:
    """Sends arrays one after another, and writes down each before and after."""

    def __init__(self, plan: Plan, jobs: list[Job], queue: Queue, options: Options, command: Sequence[str]) -> None:
        self.told: list[str] = []
        self._plan = plan
        self._jobs = jobs
        self._queue = queue
        self._options = options
        self._command = command
        self._sent: dict[str, Job] = {}  # by task

    def send(self, tasks: Sequence[Task]) -> None:
        name = f"{self._plan.name}-{secrets.token_hex(3)}"
        path = self._plan.state / "slurm" / f"{name}.sh"
        text = script(f"{self._plan.name} of {self._plan.folder}", self._command, [task.id for task in tasks],
                      self._plan.environment)
        arguments = sbatch_arguments(self._plan, name, tasks, self._options)
        ids = self._wait_for(tasks)
        if ids:
            # afterok would stay for good when one has failed; the task looks itself at what it needs
            arguments.append(f"--dependency=afterany:{':'.join(ids)}")
        arguments.append(str(path))
        job = Job(name, datetime.now().isoformat(timespec="seconds"), tuple(task.id for task in tasks))
        if self._options.dry_run:
            job.id = name  # stands for it in what is printed
            self.told.append(f"{shlex.join(arguments)}\n\n# {path}\n{text}")
        else:
            self._take_back(tasks)
            write_whole(path, text)
            (self._plan.folder / "logs").mkdir(parents=True, exist_ok=True)
            self._sbatch(job, arguments)
            self.told.append(f"Sent job {job.id}: {listing(tasks)}.")
        self._sent.update((task.id, job) for task in tasks)

    def _wait_for(self, tasks: Sequence[Task]) -> list[str]:
        """Ids of the jobs that make what the tasks need, and of those in which the tasks themselves still are."""
        ids: list[str] = []
        for name in [need for task in tasks for need in task.needs] + [task.id for task in tasks]:
            job: Optional[Job] = self._sent.get(name)
            if job is None and self._queue.states.get(name) in ALIVE:
                job = self._queue.job_of[name]
            if job is not None and job.id is not None and job.id not in ids:
                ids.append(job.id)
        return ids

    def _take_back(self, tasks: Sequence[Task]) -> None:
        """Tasks that wait in the queue for jobs that are no more are sent anew; what has begun is waited for.

        Tasks of an array need the same, so that all of it that waits goes: of one index scancel would take all, too.
        """
        waiting = {self._queue.job_of[task.id].name: self._queue.job_of[task.id] for task in tasks
                   if self._queue.states.get(task.id) in ("pending", "held")}
        for job in waiting.values():
            call(["scancel", "--state=PENDING", f"--name={job.name}", str(job.id)])

    def _sbatch(self, job: Job, arguments: list[str]) -> None:
        self._jobs.append(job)
        job_list.write(self._plan, self._jobs)
        try:
            answer = call(arguments, job_environment()).strip()
            found = re.match(r"(\d+)(;|$)", answer)
            if not found:
                raise FarmError(f'sbatch answered "{answer}" instead of the id of a job')
        except FarmError as error:
            sent = " ".join(self.told) or "Nothing was sent before it."
            raise FarmError(f"{error}\n{sent} The next submit sends the rest.") from error
        job.id = found.group(1)
        job_list.write(self._plan, self._jobs)


def sbatch_arguments(plan: Plan, name: str, tasks: Sequence[Task], options: Options) -> list[str]:
    """On the command line, where nothing of the user's environment overrides it; what is not said here is the user's
    own (SBATCH_QOS, say) or the cluster's."""
    resources = options.over(tasks[0].resources)
    output = str(plan.folder / "logs").replace("\\", "\\\\").replace("%", "%%")
    result = ["sbatch", "--parsable", f"--job-name={name}", f"--chdir={plan.folder}", "--export=ALL", "--requeue",
              "--nodes=1", "--ntasks=1", f"--cpus-per-task={max(1, resources.cpus)}", "--open-mode=append",
              f"--output={output}/slurm-{'%A_%a' if len(tasks) > 1 else '%j'}.log"]
    if len(tasks) > 1:
        result.append(f"--array=0-{len(tasks) - 1}")
    if resources.memory_mb:
        result.append(f"--mem={resources.memory_mb}M")
    if resources.gpus:
        result.append(f"--gres=gpu:{resources.gpus}")
    limit = time_limit([task.resources for task in tasks], options)
    result.append(f"--signal=B:USR1@{min(WARNING_SECONDS, 15 * limit) if limit else WARNING_SECONDS}")
    if limit:
        result.append(f"--time={limit}")
    for option in ("partition", "constraint", "account"):
        value = getattr(options, option)
        if value is not None:
            result.append(f"--{option}={value}")
    return result


def time_limit(resources: Sequence[Resources], options: Options) -> int:
    """Minutes. A plan has estimates: twice the longest of them, and ten minutes for a node that is slow to begin."""
    if options.time is not None:
        return max(1, math.ceil(options.time))
    longest = max(each.minutes or 0 for each in resources)
    return math.ceil(2 * longest) + 10 if longest else 0


def listing(tasks: Sequence[Task]) -> str:
    if len(tasks) < 3:
        return ", ".join(task.id for task in tasks)
    return f"{tasks[0].id} to {tasks[-1].id} ({len(tasks)} tasks)"
