#!/usr/bin/env bash
# meshes.sh QUARN: quarn run on a character of several meshes with morph targets, from its script to a report with a row
# for each; the weights are controls of all models, and a second run does nothing.
set -euo pipefail
cd "$(dirname "$0")/../.."
quarn=$1
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
python=$(scripts/find_python.sh) || {
  echo "no Python with PyTorch here: a character of several meshes is not taken to a report"
  exit 77
}
"$python" tests/demo/character.py "$work/talk.gltf"
run() {
  NW_PYTHON=$python "$quarn" run "$work/talk.gltf" -o "$work/talk" --import-option=--with-roots --samples 30 \
    --held-out 6 --epochs 3 "$@" --target-command "$python" tests/demo/character.py
}
run >"$work/said" 2>"$work/log" || { cat "$work/log"; exit 1; }
"$python" - "$work/talk" <<'PYTHON'
import json, sys
folder = sys.argv[1]
def read(name):
    with open(f"{folder}/{name}", encoding="utf-8") as file:
        return json.load(file)
meshes = ["body", "head", "teeth"]
assert [row["mesh"] for row in read("report.json")["rows"]] == meshes, read("report.json")
sliders = ["head_sliders.smile", "head_sliders.jawOpen", "teeth_sliders.jawOpen"]
assert {name: value for name, value in read("limits.json").items() if name in sliders} == dict(
    zip(sliders, ([0, 1], [0, 1.4], [0, 1]))), read("limits.json")
for mesh in meshes:
    about = read(f"data/{mesh}/set/dataset.json")
    assert about["controlNames"][-3:] == sliders, about["controlNames"]
    for (least, most), top in zip(about["controlRanges"][-3:], (1, 1.4, 1)):
        assert 0 <= least < 0.3 and 0.6 < most <= top + 1e-6, about["controlRanges"]
    assert read(f"models/{mesh}.nwrp/metadata.json")["geometry"] == mesh
PYTHON
grep -q 'teeth' "$work/said"
"$quarn" info "$work/talk/character.json" --joints | grep -qx 'head_sliders.jawOpen: 0 to 1.4'
# what is left out of the scene and counts all the same is said
"$quarn" import "$work/talk.gltf" -o "$work/still.json" --neural-warp --no-animation 2>"$work/notes" >"$work/told"
grep -q -- '--limits-from none leaves it out' "$work/notes" && grep -q '3 angles and 3 weights' "$work/told"
run --explain >"$work/explained"
[[ -s $work/explained ]] && ! grep -v ': done$' "$work/explained" || exit 1
run 2>&1 >/dev/null | grep -qE '^([0-9]+) of \1 steps were done already$'
