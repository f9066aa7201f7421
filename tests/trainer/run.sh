#!/usr/bin/env bash
# run.sh ROOT MODULE: the unittest module of this folder with a Python that has what the trainer needs; 77 without one.
set -euo pipefail
cd "$1"
python=$(scripts/find_python.sh) || {
  printf 'skipped: there is no Python for the trainer\n'
  exit 77
}
export PYTHONPATH=$1/tests/trainer PYTHONDONTWRITEBYTECODE=1
exec "$python" -W error::UserWarning -m unittest "$2"
