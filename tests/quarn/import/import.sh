#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# import.sh QUARN: what the command line of quarn import takes, and what it writes to which stream.
set -euo pipefail
quarn=$1
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source "$(dirname "$0")/../../support/expect.sh"

# a triangle that joint "bone" moves, below "root"
cd "$work"
buffer=AAAAAAAAAAAAAAAAAACAPwAAAAAAAAAAAAAAAAAAgD8AAAAAAAAAAAAAAAAAAAAAAACAPwAAAAAAAAAAAAAAAAAAgD8AAAAAAAAAAAAAAAAAAIA/AAAAAAAAAAAAAAAA
cat >bone.gltf <<EOF
{"asset":{"version":"2.0"},"scene":0,"scenes":[{"nodes":[0,2]}],
"nodes":[{"name":"root","translation":[0,1,0],"children":[1]},{"name":"bone"},{"name":"skin","mesh":0,"skin":0}],
"meshes":[{"primitives":[{"attributes":{"POSITION":0,"JOINTS_0":1,"WEIGHTS_0":2}}]}],"skins":[{"joints":[1,0]}],
"buffers":[{"byteLength":96,"uri":"data:application/octet-stream;base64,$buffer"}],
"bufferViews":[{"buffer":0,"byteLength":36},{"buffer":0,"byteOffset":36,"byteLength":12},
{"buffer":0,"byteOffset":48,"byteLength":48}],
"accessors":[{"bufferView":0,"componentType":5126,"count":3,"type":"VEC3"},
{"bufferView":1,"componentType":5121,"count":3,"type":"VEC4"},
{"bufferView":2,"componentType":5126,"count":3,"type":"VEC4"}]}
EOF
expect 0 'mesh skin: 3 vertices in the file, joined to 3; 1 polygons(.|\n)*scene .*/bone\.json\n$' '' import bone.gltf -o bone.json
expect 0 '"poseInputs": 3(.|\n)*"notes": \[\n' '(?s)place the character.*: root' import bone.gltf -o bone.json --neural-warp --json
expect 0 'deformer warp: 6 angles' '' import bone.gltf -o bone.json --neural-warp --with-roots -q
expect 1 '' '^quarn: .*none\.glb: does not exist\n$' import none.glb -o bone.json
expect 2 '' '^quarn: --fps must be a number above 0\n' import bone.gltf -o bone.json --fps 0
expect 2 '' '^quarn: --meters-per-unit must be' import bone.gltf -o bone.json --meters-per-unit -1
expect 2 '' '--output is required' import bone.gltf
expect 2 '' '--limits requires --neural-warp' import bone.gltf -o bone.json --limits limits.json
expect 2 '' '--controls' import bone.gltf -o bone.json --neural-warp --controls axis
# a buffer of its own, under a name that a URI writes otherwise
base64 -d <<<"$buffer" >'my buffer #1.bin'
sed 's|"data:[^"]*"|"my%20buffer%20%231.bin"|' bone.gltf >uri.gltf
expect 0 'mesh skin: 3 vertices' '' import uri.gltf -o bone.json
rm 'my buffer #1.bin' uri.gltf
expect 1 '' 'a\$b\.vertices\.npy cannot be named in a scene' import bone.gltf -o 'a$b.json'
[[ $(ls) == $'bone.gltf\nbone.json\nbone.vertices.npy\nerr\nout' ]] || { ls; bad=1; }
exit $bad
