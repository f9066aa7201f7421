# SPDX-License-Identifier: Apache-2.0
"""The script that Slurm runs on a node for one task of an array."""

import shlex
from typing import Mapping, Sequence

MOST_RESTARTS = 5
REQUEUE_TRIES = 8  # a busy controller does not answer in time; the time limit may end them sooner
REQUEUE_PAUSE = 5  # seconds between two of them


def script(title: str, command: Sequence[str], tasks: Sequence[str], environment: Mapping[str, str]) -> str:
    """`command` with the id of the task behind it, for the task at the index of the array.

    bash, and not the program itself, is what Slurm's signals reach. Of these USR1 says that the time limit is near and
    TERM that the job was cancelled: the program ends on TERM in both cases and keeps what it has, and only the first
    begins again. So do a task that another holds (75) and one that was killed (137: for want of memory, say). All count
    as restarts, as does a node that was lost.
    """
    variables = "".join(f"export {name}={shlex.quote(value)}\n" for name, value in environment.items())
    return TEMPLATE.format(title=title.replace("\n", " "), variables=variables, tasks=" ".join(map(shlex.quote, tasks)),
                           command=shlex.join(command), restarts=MOST_RESTARTS, tries=REQUEUE_TRIES,
                           pause=REQUEUE_PAUSE)


TEMPLATE = """\
#!/bin/bash
# {title}: one of these tasks, by the index in the array. Written by neuralwarp-farm submit.
tasks=({tasks})
{variables}\
unset SLURM_EXPORT_ENV  # "NONE" is meant for this script, and not for what a task may start by srun
umask 002

task=${{tasks[${{SLURM_ARRAY_TASK_ID:-0}}]}}
job=${{SLURM_ARRAY_JOB_ID:+${{SLURM_ARRAY_JOB_ID}}_$SLURM_ARRAY_TASK_ID}}
job=${{job:-$SLURM_JOB_ID}}
restarts=${{SLURM_RESTART_COUNT:-0}}
node=${{SLURMD_NODENAME:-$HOSTNAME}}
say() {{ printf '%(%Y-%m-%d %H:%M:%S)T %s job %s, start %s: %s\\n' -1 "$node" "$job" "$((restarts + 1))" "$*"; }}

# in these no $(...), and nothing that waits: bash ends in an error of its own when a second signal comes meanwhile
child= limit= asked=
trap 'limit=yes asked=", asked to end: the time limit is near"; [ -z "$child" ] || kill -TERM "$child" 2>&-' USR1
trap 'limit= asked=", asked to end"; [ -z "$child" ] || kill -TERM "$child" 2>&-' TERM INT

say "$task begins"
{command} "$task" &
child=$!
[ -z "$asked" ] || kill -TERM "$child"
while :; do  # a signal ends wait before the program has ended
  wait "$child"
  kill -0 "$child" 2>/dev/null || break
done
wait "$child"
code=$?
trap '' USR1 TERM INT  # what is requeued is asked to end, and has
say "$task ended with $code$asked"

if {{ [ "$code" = 75 ] || [ "$code" = 137 ] || [ -n "$limit" ]; }} && [ "$code" != 0 ]; then
  if [ "$restarts" -lt {restarts} ]; then
    say "$task begins again"
    for ((try = 1; ; ++try)); do
      scontrol requeue "$job" && break
      say "scontrol requeue $job failed, try $try of {tries}"
      [ "$try" -lt {tries} ] || break
      sleep {pause}
    done
  else
    say "$task was started $((restarts + 1)) times: given up"
  fi
fi
exit "$code"
"""
