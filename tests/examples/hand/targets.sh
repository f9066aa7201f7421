#!/usr/bin/env bash
# The example's targets.py, by the Python in NW_PYTHON or the system's; skipped where that one has no SciPy.
set -euo pipefail
cd "$(dirname "$0")"
python=${NW_PYTHON:-/usr/bin/python3}
"$python" -c 'import scipy' 2>/dev/null || {
  echo "skipped: $python has no SciPy"
  exit 77
}
PYTHONDONTWRITEBYTECODE=1 exec "$python" -m unittest -v targets_test
