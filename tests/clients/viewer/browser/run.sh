#!/usr/bin/env bash
# run.sh QUARN TEMPLATE MODULE: a unittest module of this folder. Skipped, in one word, where the browser or the page that
# quarn view fills in is missing; fails then where NW_ALL_CLIENTS is set.
set -euo pipefail
here=$(dirname "$0")
missing=
if ! command -v chromium >/dev/null; then
  missing="no chromium"
elif [[ ! -e $2 ]]; then
  missing="no page to fill in (./run deps)"
fi
if [[ $missing ]]; then
  echo "skipped: $missing"
  [[ ! ${NW_ALL_CLIENTS:-} ]] || exit 1
  exit 77
fi
python=$(scripts/find_python.sh)
here=$(cd "$here" && pwd)
export NW_TEST_QUARN=$1 PYTHONPATH=$here PYTHONDONTWRITEBYTECODE=1
exec "$python" -W error::UserWarning -m unittest "$3"
