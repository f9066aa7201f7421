#!/usr/bin/env bash
# controlPoints.sh QUARN: a character that Blender writes as FBX and as Collada takes Blender's own cache of its motion
# by --order file. Skipped, in one word, where Blender or its Python's NumPy is missing; fails then where NW_ALL_CLIENTS
# is set.
set -euo pipefail
quarn=$1
here=$(dirname "$0")
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source tests/support/expect.sh
source "$here/needs_blender.sh"

blender -b --factory-startup --python-exit-code 1 --python "$here/limb.py" -- "$work" >"$work/log" 2>&1 ||
  { cat "$work/log" && exit 1; }

# FBX is in centimetres; Collada's first key is at 1/24 second
declare -A flags=([fbx]="--scale 100" [dae]="--start-frame 2") warnings=([fbx]="" [dae]="covers frames 2-7")
for format in fbx dae; do
  scene=$work/$format.json
  expect 0 'mesh limb: 42 control points in the file, joined to 42; 36 polygons, 2 joints' '' \
    import "$work/limb.$format" --neural-warp --quiet -o "$scene"
  expect 0 'order of its file: limb: 42 control points\n' '' info "$scene"
  read -ra words <<<"${flags[$format]}"
  expect 0 'it is 0.000[0-9]* mm from the skin in the mean .*, 0.00[0-9]* mm at most, in 6 frames' "${warnings[$format]}" \
    target "$scene" --cache "$work/limb.pc2" --order file "${words[@]}" --quiet -o "$work/target.json"
  # the numbering is one that matters
  expect 1 '' 'limb.pc2 is [0-9]{2,} mm from the skin' \
    target "$scene" --cache "$work/limb.pc2" "${words[@]}" -o "$work/target.json"
done
exit $bad
