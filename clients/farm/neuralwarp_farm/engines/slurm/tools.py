# SPDX-License-Identifier: Apache-2.0
"""How Slurm's command line tools are called: in which environment, and what is said when they fail."""

import os
import re
import shlex
import subprocess
from typing import Optional, Sequence

from ...errors import FarmError

ANSWER_SECONDS = 120.0  # the longest that a tool is waited for; they give up by themselves before
DEFAULT_MOST_IN_ARRAY = 1001  # Slurm's own default of MaxArraySize
OF_CLUSTER = ("SLURM_CONF", "SLURM_CLUSTERS", "SLURM_JWT")  # which cluster, and who one is there
OF_USER = ("PATH", "HOME", "USER", "LOGNAME", "SHELL", "LANG", "TZ")
CONTRADICTING = ("SBATCH_MEM_PER_", "SBATCH_WAIT")  # of the user's defaults for sbatch


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
