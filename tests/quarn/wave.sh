#!/usr/bin/env bash
# wave.sh QUARN PLUGIN: the example scene moves as it should; and its files are what their script writes.
set -euo pipefail
quarn=$1 plugin=$2
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

"$quarn" exec --plugin "$plugin" examples/wave/evaluate.txt >"$work/out" 2>"$work/err"
diff examples/wave/expected.txt "$work/out"
if grep -v '^info: ' "$work/err"; then exit 1; fi

# made again elsewhere, where there is a Python
command -v python3 >/dev/null || { echo "no Python here: the files were not made again"; exit 0; }
cp examples/wave/make.py "$work"
python3 "$work/make.py"
diff -r examples/wave/models "$work/models"
diff examples/wave/wave.json "$work/wave.json"
