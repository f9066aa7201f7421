#!/usr/bin/env bash
# armature.sh QUARN: the arm of examples/arm in Blender: at 90 degrees its armature makes the shape that quarn's skin has.
set -euo pipefail
quarn=$1
here=$(dirname "$0")
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source "$here/needs_blender.sh"

# compare SKIN: the file's vertices in Blender against it
compare() {
  blender -b --factory-startup --python-exit-code 1 --python "$here/armature.py" -- "$work/arm.glb" "$1" >"$work/log" 2>&1
}

/usr/bin/python3 examples/arm/write_arm.py "$work/arm.glb"
"$quarn" import "$work/arm.glb" -o "$work/arm.json" --quiet >"$work/said"
for frame in 24 25; do
  "$quarn" bake "$work/arm.json" arm_skin.outputGeom[0] --frames $frame-$frame --order file --quiet -o "$work/$frame.npy"
done
compare "$work/25.npy" || { cat "$work/log"; exit 1; } # at one second
grep 'of the diagonal' "$work/log"
# a frame early is what the test would see
! compare "$work/24.npy" || { echo "the frame before is Blender's as well"; exit 1; }
