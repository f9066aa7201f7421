# SPDX-License-Identifier: Apache-2.0
"""Slurm: the engine that is spoken to, by its command line tools and without its database (decision 0214)."""

import math
import os
import re
import secrets
import shlex
import subprocess
from dataclasses import dataclass
from datetime import datetime
from typing import Optional, Sequence

from ..errors import FarmError
from ..plan import Plan, Resources, Task, write_whole
from . import slurm_jobs
from .base import Options, one_line, stages, task_command
from .slurm_jobs import Job
from .slurm_script import script

DEFAULT_MOST_IN_ARRAY = 1001  # Slurm's own default of MaxArraySize
ANSWER_SECONDS = 120.0  # the longest that a tool of Slurm is waited for; they give up by themselves before
WARNING_SECONDS = 60  # before its time limit a task is asked to end
RUNNING = {"RUNNING", "COMPLETING", "STAGE_OUT", "SUSPENDED", "STOPPED", "SIGNALING", "RESIZING"}
PENDING = {"PENDING", "CONFIGURING", "REQUEUED", "REQUEUE_FED", "REQUEUE_HOLD", "RESV_DEL_HOLD", "SPECIAL_EXIT"}
NOT_FAILED = {"COMPLETED", "CANCELLED", "PREEMPTED", "REVOKED"}
ALIVE = ("running", "pending")
OF_CLUSTER = ("SLURM_CONF", "SLURM_CLUSTERS", "SLURM_JWT")  # which cluster, and who one is there
OF_USER = ("PATH", "HOME", "USER", "LOGNAME", "SHELL", "LANG", "TZ")
CONTRADICTING = ("SBATCH_MEM_PER_", "SBATCH_WAIT")  # of the user's defaults for sbatch


class Slurm:
    name = "slurm"
    options: tuple[str, ...] = ("partition", "cpus", "memory_mb", "gpus", "constraint", "time", "account")

    def submit(self, plan: Plan, tasks: Sequence[Task], options: Options) -> str:
        one_line(plan)
        jobs = slurm_jobs.read(plan)
        queue = Queue(plan, jobs)
        chosen = to_send(tasks, queue.states)
        if not chosen:
            return f"Nothing to send: {count(len(tasks), 'task')} of {plan.name} in the queue already."
        sender = Sender(plan, jobs, queue, options, task_command(plan, options))
        for group in groups(chosen, options, most_in_array(options.dry_run)):
            sender.send(group)
        return "\n".join(sender.told)

    def cancel(self, plan: Plan) -> str:
        """By id and name at once, so that a job that has got the id of one of these is not met."""
        jobs = slurm_jobs.read(plan)
        queue = Queue(plan, jobs)
        alive = [job for job in jobs if job.id is not None and queue.is_alive(job)]
        for job in alive:
            call(["scancel", f"--name={job.name}", str(job.id)])
        if not alive:
            return ""
        return f"Cancelled {count(len(alive), 'job')} of {plan.name}: {', '.join(str(job.id) for job in alive)}."

    def states(self, plan: Plan) -> dict[str, str]:
        jobs = slurm_jobs.read(plan)
        return Queue(plan, jobs).states if jobs else {}


class Queue:
    """What squeue says of the jobs of a list, and which jobs that were not known to have been taken were."""

    def __init__(self, plan: Plan, jobs: list[Job]) -> None:
        self.states: dict[str, str] = {}  # by task: of the last job that it was in, but a live one first
        self.job_of: dict[str, Job] = {}  # by task, the job of that state
        self._alive: set[str] = set()
        seen = squeue([job.name for job in jobs])
        for job in jobs:
            mine = [line for line in seen if line.name == job.name and job.id in (None, line.job)]
            if job.id is None and mine:
                job.id = mine[0].job
            if job.id is None:
                continue  # it was never taken
            by_index = {line.index: line.state for line in mine}
            for index, task in enumerate(job.tasks):
                self._set(task, job, by_index.get(index, "gone"))

    def _set(self, task: str, job: Job, state: str) -> None:
        if state in ALIVE:
            self._alive.add(job.name)
        elif self.states.get(task) in ALIVE:
            return
        self.states[task] = state
        self.job_of[task] = job

    def is_alive(self, job: Job) -> bool:
        """Whether one of its tasks is pending or running."""
        return job.name in self._alive


@dataclass(frozen=True)
class Line:
    """One job, or one of an array, as squeue has it."""

    job: str
    index: int
    name: str
    state: str


def squeue(names: Sequence[str]) -> list[Line]:
    if not names:
        return []
    answer = call(["squeue", "--noheader", "--array", "--states=all", f"--name={','.join(names)}",
                   "--format=%F|%K|%j|%T"])
    result = []
    for text in answer.splitlines():
        fields = text.strip().split("|")
        if len(fields) == 4:
            job, index, name, state = fields
            result.append(Line(job, int(index) if index.isdigit() else 0, name, plain_state(state)))
    return result


def plain_state(state: str) -> str:
    """What has ended and has not failed by itself is "gone": whether its result is there is seen on the disk."""
    if state in RUNNING:
        return "running"
    if state in PENDING:
        return "pending"
    return "gone" if state in NOT_FAILED else "failed"


def to_send(tasks: Sequence[Task], states: dict[str, str]) -> list[Task]:
    """The tasks that are not in the queue, and those in it whose needs are sent anew: they would not wait for them."""
    chosen: dict[str, Task] = {}
    for task in tasks:
        if states.get(task.id) not in ALIVE or any(need in chosen for need in task.needs):
            chosen[task.id] = task
    return list(chosen.values())


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


def most_in_array(dry_run: bool) -> int:
    """One less than MaxArraySize, whose indices begin at 0; 1 where a cluster has no arrays."""
    try:
        configuration = call(["scontrol", "show", "config"])
    except FarmError:
        if dry_run:
            return DEFAULT_MOST_IN_ARRAY - 1
        raise
    found = re.search(r"^MaxArraySize\s*=\s*(\d+)", configuration, re.MULTILINE)
    return max(1, (int(found.group(1)) if found else DEFAULT_MOST_IN_ARRAY) - 1)


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
        """A task that waits in the queue for jobs that are no more is sent anew; one that has begun is waited for."""
        for task in tasks:
            if self._queue.states.get(task.id) == "pending":
                old = self._queue.job_of[task.id]
                index = f"_{old.tasks.index(task.id)}" if len(old.tasks) > 1 else ""
                call(["scancel", "--state=PENDING", f"--name={old.name}", f"{old.id}{index}"])

    def _sbatch(self, job: Job, arguments: list[str]) -> None:
        self._jobs.append(job)
        slurm_jobs.write(self._plan, self._jobs)
        try:
            answer = call(arguments, job_environment()).strip()
            found = re.match(r"(\d+)(;|$)", answer)
            if not found:
                raise FarmError(f'sbatch answered "{answer}" instead of the id of a job')
        except FarmError as error:
            sent = " ".join(self.told) or "Nothing was sent before it."
            raise FarmError(f"{error}\n{sent} The next submit sends the rest.") from error
        job.id = found.group(1)
        slurm_jobs.write(self._plan, self._jobs)


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
    if limit:
        result += [f"--time={limit}", f"--signal=B:USR1@{min(WARNING_SECONDS, 15 * limit)}"]
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


def call(arguments: Sequence[str], environment: Optional[dict[str, str]] = None) -> str:
    """What a tool of Slurm prints. Its own words are passed on when it fails, with what it was asked."""
    try:
        done = subprocess.run(arguments, env=environment or tool_environment(), stdin=subprocess.DEVNULL,
                              capture_output=True, text=True, errors="replace", timeout=ANSWER_SECONDS)
    except FileNotFoundError as error:
        raise FarmError(f"{arguments[0]} is not on the PATH: is this a machine of the cluster?") from error
    except subprocess.TimeoutExpired as error:
        raise FarmError(f"{shlex.join(arguments)}: no answer in {ANSWER_SECONDS:.0f} s") from error
    if done.returncode != 0:
        said = done.stderr.strip() or done.stdout.strip() or "without a word"
        raise FarmError(f"{shlex.join(arguments)}\nfailed with {done.returncode}: {said}")
    return done.stdout


def tool_environment() -> dict[str, str]:
    """Without formats and filters that change the meaning of a call, and what a surrounding job says of itself."""
    return {name: value for name, value in os.environ.items()
            if not name.startswith(("SQUEUE_", "SCANCEL_")) and (not name.startswith("SLURM_") or name in OF_CLUSTER)}


def job_environment() -> dict[str, str]:
    """What sbatch sees, and a job after it: who and where one is, and the user's defaults for sbatch.

    --export=NONE instead would begin a login shell on the node for what is in its profile, or, where Slurm does not run
    as root, leave a job without a PATH. What else a task needs, the plan names, and the script has.
    """
    return {name: value for name, value in tool_environment().items()
            if name in OF_USER or name in OF_CLUSTER or name.startswith("LC_")
            or (name.startswith("SBATCH_") and not name.startswith(CONTRADICTING))}


def listing(tasks: Sequence[Task]) -> str:
    if len(tasks) < 3:
        return ", ".join(task.id for task in tasks)
    return f"{tasks[0].id} to {tasks[-1].id} ({len(tasks)} tasks)"


def count(number: int, noun: str) -> str:
    return f"{number} {noun}" if number == 1 else f"{number} {noun}s"
