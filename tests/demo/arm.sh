#!/usr/bin/env bash
# arm.sh QUARN: the arm of examples/arm through quarn run, as its README has it but for fewer poses and passes: what a
# network leaves in a motion that it has not seen is a small part of what the skin lacks, and skin and target are apart.
set -euo pipefail
cd "$(dirname "$0")/../.."
quarn=$1
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
python=$(scripts/find_python.sh) || {
  echo "no Python with PyTorch here: the arm is not tried"
  exit 77
}
"$python" examples/arm/write_arm.py "$work/arm.glb"
NW_PYTHON=$python "$quarn" run "$work/arm.glb" -o "$work/arm" --limits examples/arm/limits.json --samples 200 \
  --activation-rate 0.8 --motion examples/arm/motion.json --epochs 120 --until evaluate --target-command "$python" examples/arm/arm_targets.py
"$python" - "$work/arm/answers/evaluate-arm.json" <<'PYTHON'
import json
import sys

said = json.load(open(sys.argv[1]))
(base, largest), (mean, left) = ([said[stage][figure]["mm"] for figure in ("mean", "max")] for stage in ("base", "network"))
print(f"{base:.3f} mm in the mean and {largest:.3f} at most before, {mean:.3f} and {left:.3f} after")
if not (base > 2.0 and largest > 30.0 and mean < 0.1 * base and left < 0.35 * largest):
    sys.exit(1)
PYTHON
