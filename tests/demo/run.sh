#!/usr/bin/env bash
# run.sh QUARN: quarn run from the hand's file to a report on a reduced set, its targets by a program in two parts; the
# report is computed once more from the files, and a second run does nothing. Its training is interrupted, and goes on.
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
  --limits examples/hand/limits.json --import-option=--smoothing --import-option=5 --samples 40 --held-out 8 --epochs 600
  --target-part 30 --render-option=--view --render-option=90,20
  --train-option=--checkpoint-every --train-option=0 --target-command "$python" examples/hand/target_command.py)
NW_PYTHON=$python "${run[@]}" >/dev/null 2>&1 &
while [[ ! -e $work/hand/models/l_handMeshNode.checkpoint ]]; do
  kill -0 $! || { echo "the run ended before its training had a checkpoint"; exit 1; }
  sleep 0.05
done
kill -TERM $!
wait $! && { echo "the run did not end"; exit 1; }
NW_PYTHON=$python "${run[@]}" | tee "$work/said"
grep -qE '^l_handMeshNode, surface, principal +\|' "$work/said" && grep -qx "report $work/hand/report.html" "$work/said"
for file in report.html models/l_handMeshNode.nwrp/principal_shapes.json; do
  [[ -s $work/hand/$file ]] || { echo "the run made no $file"; exit 1; }
done
grep -rq 'going on from .*l_handMeshNode\.checkpoint' "$work/hand/log" || { echo "the training began anew"; exit 1; }
# pictures and charts, the loss curve among them, are in the page
[[ $(grep -o 'data:image/png;base64,' "$work/hand/report.html" | wc -l) == 4 &&
  $(grep -c '<svg' "$work/hand/report.html") == 4 ]] || {
  echo "the page lacks pictures or charts"
  exit 1
}
"$python" tests/demo/recompute.py "$work/hand" "$quarn"
NW_PYTHON=$python "${run[@]}" 2>"$work/again" >/dev/null
grep -qx '11 of 11 steps were done already' "$work/again" || { cat "$work/again"; exit 1; }
