#!/usr/bin/env bash
# wave.sh QUARN PLUGIN: the example scene moves as it should; and its files are what their script writes.
set -euo pipefail
quarn=$(realpath "$1") plugin=$(realpath "$2")
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

"$quarn" exec --plugin "$plugin" examples/wave/evaluate.txt >"$work/out" 2>"$work/err"
diff examples/wave/expected.txt "$work/out"
if grep -v '^info: ' "$work/err"; then exit 1; fi

# from any folder: texts of a scene count from its own folder, what is on the command line or in a script from the
# caller's, also after a scene was opened; a scene saved elsewhere still finds its model
here=$PWD
for folder in one two; do cp -r examples/wave "$work/$folder"; done
mv "$work/two/models/wave.nwrp" "$work/two/models/fold.nwrp"
sed -i 's/"modelName": "wave"/"modelName": "fold"/' "$work/two/wave.json"
cat >"$work/folders.txt" <<'SCRIPT'
file -open one/wave.json; setAttr controls.inputList[0].input[0] 1; meshInfo -to strip.outMesh wave.outputGeom[0]
file -open two/wave.json; setAttr controls.inputList[0].input[0] 1; meshInfo -to strip.outMesh wave.outputGeom[0]
workspace -query -rootDirectory
file -saveAs third/wave.json; getAttr wave.modelRoot; meshInfo -to strip.outMesh wave.outputGeom[0]
file -new; file -saveAs plain.json
SCRIPT
cd "$work"
NEURALWARP_PLUGIN=$plugin "$quarn" exec folders.txt >out 2>err
diff - out <<EXPECTED
one/wave.json
mean distance 0.247926, largest 0.4 at vertex 256
two/wave.json
mean distance 0.247926, largest 0.4 at vertex 256
$work/
third/wave.json
$work/two/models
mean distance 0.247926, largest 0.4 at vertex 256
plain.json
EXPECTED
[[ ! -s err && -s plain.json ]] || { cat err; exit 1; }
for scene in one two third; do
  "$quarn" play "$scene/wave.json" --frames 1 --quiet -o "$scene.npy" >out
  "$quarn" render "$scene/wave.json" --size 40x30 -o "$scene.png" --quiet
done
"$quarn" play third/wave.json --frames 1 --against strip.outMesh | grep -q 'max 400 mm' # with its model
cmp one.npy two.npy
cd "$here"

# made again elsewhere, where there is a Python
command -v python3 >/dev/null || { echo "no Python here: the files were not made again"; exit 0; }
cp examples/wave/make.py "$work"
python3 "$work/make.py"
diff -r examples/wave/models "$work/models"
diff examples/wave/wave.json "$work/wave.json"
