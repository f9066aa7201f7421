# SPDX-License-Identifier: Apache-2.0
"""The list of the jobs that a plan has sent to Slurm: FOLDER/state/slurm.json.

Slurm gives ids anew when it has used them up, and forgets a job minutes after its end. A job here is known by its id
and by a name that no other job has. It is written down before it is sent: what is killed in between, or hears of a
timeout although the job was taken, finds it again by that name.
"""

import json
from dataclasses import dataclass
from pathlib import Path
from typing import Optional

from ...errors import FarmError
from ...plan import Plan, write_whole

FORMAT = "neuralWarp farm slurm jobs"


@dataclass
class Job:
    """One array of jobs, or one job where there is one task."""

    name: str
    submitted: str  # by the clock of the submitting machine
    tasks: tuple[str, ...]  # by index in the array
    id: Optional[str] = None  # None: not known to have been taken


def place(plan: Plan) -> Path:
    return plan.state / "slurm.json"


def read(plan: Plan) -> list[Job]:
    path = place(plan)
    try:
        content = json.loads(path.read_text())
    except FileNotFoundError:
        return []
    except (OSError, ValueError) as error:
        raise FarmError(f"{path}: {error}") from error
    if not isinstance(content, dict) or content.get("format") != FORMAT or content.get("version") != 1:
        raise FarmError(f"{path}: not a list of jobs that this version reads")
    try:
        return [Job(job["name"], job["submitted"], tuple(job["tasks"]), job["id"]) for job in content["jobs"]]
    except (KeyError, TypeError) as error:
        raise FarmError(f"{path}: a damaged list of jobs: {error!r}") from error


def write(plan: Plan, jobs: list[Job]) -> None:
    listed = [{"name": job.name, "submitted": job.submitted, "id": job.id, "tasks": list(job.tasks)} for job in jobs]
    write_whole(place(plan), json.dumps({"format": FORMAT, "version": 1, "jobs": listed}, indent=1) + "\n")
