#!/usr/bin/env bash
# The example's shapes, by the Python in NW_PYTHON or the system's; skipped where that one has no NumPy.
set -euo pipefail
cd "$(dirname "$0")"
python=${NW_PYTHON:-/usr/bin/python3}
"$python" -c 'import numpy' 2>/dev/null || {
  echo "skipped: $python has no NumPy"
  exit 77
}
PYTHONDONTWRITEBYTECODE=1 exec "$python" -m unittest -v arm_test
