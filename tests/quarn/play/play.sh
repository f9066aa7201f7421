#!/usr/bin/env bash
# play.sh QUARN: playing, baking and looking at the example scene, whose first control is made to follow the time.
set -euo pipefail
source tests/support/movingWave.sh
quarn=$1
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source tests/support/expect.sh

moving_wave "$quarn" "$work" <<'EOF'
createNode pointCache -name lost
connectAttr strip.outMesh lost.inMesh
connectAttr time1.outTime lost.time
setAttr lost.cacheFile none.npy
file -saveAs lost.json
file -open moving.json
setAttr wave.models[0].modelActive 0
file -saveAs off.json
setAttr wave.models[0].modelActive 1
setAttr ramp.keyValues 0 3e38
setAttr wave.envelope 10
file -saveAs huge.json
setAttr ramp.keyValues 0 1
setAttr wave.models[0].modelActive 0
setAttr wave.modelRoot nowhere
file -saveAs untrained.json
EOF
scene=$work/moving.json

# the wave of the first control at 1 is 0.4 units high, as the scene's own page says; half of it half-way
expect 0 'max 400 mm .* in frame 11\n' '' play "$scene" --frames 1-11 --against strip.outMesh --repeat 2
expect 0 '"otherJitterMm": 0.0' '' play "$scene" --frames 1-11 --against strip.outMesh --json
expect 0 '"before": null' '' play "$scene" --plug strip.outMesh --geometry 0 --against strip.outMesh --frames 1 --json
expect 0 'InferenceDeltas: median' '' play "$scene" --frames 1-3 --profile "$work/trace.json"
grep -q traceEvents "$work/trace.json" || fail "no trace"
expect 0 '' 'wrote 3 frames of 369 vertices' bake "$scene" 'wave.outputGeom[0]' --frames 1-3 -o "$work/a.npy"
expect 0 '3 frames timed' '' play "$scene" --frames 1-11x5 -o "$work/a.####.obj"
for file in a.0001.obj a.0006.obj a.0011.obj a.npy; do [[ -s $work/$file ]] || fail "no $file"; done
[[ $(grep -c '^v ' "$work/a.0006.obj") == 369 && $(grep -c '^f' "$work/a.0006.obj") == 320 ]] || fail "not the mesh"

# on the GPU, or without one on the CPU with a warning, the same motion
expect 0 'GPU: ' '' play "$scene" --frames 1-11 --evaluator gpu -o "$work/gpu.npy"
expect 0 '' 'wrote 11 frames' bake "$scene" 'wave.outputGeom[0]' --frames 1-11 -o "$work/cpu.npy"
[[ $(stat -c %s "$work/gpu.npy") == $(stat -c %s "$work/cpu.npy") ]] || fail "not the same frames"
OCL_ICD_VENDORS=$work/none expect 0 'GPU: 0 deformations on no device, 11 on the CPU, 10 of them' \
  'warning: deformers are evaluated on the CPU: no OpenCL device' \
  play "$scene" --frames 1-11 --evaluator gpu -o "$work/fallback.npy"
cmp "$work/fallback.npy" "$work/cpu.npy" || fail "the CPU's frames come out otherwise when the GPU was asked for"
expect 1 '' 'no OpenCL device "no such thing": ' play "$scene" --evaluator gpu --device 'no such thing'
expect 2 '' '--device 0 goes with --evaluator gpu' play "$scene" --device 0
OCL_ICD_VENDORS=$work/none expect 0 'no OpenCL device' '' info --devices
expect 2 '' 'put #### where' play "$scene" --frames 1-3 -o "$work/a.obj"
expect 2 '' '\.mdd, \.obj' play "$scene" --frames 1 -o "$work/a.stl"
expect 2 '' 'What reads \.abc reads \.usda or \.pc2' play "$scene" --frames 1 -o "$work/a.abc"
expect 1 '' 'lost\.usda would have about 3248 MB: give --anyway' play "$scene" --frames 1-200000 -o "$work/lost.usda"
expect 0 'played' 'clip\.glb will have about 1 MB' play "$scene" --frames 1-11 -o "$work/clip.glb"
expect 0 '"shapes": {\s+"count": [12],' 'clip\.glb' play "$scene" --frames 1-11 --targets fit -o "$work/clip.glb" --json
expect 2 '' 'fit goes with -o FILE\.glb' play "$scene" --frames 1 --targets fit -o "$work/clip.glb"
expect 2 '' '--clip goes with -o FILE\.glb' play "$scene" --frames 1-3 --clip mesh -o "$work/clip.usda"
expect 1 '' "cannot be put into the character's file: the scene knows no file" \
  play "$scene" --frames 1-3 --clip character -o "$work/clip.glb"
expect 2 '' '--error goes with --targets fit' play "$scene" --frames 1-3 --error 0.1 -o "$work/clip.glb"
expect 1 '' 'has no target: connect' play "$scene" --frames 1 --against target
expect 1 '' 'frame 1: .*none\.npy' bake "$work/lost.json" lost.outMesh --frames 1-3 -o "$work/lost.npy"
expect 1 '' 'no node of type character' bake "$scene" strip.outMesh --frames 1 --order file -o "$work/lost.npy"
expect 1 '' 'models/other\.nwrp' play "$scene" --frames 1 --model other
# what is slow on purpose is said before it is waited for
cp -r "$work/models/wave.nwrp" "$work/slow.nwrp"
sed -i 's/"smoothingIterations": [0-9]*/"smoothingIterations": 1000/' "$work/slow.nwrp/metadata.json"
expect 0 'warning: so many smoothing passes' '' info "$work/slow.nwrp"

# a destroyed mesh leaves with an error: by the network, and by a damaged model
expect 1 '' 'frame 4: vertex 8 of wave' play "$work/huge.json" --frames 4 -o "$work/lost.obj"
expect 1 '' '3 of 11 rows are kept in .*huge\.npy\.part; (.|\n)*frame 4: vertex 8 of wave' \
  bake "$work/huge.json" 'wave.outputGeom[0]' --frames 1-11 -o "$work/huge.npy"
[[ ! -e $work/huge.npy ]] || fail "a cache of a bake that failed"
cp -r "$work/models/wave.nwrp" "$work/models/seven.nwrp"
sed -i 's/"deltaMode": 1/"deltaMode": 7/' "$work/models/seven.nwrp/metadata.json"
expect 1 '' 'wave cannot apply the model .*seven\.nwrp: .* deltaMode 7' play "$scene" --frames 1 --model seven
mv "$work/models/wave.nwrp" "$work/kept"
mv "$work/models/seven.nwrp" "$work/models/wave.nwrp"
expect 1 '' 'deltaMode 7' bake "$scene" 'wave.outputGeom[0]' --frames 1-3 -o "$work/lost.npy"
expect 0 '' 'wrote 3 frames' bake "$scene" strip.outMesh --frames 1-3 -o "$work/a.npy"
expect 1 '' 'deltaMode 7' render "$scene" -o "$work/lost.png" --size 40x30
rm -r "$work/models/wave.nwrp"
mv "$work/kept" "$work/models/wave.nwrp"
! compgen -G "$work/lost.[onpu]*" >/dev/null || fail "a file of a play that failed"

# the model in memory goes on while its directory is replaced under it, and Ctrl-C keeps the frames that there are
cp -r "$work/models/wave.nwrp" "$work/next"
"$quarn" play "$scene" --frames 1-400000 -o "$work/long.npy" >"$work/out" 2>"$work/err" &
player=$!
for _ in {1..600}; do
  if [[ -e $work/long.npy.part/progress.json ]] || ! kill -0 "$player"; then break; fi
  sleep 0.05
done
for _ in 1 2 3 4 5 6; do
  mv "$work/models/wave.nwrp" "$work/last"
  mv "$work/next" "$work/models/wave.nwrp"
  mv "$work/last" "$work/next"
  sleep 0.05
done
kill -INT "$player"
status=0
wait "$player" || status=$?
[[ $status == 130 ]] && grep -q interrupted "$work/err" || fail "interrupted: status $status"
grep -q 'of 400000 rows are kept in .*long\.npy\.part; the same command goes on' "$work/err" && [[ ! -e $work/long.npy ]] ||
  fail "what is left of an interrupted play"

# ended at any moment, a bake goes on to the bytes of one run; a second one of the same file is refused meanwhile
long=(bake "$scene" 'wave.outputGeom[0]' --frames 1-30000)
expect 0 '' 'wrote 30000 frames' "${long[@]}" -o "$work/whole.npy"
points=$work/killed.npy.part/points.npy
for signal in TERM KILL KILL; do # the first one keeps its rows, however seldom the disk lets it record them
  before=$(stat -c %s "$points" 2>/dev/null || echo 0)
  "$quarn" "${long[@]}" -o "$work/killed.npy" -q >"$work/out" 2>"$work/err" &
  player=$!
  for _ in {1..2000}; do
    now=$(stat -c %s "$points" 2>/dev/null || echo 0)
    if ((now > before + 100000)) || ! kill -0 "$player"; then break; fi
    sleep 0.005
  done
  kill -STOP "$player" || true
  [[ $signal != TERM ]] || expect 75 '' 'another quarn play or bake is writing' "${long[@]}" -o "$work/killed.npy"
  kill -"$signal" "$player" || true
  kill -CONT "$player" || true
  wait "$player" && fail "it was over before it could be ended by $signal" || true
done
expect 1 '' 'killed\.npy\.part was begun with another set-up \(frames 1-30000, now 1-2\); .* --overwrite' \
  bake "$scene" 'wave.outputGeom[0]' --frames 1-2 -o "$work/killed.npy"
expect 0 '' 'going on after [0-9]+ of 30000 rows in (.|\n)*wrote 30000 frames .*, [0-9]+ of them in an earlier run' \
  "${long[@]}" -o "$work/killed.npy"
cmp "$work/whole.npy" "$work/killed.npy" && [[ ! -e $work/killed.npy.part ]] || fail "not what one run makes"

# a part says how it joins the next one, and files of frames that are there stay
expect 0 '' 'wrote 4 frames' bake "$scene" 'wave.outputGeom[0]' --frames 4-7 --of 1-9 --preroll 2 -o "$work/part.npy"
grep -q '"of": "1-9"' "$work/part.npy.part.json" || fail "no record of a part"
expect 2 '' '4-11 is no run of the frames of --of 1-9' \
  bake "$scene" strip.outMesh --frames 4-11 --of 1-9 -o "$work/lost.npy"
rm "$work/a.0006.obj"
expect 0 'the files of 2 of them were there;(.|\n)*1 frames timed' '' \
  play "$scene" --frames 1-11x5 -o "$work/a.####.obj" --skip-existing
expect 0 '"framesSkipped": 3' '' play "$scene" --frames 1-11x5 -o "$work/a.####.obj" --skip-existing --json
expect 0 '' 'drew 2 pictures' render "$scene" --frames 1-2 --of 1-4 --preroll 1 -o "$work/r.####.png" --size 40x30
expect 0 '"skipped": 2,' '2 frames were left out(.|\n)*drew 2 pictures, .*r\.0003' \
  render "$scene" --frames 1-4 -o "$work/r.####.png" --size 40x30 --skip-existing --json
cp "$work/r.0002.png" "$work/two.png"
expect 0 '' 'drew 4 pictures' render "$scene" --frames 1-4 -o "$work/r.####.png" --size 40x30
cmp "$work/r.0002.png" "$work/two.png" || fail "a part of a film has another camera than the whole"

# a guard: at 1 the first control is as far beyond its range as that is wide
expect 1 '' 'frame 1: the guard of wave fails: .*wave\.nwrp does not say which poses' play "$scene" --frames 1 --guard
cp "$work/models/wave.nwrp/metadata.json" "$work/metadata.json"
sed -i 's/^{/{"controlNames": ["a", "b"], "certificate": {"controls": {"minima": [0, -1], "maxima": [0.5, 1]}, "trainingFrames": 9, "errors": []},/' \
  "$work/models/wave.nwrp/metadata.json"
guarded=('lowered in 5 of 11 frames, and 0 in 1; frame 11 is furthest .* by 1 of a range \(.* 0 from 1 on\)')
expect 0 "${guarded[0]}"'(.|\n)*max 221' '' play "$scene" --frames 1-11 --against strip.outMesh --guard --repeat 2
expect 0 '"off": 0,(.|\n)*"max": 22[45]\.' '' \
  play "$scene" --frames 11 --against strip.outMesh --guard --guard-width 2 --json
expect 0 '' "${guarded[0]}" bake "$scene" 'wave.outputGeom[0]' --frames 1-11 -o "$work/guarded.npy" --guard
expect 0 '"lowered": 1,' 'lowered in 1 of 1 frames' render "$scene" --frames 11 -o "$work/a.png" --size 40x30 --guard --json
expect 2 '' '--guard-width requires --guard' play "$scene" --guard-width 2
expect 1 '' 'what is shown has none' bake "$scene" strip.outMesh --frames 1 -o "$work/lost.npy" --guard
mv "$work/metadata.json" "$work/models/wave.nwrp"

# a model that is off: the only one that fits is taken, and what is shown is always said
fits=('"model": {\s+"name": "wave",\s+"from": "only one that fits"' 'played .* model wave\nthe model of wave is off in the scene; taken is wave')
expect 0 "${fits[0]}" '' play "$work/off.json" --frames 1-3 --json
expect 0 "${fits[1]}" '' play "$work/off.json" --frames 1-3
expect 0 '' 'wrote 1 frames .*\n.*taken is wave' bake "$work/off.json" 'wave.outputGeom[0]' --frames 11 -o "$work/on.npy"
expect 0 '"model": {\s+"name": "wave"' 'taken is wave' render "$work/off.json" -o "$work/a.png" --size 40x30 --json
expect 0 '"model": null(.|\n)*"max": 0.0' '' play "$work/off.json" --frames 11 --against strip.outMesh --no-model --json
expect 0 '' 'wrote 1 frames[^\n]*\n$' bake "$work/off.json" 'wave.outputGeom[0]' --no-model --frames 11 -o "$work/off.npy"
expect 0 '"from": "option"' '' play "$scene" --frames 1 --model wave --json
expect 0 '"from": "scene"' '' play "$scene" --frames 1 --json
expect 0 '"model": null' '' play "$scene" --frames 1 --plug strip.outMesh --json
cmp -s "$work/on.npy" "$work/off.npy" && fail "the model that was taken does nothing"
cp -r "$work/models/wave.nwrp" "$work/models/two.nwrp"
expect 0 'is off, and several in models fit \(two, wave; .*\): this is the mesh as it came in\n' '' \
  play "$work/off.json" --frames 1
sed -i 's/"fullCount": 369/"fullCount": 4/' "$work/models/"*/metadata.json
expect 0 'the model of wave is off: this is the mesh as it came in\n' '' play "$work/off.json" --frames 1
sed -i 's/"fullCount": 4/"fullCount": 369/' "$work/models/"*/metadata.json
rm -r "$work/models/two.nwrp"

expect 0 'Off, not there: training makes nowhere/wave\.nwrp\n$' '' info "$work/untrained.json"
sed 's/modelName/modelNmae/; s/"openquarnScene"/"openQuarnScene": 1, &/' "$scene" >"$work/misspelt.json"
misspelt=('the key .?openQuarnScene.? is not known' 'modelNmae')
expect 0 "warning: .*misspelt\.json: .*${misspelt[0]}.*\n(.|\n)*warning: .*${misspelt[1]}" '' info "$work/misspelt.json"
expect 0 "\"warnings\": \[\s+\".*${misspelt[0]}.*\"(.|\n)*${misspelt[1]}" '' info "$work/misspelt.json" --json
expect 0 '"warnings": \[\],' '' info "$scene" --json
expect 0 'network: 2 controls to 2 outputs\n2 principal shapes of 369 vertices, read from principal_shapes.json\nnote: it has no certificate: .*\nfits\n' '' \
  info "$work/models/wave.nwrp" --scene "$scene"

# frames that the model was not trained on: of the first control half of where it goes, of the second all
expect 0 'model wave: it has no certificate' '' play "$scene" --frames 1
figures='{"mean": 0.5, "p99": 1, "p9999": 2, "max": 3.25}'
certificate='"trainingFrames": 80, "controls": {"minima": [0, -2], "maxima": [0.5, 2]}, "mesh": "xxh3_128:0"'
certificate+=', "errors": [{"frames": 20, "poses": "drawn", "heldOut": "at random", "mm": {"network": '"$figures}}]"
sed -i "s/^{/{\"controlNames\": [\"first\", \"second\"], \"certificate\": {$certificate},/" "$work/models/wave.nwrp/metadata.json"
outside='5 of 11 frames lie outside .*\n  first: 5 frames, at most 0\.5 above \(100 % of its range\) in frame 11'
expect 0 "played(.|\n)*wave, strip, model wave: $outside\n.*no trained poses" '' play "$scene" --frames 1-11 --repeat 2
expect 0 '"framesOutside": 5,\s+"largestDistance": 1.0,\s+"controlsOutside": \[\s+\{\s+"name": "first"' '' \
  play "$scene" --frames 1-11 --json
expect 0 '' "wrote 11 frames.*\n.*$outside" bake "$scene" 'wave.outputGeom[0]' --frames 1-11 -o "$work/a.npy"
expect 0 '"framesOutside": 1' 'first: 1 frame, at most' render "$scene" --frames 11 -o "$work/a.png" --size 40x30 --json
expect 0 "trained on 80 frames(.|\n)*on 20 drawn poses .*at random.* 3\.25 mm at most\n(.|\n)*animation may be worse(.|\n)*$outside(.|\n)*warning: the rest mesh of strip is another" '' \
  info "$work/models/wave.nwrp" --scene "$scene" --frames 1-11
expect 0 '"certificate": \{(.|\n)*"maximum": 0.5(.|\n)*"frames": 6,\s+"framesOutside": 3' '' \
  info "$work/models/wave.nwrp" --scene "$scene" --frames 1-11x2 --json
expect 2 '' '--frames goes with --scene' info "$work/models/wave.nwrp" --frames 1
expect 0 'all 6 frames lie in the ranges' '' play "$scene" --frames 1-6
sed -i 's/"minima": .0,/"minima": [9,/' "$work/models/wave.nwrp/metadata.json"
expect 0 'its certificate is of no use: certificate: control 0 ranges from 9' '' play "$scene" --frames 1
sed -i 's/"certificate"/"other"/' "$work/models/wave.nwrp/metadata.json"

# why a network and a file of shapes were refused; nothing in a file reaches the terminal as a control character
cp "$work/models/wave.nwrp/model.onnx" "$work/models/wave.nwrp/principal_shapes.json" "$work"
echo 'no model' >"$work/models/wave.nwrp/model.onnx"
expect 1 '' 'No ML model initialized for index 0; .*wave\.nwrp/model\.onnx. cannot be used: the file is damaged' \
  play "$scene" --frames 1
mv "$work/model.onnx" "$work/models/wave.nwrp"
echo '[]' >"$work/models/wave.nwrp/principal_shapes.json"
why='Error: .*models/wave\.nwrp/principal_shapes\.json: it holds no JSON object\n'
for command in play "render -o $work/out.png" "bake wave.outputGeom[0] -o $work/out.npy"; do
  # shellcheck disable=SC2086
  set -- $command
  expect 1 '' "$why(.|\n)*models/wave\.nwrp: principal_shapes\.json is damaged" "$1" "$scene" "${@:2}" --frames 1
done
expect 1 'damaged: principal_shapes' "$why" info "$work/models/wave.nwrp"
mv "$work/principal_shapes.json" "$work/models/wave.nwrp"
sed -i 's/"geometry": *"[^"]*"/"geometry": "\\u001b[31m\\u009bred"/' "$work/models/wave.nwrp/metadata.json"
expect 0 'of \\u001b\[31m\\u009bred\n' '' info "$work/models/wave.nwrp"
expect 1 '' '^[^\e]*quarn: [^\e]*\\u001b\[31mnone[^\e]*$' info $'\e[31mnone.json'

rm "$work/models/wave.nwrp/metadata.json"
echo 'no model' >"$work/models/wave.nwrp/model.onnx"
echo '[' >"$work/models/wave.nwrp/principal_shapes.json"
expect 1 'damaged: metadata(.|\n)*damaged: model\.onnx cannot be used(.|\n)*damaged: principal' 'is damaged' \
  info "$work/models/wave.nwrp"
expect 2 '' 'is no model directory' info "$scene" --scene "$scene"
exit $bad
