#!/usr/bin/env bash
# run.sh MODULE: a unittest module of this folder, with a Python that needs nothing but itself. One that needs Slurm is
# skipped, in a word, where there is none; it fails then where NW_ALL_CLIENTS is set.
set -euo pipefail
unset "${!SLURM_@}" QUARN
export PYTHONPATH=$PWD/clients/farm:$PWD/tests/clients/farm:$PWD/examples/farm PYTHONDONTWRITEBYTECODE=1
if [[ $1 == *slurm* ]]; then
  missing=$(python3 -c 'import private_slurm; print(*private_slurm.missing_programs())')
  if [[ $missing ]]; then
    echo "skipped: no $missing (./run deps)"
    [[ ! ${NW_ALL_CLIENTS:-} ]] || exit 1
    exit 77
  fi
fi
exec python3 -W error -m unittest "$1"
