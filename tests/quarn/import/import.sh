#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# import.sh QUARN: what the command line of quarn import takes, and what it writes to which stream.
set -euo pipefail
quarn=$1
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source "$(dirname "$0")/../../support/expect.sh"

# a triangle that joint "bone" moves, below "root"
sed 's/"name":"a","children"/"name":"root","children"/; s/{"name":"a"}/{"name":"bone"}/
  s/{"mesh"/{"name":"skin","mesh"/; s/"animations".*"accessors"/"accessors"/' \
  "$(dirname "$0")/../../fuzz/corpus/fuzz_gltf/accepted_text" >"$work/bone.gltf"
cd "$work"
expect 0 'mesh skin: 3 vertices in the file, joined to 3; 1 polygons(.|\n)*scene .*/bone\.json\n$' '' import bone.gltf -o bone.json
expect 0 '"poseInputs": 3(.|\n)*"notes": \[\n' '(?s)place the character.*: root' import bone.gltf -o bone.json --neural-warp --json
expect 0 'deformer warp: 6 angles' '' import bone.gltf -o bone.json --neural-warp --with-roots -q
expect 2 '' '^quarn: --fps must be a number above 0\n' import bone.gltf -o bone.json --fps 0
expect 2 '' '^quarn: --meters-per-unit must be' import bone.gltf -o bone.json --meters-per-unit -1
expect 2 '' '--output is required' import bone.gltf
expect 2 '' '--limits requires --neural-warp' import bone.gltf -o bone.json --limits limits.json
expect 2 '' '--controls' import bone.gltf -o bone.json --neural-warp --controls axis
# limits as a file to edit, which is never written over, and the joints of a scene
expect 0 '6 angles' '' import bone.gltf -o bone.json --neural-warp --with-roots --write-limits limits.json -q
expect 0 '6 angles' '' import bone.gltf -o bone.json --neural-warp --with-roots --write-limits limits.json -q
sed -i 's/-30\.0/-12.5/' limits.json
expect 1 '' 'limits\.json is there already with other' \
  import bone.gltf -o bone.json --neural-warp --write-limits limits.json
expect 0 '6 angles' '' import bone.gltf -o bone.json --neural-warp --limits limits.json -q
expect 0 '^2 joints\nroot: 3 vertices; rotateX -12\.5 to 30 degrees; .*\n  bone: 3 vertices; ' '' \
  info bone.json --joints
expect 0 '"parent": "root"(.|\n)*"vertices": 3(.|\n)*"least": -12\.5' '' info bone.json --joints --json
expect 2 '' 'excludes' import bone.gltf -o bone.json --neural-warp --limits limits.json --limits-margin 0.1
rm limits.json
# a buffer of its own, under a name that a URI writes otherwise
sed 's/.*base64,//; s/".*//' bone.gltf | base64 -d >'my buffer #1.bin'
sed 's|"data:[^"]*"|"my%20buffer%20%231.bin"|' bone.gltf >uri.gltf
expect 0 'mesh skin: 3 vertices' '' import uri.gltf -o bone.json
rm 'my buffer #1.bin' uri.gltf
expect 1 '' 'a\$b\.vertices\.npy cannot be named in a scene' import bone.gltf -o 'a$b.json'
[[ $(ls) == $'bone.gltf\nbone.json\nbone.vertices.npy\nerr\nout' ]] || { ls; bad=1; }
exit $bad
