#!/usr/bin/env bash
# usd.sh QUARN: a layer of USD that quarn writes, read by another program: the same bits of every point in every frame,
# and of the texture coordinates of every corner.
# Skipped, in one word, where node or the parser is missing; fails then where NW_ALL_CLIENTS is set.
set -euo pipefail
quarn=$1
here=$(dirname "$0")
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source tests/support/expect.sh

if ! command -v node >/dev/null || [[ ! -e build/deps/tinyusdz/stamp ]]; then
  echo "skipped: no node, or no parser (scripts/fetch_usd_parser.sh)"
  [[ ! ${NW_ALL_CLIENTS:-} ]] || exit 1
  exit 77
fi

check() { node "$here/layer.mjs" check "$@" >"$work/out" 2>"$work/err" || fail "$*:"; }

node "$here/layer.mjs" make "$work/any.npy" 5
cp -r examples/wave/models examples/wave/wave.json "$work"
cat >"$work/setup.txt" <<'SCRIPT'
file -open wave.json
createNode pointCache -name "any"
setAttr any.cacheFile any.npy
setAttr any.startFrame -1
connectAttr strip.outMesh any.inMesh
connectAttr time1.outTime any.time
createNode character -name who
setAttr who.metersPerUnit 0.01
setAttr who.framesPerSecond 29.97
file -saveAs any.json
SCRIPT
(cd "$work" && "$quarn" exec setup.txt >/dev/null)

written() { expect 0 'played frames' 'any\.usda will have about 1 MB' play "$work/any.json" --plug any.outMesh "$@"; }
written --frames -1-3 -o "$work/any.usda"
check "$work/any.usda" "$work/any.npy" 'metersPerUnit = 0.01' 'upAxis = "Y"' 'timeCodesPerSecond = 29.97' \
  'startTimeCode = -1' 'endTimeCode = 3' 'defaultPrim = "any"' 'subdivisionScheme = "none"'
# every other frame, in metres with z up, beside the same as a cache
written --frames -1-3x2 --axes z --scale 100 -o "$work/any.usda"
expect 0 'frames' '' play "$work/any.json" --plug any.outMesh --frames -1-3x2 --axes z --scale 100 \
  -o "$work/z.npy" --json --quiet
check "$work/any.usda" "$work/z.npy" 'metersPerUnit = 1' 'upAxis = "Z"' 'endTimeCode = 3'

# texture coordinates, from a file of another format
node "$here/layer.mjs" character "$work/sheet.gltf"
expect 0 'sheet' 'has no skin' import "$work/sheet.gltf" -o "$work/sheet.json"
expect 0 'frames' 'sheet\.usda will have' play "$work/sheet.json" --plug sheet.outMesh --frames 1-2 -o "$work/sheet.usda"
node "$here/layer.mjs" uvs "$work/sheet.usda" >"$work/out" 2>"$work/err" || fail "sheet.usda:"
exit $bad
