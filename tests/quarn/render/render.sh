#!/usr/bin/env bash
# render.sh QUARN: pictures of the example scene, by the command line: names, sizes, threads, and what is refused.
set -euo pipefail
quarn=$1 scene=examples/wave/wave.json
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source tests/support/expect.sh

# the four bytes of width and height in a PNG file, in hexadecimal
size_of() { od -An -tx1 -j16 -N8 "$1" | tr -d ' \n'; }
draw() { "$quarn" render "$scene" --plug strip.outMesh --size 40x30 "$@" 2>>"$work/err"; }
refused() { expect "$1" '' "$2" render "$scene" "${@:3}"; }

draw -o "$work/one.png"
[ "$(size_of "$work/one.png")" = 000000280000001e ] || fail "the picture has another size"
draw -o "$work/single.png" --threads 1
draw -o /dev/stdout --quiet >"$work/through.png"
cmp "$work/one.png" "$work/through.png"
cmp "$work/one.png" "$work/single.png"

draw -o "$work/pic.###.png" --frames 1-5x2 --heat "moved=strip.outMesh:wave.originalGeometry[0]" --quiet --json >"$work/json"
[ "$(cd "$work" && echo pic.*)" = "pic.001.png pic.003.png pic.005.png" ] || fail "the pictures have other names"
[ "$(size_of "$work/pic.003.png")" = 000000500000001e ] || fail "two panels are not twice as wide"
cmp "$work/pic.001.png" "$work/pic.005.png" # nothing moves in this scene
grep -q '"rangeMillimetres"' "$work/json"

# all of a character: each mesh as its last deformer gives it out, and none that only serves
cat >"$work/two.json" <<'END'
{"openquarnScene": 1,
 "nodes": [
  {"name": "floor", "type": "polyGrid", "values": {"width": 4}},
  {"name": "roof", "type": "polyGrid", "values": {"width": 2}},
  {"name": "goal", "type": "polyGrid", "values": {"width": 9}},
  {"name": "lift", "type": "blendShape", "values": {"weight": {"0": [1]},
    "shapes[0].shape[0].vertices": [0, 1], "shapes[0].shape[0].deltas": [0, 3, 0, 0, 2, 0]}},
  {"name": "cache", "type": "pointCache"}],
 "connections": [["roof.outMesh", "lift.input[0].inputGeometry"], ["goal.outMesh", "cache.inMesh"]]}
END
scene=$work/two.json
"$quarn" render "$scene" --size 40x30 -o "$work/whole.png" 2>>"$work/err"
"$quarn" render "$scene" --size 40x30 -o "$work/named.png" --panel "=floor.outMesh+lift.outputGeom[0]" 2>>"$work/err"
cmp "$work/whole.png" "$work/named.png"
cat >"$work/bones.json" <<'END'
{"openquarnScene": 1,
 "nodes": [
  {"name": "floor", "type": "polyGrid", "values": {"width": 4}},
  {"name": "root", "type": "joint", "values": {"translateX": -1}},
  {"name": "tip", "type": "joint", "values": {"translateX": 2}}],
 "connections": [["root.worldMatrix", "tip.parentMatrix"]]}
END
scene=$work/bones.json
shot() { "$quarn" render "$scene" --size 60x60 --view top -o "$work/$1" "${@:2}" 2>>"$work/err"; }
shot plain.png
shot bones.png --joints
! cmp -s "$work/plain.png" "$work/bones.png" || fail "no joint is drawn"
sed -i 's/"translateX": 2/"translateX": 0/' "$work/bones.json"
shot short.png --joints
! cmp -s "$work/short.png" "$work/bones.png" || fail "the joints are not where they stand"
scene=examples/wave/wave.json

refused 2 "must end in .png" -o "$work/no.jpg"
refused 1 "Not a directory" -o "$work/one.png/no.png"
refused 1 "takes one picture" -o /dev/stdout --frames 1-2 --plug strip.outMesh --size 40x30
refused 2 '"10x" is no size' -o "$work/no.png" --size 10x
refused 2 "cannot be made" -o "$work/no.png" --size 9000x100 --panel a=strip.outMesh --panel b=strip.outMesh
refused 1 "there is no plug strip.none" -o "$work/no.png" --plug strip.none
refused 1 "no deformer none" -o "$work/no.png" --model x --deformer none
refused 1 "none.nwrp, which is wave.modelRoot" -o "$work/no.png" --model none
[ ! -e "$work/no.png" ] || fail "a refused picture was written"
if ls "$work"/.whole-* 2>/dev/null; then fail "a part of a picture is left"; fi
exit $bad
