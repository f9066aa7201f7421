#!/usr/bin/env bash
# run.sh MODULE: a unittest module of this folder, with the Python that the module neuralwarp was built for.
set -euo pipefail
python=$(scripts/find_python.sh)
export PYTHONPATH=$PYTHONPATH:$PWD/tests/clients/python PYTHONDONTWRITEBYTECODE=1
exec "$python" -W error::UserWarning -m unittest "$1"
