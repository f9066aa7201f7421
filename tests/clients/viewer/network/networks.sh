#!/usr/bin/env bash
# networks.sh ROOT COMPARE: a page computes what the runtime computes, for networks as the trainer writes them and
# others, and says which it cannot; 77 without a Python for the trainer.
set -euo pipefail
cd "$1"
python=$(scripts/find_python.sh) || {
  printf 'skipped: there is no Python for the trainer\n'
  exit 77
}
folder=$(mktemp -d)
trap 'rm -rf "$folder"' EXIT
PYTHONPATH=$1 PYTHONDONTWRITEBYTECODE=1 "$python" "$1/tests/clients/viewer/network/networks.py" "$folder"
"$2" "$folder"
