#!/usr/bin/env bash
# face.sh QUARN: the example face, from its script to a data set whose controls are the sliders.
set -euo pipefail
quarn=$1
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source tests/support/expect.sh
examples=$PWD/examples/face
cd "$work"

expect 0 'face\.json\n$' '' exec "$examples/face.txt"
expect 0 '"collector": "face",(.|\n)*"poses": 60,\n *"values": 3,' '' \
  pose face.json -o posed.json --samples 60 --json --quiet
expect 0 '60 frames of 0 joints, 3 plugs' '' pose posed.json --write poses.json --quiet
expect 0 '180 keys on 3 plugs' '' pose face.json -o again.json --keys poses.json
grep -q '^"face\.smile": \[\[1, 0\]' poses.json || fail "a slider is not written by its name"
expect 0 'sculpted\.json\n$' '' exec "$examples/sculpt.txt"
expect 0 '' 'wrote 60 frames of 45 vertices' bake sculpted.json 'shapes.outputGeom[0]' --frames 1-60 -o sculpted.npy
expect 0 'skin_target plays 60 frames' '' target posed.json --cache sculpted.npy --quiet
expect 0 'skin: 60 rows of 3 controls and 45 vertices' '' export posed.json -o data --quiet

command -v python3 >/dev/null || { echo "no Python here: the numbers were not looked at"; exit $bad; }
# what the network would learn is the correction, and what it learns from is the sliders
python3 - data <<'PYTHON' || fail "not the data set of the face"
import json, struct, sys

folder = sys.argv[1]
about = json.load(open(f"{folder}/dataset.json"))
assert about["controlNames"] == ["face.browUp", "face.smile", "face.jawOpen"], about["controlNames"]
assert about["geometry"] == "skin", about["geometry"]
for (least, most), bounds in zip(about["controlRanges"], [(0, 1), (-0.5, 1), (0, 0.8)]):
    assert bounds[0] - 1e-6 <= least <= 0 < most <= bounds[1] + 1e-6, about["controlRanges"]


def rows(name, width):
    data = open(f"{folder}/{name}", "rb").read()[128:]
    return [struct.unpack_from(f"<{width}f", data, 4 * width * row) for row in range(60)]


moved = {28: (0.03, -0.02, 0.02), 34: (-0.03, -0.02, 0.02), 11: (0, 0.03, 0), 15: (0, 0.03, 0)}
active = [0, 0]
for (brow, smile, jaw), deltas in zip(rows("controls.npy", 3), rows("deltas.npy", 3 * 45)):
    product, between = smile * jaw, max(0.0, 1 - abs(brow - 0.5) / 0.5)
    active = [active[0] + (product != 0), active[1] + (between != 0)]
    for vertex in range(45):
        weight = product if vertex in (28, 34) else between
        for axis, wanted in enumerate(moved.get(vertex, (0, 0, 0))):
            got = deltas[3 * vertex + axis]
            assert abs(got - weight * wanted) < 1e-5, (vertex, axis, got, weight * wanted)
assert min(active) > 3, active
PYTHON
exit $bad
