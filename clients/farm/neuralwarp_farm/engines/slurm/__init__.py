# SPDX-License-Identifier: Apache-2.0
"""Slurm: the engine that is spoken to, by its command line tools and without its database (decision 0214)."""

import shlex
from typing import Sequence

from ...plan import Plan, Task
from .. import base
from ..base import Options
from . import jobs as job_list
from .jobs import Job
from .queue import ALIVE, Queue
from .sending import Sender, groups
from .tools import call, most_in_array


class Slurm:
    name = "slurm"
    options: tuple[str, ...] = ("partition", "cpus", "memory_mb", "gpus", "constraint", "time", "account")

    def submit(self, plan: Plan, tasks: Sequence[Task], options: Options) -> str:
        base.one_line(plan)
        jobs = job_list.read(plan)
        queue = Queue(jobs)
        chosen = to_send(tasks, queue.states)
        told = [release(task, queue.job_of[task.id], options) for task in tasks
                if queue.states.get(task.id) == "held" and task not in chosen]
        if not chosen and not told:
            return f"Nothing to send: {count(len(tasks), 'task')} of {plan.name} in the queue already."
        sender = Sender(plan, jobs, queue, options, base.task_command(plan, options))
        for group in groups(chosen, options, most_in_array(options.dry_run)):
            sender.send(group)
        return "\n".join(told + sender.told)

    def cancel(self, plan: Plan) -> str:
        """By id and name at once, so that a job that has got the id of one of these is not met."""
        jobs = job_list.read(plan)
        queue = Queue(jobs)
        alive = [job for job in jobs if job.id is not None and queue.is_alive(job)]
        for job in alive:
            call(["scancel", f"--name={job.name}", str(job.id)])
        if not alive:
            return ""
        return f"Cancelled {count(len(alive), 'job')} of {plan.name}: {', '.join(str(job.id) for job in alive)}."

    def states(self, plan: Plan) -> dict[str, str]:
        jobs = job_list.read(plan)
        return Queue(jobs).states if jobs else {}


def to_send(tasks: Sequence[Task], states: dict[str, str]) -> list[Task]:
    """The tasks that are not in the queue, and those in it whose needs are sent anew: they would not wait for them."""
    chosen: dict[str, Task] = {}
    for task in tasks:
        if states.get(task.id) not in ALIVE or any(need in chosen for need in task.needs):
            chosen[task.id] = task
    return list(chosen.values())


def release(task: Task, job: Job, options: Options) -> str:
    """Has Slurm try again to start what a node did not start; the answer is what to tell the user."""
    command = ["scontrol", "release", f"{job.id}_{job.tasks.index(task.id)}" if len(job.tasks) > 1 else str(job.id)]
    if options.dry_run:
        return shlex.join(command)
    call(command)
    return f"Released {task.id} in job {job.id}: Slurm held it, as a node did not start it."


def count(number: int, noun: str) -> str:
    return f"{number} {noun}" if number == 1 else f"{number} {noun}s"
