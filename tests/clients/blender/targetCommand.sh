#!/usr/bin/env bash
# targetCommand.sh QUARN: examples/blender/blender_targets.py makes the targets of a limb: with no smoothing the skin
# itself, with it another shape, and with a user's file what its modifiers make, all the same in parts.
# Skipped, in one word, where Blender or its Python's NumPy is missing; fails then where NW_ALL_CLIENTS is set.
set -euo pipefail
quarn=$1
here=$(dirname "$0")
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source tests/support/expect.sh
source "$here/needs_blender.sh"

blender -b --factory-startup --python-exit-code 1 --python "$here/arm.py" -- "$work" >"$work/out" 2>"$work/err" || {
  fail "Blender makes no limb"
  exit 1
}

# run STATUS OUT-PATTERN ERR-PATTERN FOLDER [--target-part N] -- [OPTION...]
run() {
  local status=$1 out=$2 err=$3 folder=$work/$4 part=()
  shift 4
  while [[ $1 != -- ]]; do part+=("$1"); shift; done
  expect "$status" "$out" "$err" run "$work/arm.glb" -o "$folder" --import-option=--with-roots --samples 5 --held-out 3 \
    --until target "${part[@]}" --target-command blender -b --factory-startup --python-exit-code 1 \
    --python examples/blender/blender_targets.py "$@"
}
# moved FOLDER X Y Z: how far the targets are, at most, from the skin that was moved
moved() {
  /usr/bin/python3 - "$work/$1"/data/*/ "${@:2}" <<'PYTHON'
import sys
import numpy
skin, target = (numpy.load(f"{sys.argv[1]}/poses_{name}.npy") for name in ("skin", "target"))
assert skin.shape == target.shape and skin.shape[0] == 8 and numpy.ptp(skin, axis=0).max() > 0.1
print(f"{numpy.abs(target - skin - numpy.array(sys.argv[2:], dtype=float)).max():.9f}")
PYTHON
}
is() { /usr/bin/python3 -c 'import sys; sys.exit(not eval(sys.argv[1]))' "$1" || { echo "not $1"; bad=1; }; }

run 0 '' 'targets +\d' none -- --factor 0
is "$(moved none 0 0 0) < 1e-5"
run 0 '' 'targets +\d' smooth -- --iterations 4
is "0.01 < $(moved smooth 0 0 0) < 0.5"
run 0 '' 'targets +\d' blend -- --blend "$work/arm.blend"
is "$(moved blend 0 0.0625 0) < 1e-5"
run 0 '' 'targets +\d' parts --target-part 3 -- --blend "$work/arm.blend"
cmp "$work"/{blend,parts}/data/*/poses_target.npy || fail "in parts the targets are others"
run 1 '' 'this is another character than quarn' other -- --blend "$work/other.blend"
exit $bad
