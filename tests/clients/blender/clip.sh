#!/usr/bin/env bash
# clip.sh QUARN: a character's own file, with a motion put into it, moves in Blender as in quarn, in its colours.
# Skipped, in one word, where Blender or its Python's NumPy is missing; fails then where NW_ALL_CLIENTS is set.
set -euo pipefail
quarn=$1
here=$(dirname "$0")
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source tests/support/expect.sh
source "$here/needs_blender.sh"

blend() {
  blender -b --factory-startup --python-exit-code 1 --python "$here/clip.py" -- "$1" "$work" >"$work/log" 2>&1 || {
    cat "$work/log"
    fail "Blender's part \"$1\" failed"
    exit 1
  }
  sed -n '/of the diagonal\|pixels/p' "$work/log"
}

blend make
expect 0 'mesh bar: 36 vertices in the file, joined to 27' '' import "$work/arm.gltf" -o "$work/arm.json" --neural-warp -q
expect 0 '' 'wrote 5 frames' bake "$work/arm.json" 'bar_skin.outputGeom[0]' --frames 1-5 -o "$work/skin.npy"
blend swell
expect 0 'bar_target plays 5 frames(.|\n)*mm from the skin' 'too slow to tell' target "$work/arm.json" --geometry bar \
  --cache "$work/swollen.npy" --anyway -o "$work/swollen.json"
for mesh in bar:bar_target.outMesh 'hat:hat_skin.outputGeom[0]'; do
  expect 0 'played' '' play "$work/swollen.json" --geometry "${mesh%%:*}" --plug "${mesh#*:}" --frames 1-5 \
    --order file -o "$work/${mesh%%:*}.npy"
done
clip=(play "$work/swollen.json" --geometry bar --plug bar_target.outMesh --frames 1-5 -o "$work/clip.glb")
expect 0 'played' 'the animation "bend" \(animations\[0\]\) is replaced by the clip' "${clip[@]}"
mv "$work/two colours.png" "$work/elsewhere.png" # all is in the one file
blend look
expect 0 'written with [2345] shapes' 'picture "two%20colours.png" .*: what is written refers to it' \
  "${clip[@]}" --targets fit --error 0.001
blend check
expect 0 'bar: .* morph targets' '' import "$work/clip.glb" -o "$work/again.json" -q
expect 1 '' 'clip\.glb is the character itself' play "$work/again.json" --plug 'bar_skin.outputGeom[0]' --frames 1-5 \
  -o "$work/clip.glb"
exit $bad
