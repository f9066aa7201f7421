#!/usr/bin/env bash
# run.sh QUARN: quarn run from the hand's file to a report on a reduced set, its targets by a program in two parts; the
# report is computed once more from the files, and a second run does nothing.
set -euo pipefail
cd "$(dirname "$0")/../.."
quarn=$1
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
python=$(scripts/find_python.sh) || {
  echo "no Python with PyTorch here: quarn run is not tried to its end"
  exit 77
}
scripts/fetch_hand.sh
run=("$quarn" run build/deps/hand/left.glb -o "$work/hand" --parents examples/hand/parents.json
  --limits examples/hand/limits.json --import-option=--smoothing --import-option=5 --samples 40 --held-out 8 --epochs 3
  --target-part 30 --render-option=--view --render-option=90,20
  --target-command "$python" examples/hand/target_command.py)
NW_PYTHON=$python "${run[@]}" | tee "$work/said"
grep -qE '^surface, principal +\|' "$work/said" && grep -qx "report $work/hand/report.html" "$work/said"
for file in report.html pictures/l_handMeshNode.0041.png models/l_handMeshNode.nwrp/principal_shapes.json; do
  [[ -s $work/hand/$file ]] || { echo "the run made no $file"; exit 1; }
done
# pictures and the loss curve are in the page
[[ $(grep -o 'data:image/png;base64,' "$work/hand/report.html" | wc -l) == 5 ]] || {
  echo "the page lacks pictures"
  exit 1
}
"$python" tests/demo/recompute.py "$work/hand"
NW_PYTHON=$python "${run[@]}" 2>"$work/again" >/dev/null
grep -qx '16 of 16 steps were done already' "$work/again" || { cat "$work/again"; exit 1; }
