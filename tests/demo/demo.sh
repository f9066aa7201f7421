#!/usr/bin/env bash
# demo.sh QUARN: the demo's own steps on a reduced set; then its report is computed once more from the files, and a model
# that outputs zeros has to leave just the error that the report gives for no correction.
set -euo pipefail
cd "$(dirname "$0")/../.."
. scripts/common.sh
. scripts/demo.sh
quarn=$1
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

# shellcheck disable=SC2317 # called by command_demo
demo_install() {
  scripts/fetch_hand.sh
  # shellcheck disable=SC2034 # command_demo's
  python=$(scripts/find_python.sh)
  export QUARN=$quarn
}
python=$(scripts/find_python.sh) || {
  echo "no Python with PyTorch here: the demo is not tried"
  exit 77
}
command_demo --all --output "$work/demo" --samples 40 --epochs 3
pages=()
if [[ -s $(dirname "$quarn")/../clients/viewer/viewer.html ]]; then pages=({hand,hand-offset,hand-direct,arm}.html); fi
for file in report.html table.txt arm.png arm/report.html "${pages[@]}"; do
  [[ -s $work/demo/$file ]] || fail "the demo made no $file"
done
compgen -G "$work/demo/pictures/hand-offset.*.png" >/dev/null || fail "the demo drew no picture of offsets"
"$python" tests/demo/recompute.py "$work/demo" "$quarn"

# zero_errors MODE FIGURE: what a model of zeros leaves
for mode in surface offset; do
  run=$work/demo/data/${mode}_principal
  "$python" -m trainer zero "$run/data/l_handMeshNode/heldOut" -o "$run/models/zero.nwrp"
  "$quarn" play "$run/motion.l_handMeshNode.json" --model zero --against target --json >"$work/zero.json"
  "$python" - "$work/zero.json" "$work/demo/report.json" "$mode" <<'PYTHON'
import json, sys
zero = json.load(open(sys.argv[1]))["distance"]["mm"]
base = next(row["base"] for row in json.load(open(sys.argv[2]))["rows"] if row["mode"] == sys.argv[3])
for figure in ("mean", "max"):
    if not abs(zero[figure] - base[f"{figure}_mm"]) <= 1e-5:
        sys.exit(f"{sys.argv[3]}: a model of zeros leaves {figure} {zero[figure]} mm, the base is {base[f'{figure}_mm']}")
PYTHON
done
