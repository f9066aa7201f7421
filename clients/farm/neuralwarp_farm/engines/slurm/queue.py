# SPDX-License-Identifier: Apache-2.0
"""What squeue says of the jobs of a plan. It needs no accounting database, and forgets a job minutes after its end."""

from dataclasses import dataclass
from typing import Optional, Sequence

from .jobs import Job
from .tools import call

RUNNING = {"RUNNING", "COMPLETING", "STAGE_OUT", "SUSPENDED", "STOPPED", "SIGNALING", "RESIZING"}
PENDING = {"PENDING", "CONFIGURING", "REQUEUED", "REQUEUE_FED", "REQUEUE_HOLD", "RESV_DEL_HOLD", "SPECIAL_EXIT"}
NOT_FAILED = {"COMPLETED", "CANCELLED", "PREEMPTED", "REVOKED"}
ALIVE = ("running", "pending", "held")
LAUNCH_FAILED = "launch_failed_requeued_held"  # a node did not start it: Slurm keeps it until somebody releases it


class Queue:
    """What squeue says of the jobs of a list, and which jobs that were not known to have been taken were."""

    def __init__(self, jobs: list[Job]) -> None:
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
            rest = by_index.get(None, "gone")
            for index, task in enumerate(job.tasks):
                self._set(task, job, by_index.get(index, rest))

    def _set(self, task: str, job: Job, state: str) -> None:
        if state in ALIVE:
            self._alive.add(job.name)
        elif self.states.get(task) in ALIVE:
            return
        self.states[task] = state
        self.job_of[task] = job

    def is_alive(self, job: Job) -> bool:
        """Whether one of its tasks is pending, held or running."""
        return job.name in self._alive


@dataclass(frozen=True)
class Line:
    """One job, or one of an array, as squeue has it; what was cancelled before it began is one line for all of it."""

    job: str
    index: Optional[int]
    name: str
    state: str


def squeue(names: Sequence[str]) -> list[Line]:
    if not names:
        return []
    answer = call(["squeue", "--noheader", "--array", "--states=all", f"--name={','.join(names)}",
                   "--format=%F|%K|%j|%T|%r"])
    result = []
    for text in answer.splitlines():
        fields = text.strip().split("|")
        if len(fields) == 5:
            job, index, name, state, reason = fields
            result.append(Line(job, int(index) if index.isdigit() else None, name, plain_state(state, reason)))
    return result


def plain_state(state: str, reason: str) -> str:
    """What has ended and has not failed by itself is "gone": whether its result is there is seen on the disk."""
    if state in RUNNING:
        return "running"
    if state in PENDING:
        return "held" if reason.replace(" ", "_") == LAUNCH_FAILED else "pending"
    return "gone" if state in NOT_FAILED else "failed"
