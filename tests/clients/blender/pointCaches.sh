#!/usr/bin/env bash
# pointCaches.sh QUARN: caches that Blender has written go into a scene, and come back by its Mesh Cache modifier.
# Skipped, in one word, where Blender or its Python's NumPy is missing; fails then where NW_ALL_CLIENTS is set.
set -euo pipefail
quarn=$1
here=$(dirname "$0")
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source tests/support/expect.sh
source "$here/needs_blender.sh"

blend() {
  blender -b --factory-startup --python-exit-code 1 --python "$here/grid.py" -- "$1" "$work" >"$work/log" 2>&1 || {
    cat "$work/log"
    fail "Blender's part \"$1\" failed"
    exit 1
  }
}

blend make
# what came as MDD goes back as PC2, and the reverse; both through a scene that is in centimetres and has y up
expect 0 'plays 6 frames of .*in_mdd\.grid_target\.npy from frame 1 on' '' target "$work/grid.json" \
  --cache "$work/in.mdd" --axes z --scale 100 --quiet -o "$work/in_mdd.json"
expect 0 'plays 6 frames' 'matched 130 vertices' target "$work/grid.json" \
  --cache "$work/in.pc2" --scale 100 --order rest -o "$work/in_pc2.json"
expect 0 '' 'wrote 6 frames of 130 vertices' bake "$work/in_mdd.json" grid_target.outMesh --frames 1-6 --scale 100 \
  -o "$work/out.pc2"
expect 0 '' 'wrote 6 frames' bake "$work/in_pc2.json" grid_target.outMesh --frames 1-6 --axes z --scale 100 \
  -o "$work/out.mdd"
blend check
grep 'of the diagonal' "$work/log"
# a frame late is what the test would see
expect 0 '' 'wrote 6 frames' bake "$work/in_pc2.json" grid_target.outMesh --frames 0-5 --axes z --scale 100 \
  -o "$work/out.mdd"
(blend check) >/dev/null && fail "a cache that is a frame late is Blender's own motion"
# NumPy reads what quarn writes, sums included
expect 0 '' 'wrote 6 frames' bake "$work/in_pc2.json" grid_target.outMesh --frames 1-6 -o "$work/out.npz"
expect 0 '' 'wrote 6 frames' bake "$work/in_pc2.json" grid_target.outMesh --frames 1-6 -o "$work/out.npy"
/usr/bin/python3 - "$work" <<'PYTHON' || fail "NumPy reads other points from .npz and .npy"
import sys
import numpy
packed = numpy.load(sys.argv[1] + "/out.npz")
assert packed.files == ["arr_0"] and (packed["arr_0"] == numpy.load(sys.argv[1] + "/out.npy")).all()
PYTHON
exit $bad
