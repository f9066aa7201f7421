#!/usr/bin/env bash
# run.sh MODULE: a unittest module of this folder, with a Python that needs nothing but itself.
set -euo pipefail
unset "${!SLURM_@}" QUARN
export PYTHONPATH=$PWD/clients/farm:$PWD/tests/clients/farm PYTHONDONTWRITEBYTECODE=1
exec python3 -W error -m unittest "$1"
