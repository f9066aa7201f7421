#!/usr/bin/env bash
# report.sh QUARN: a report on the example scene, whose target lies on the way from its skin to what the deformer makes.
set -euo pipefail
source tests/support/movingWave.sh
quarn=$1
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source tests/support/expect.sh
export NEURALWARP_VIEWER=$work/none.html # no template: the report does without the page, and says so

# two joints that do not move share each vertex: the left one has more of those with even numbers
repeated() { for ((i = 0; i < $1; ++i)); do printf '%s ' "${@:2}"; done; }
moving_wave "$quarn" "$work" <<EOF
createNode joint -name left
createNode joint -name right
createNode skinCluster -name skin
connectAttr left.worldMatrix skin.matrix[0]
connectAttr right.worldMatrix skin.matrix[1]
setAttr skin.skin[0].influenceCounts $(repeated 369 2)
setAttr skin.skin[0].influences $(repeated 369 0 1)
setAttr skin.skin[0].skinWeights $(repeated 184 0.7 0.3 0.3 0.7) 0.7 0.3
connectAttr strip.outMesh skin.input[0].inputGeometry
disconnectAttr strip.outMesh wave.input[0].inputGeometry
connectAttr skin.outputGeom[0] wave.input[0].inputGeometry
createNode pointCache -name toward
connectAttr strip.outMesh toward.inMesh
connectAttr time1.outTime toward.time
setAttr toward.cacheFile target.npy
connectAttr toward.outMesh wave.targetGeometry[0]
file -saveAs aimed.json
setAttr wave.models[0].modelActive 0
setAttr wave.modelRoot nowhere
file -saveAs untrained.json
EOF
scene=$work/aimed.json
for plug in strip.outMesh 'wave.outputGeom[0]'; do
  "$quarn" bake "$work/moving.json" "$plug" --frames 1-11 -o "$work/${plug%%.*}.npy" -q
done
python3 tests/quarn/report/checkReport.py make "$work"
mkdir "$work/training"
printf '{"epochs": 3, "bestEpoch": 2, "seed": 7, "seconds": 65, "versions": {"trainer": "9.8"}, "settings": {"neurons": 32}}' \
  >"$work/training/report.json"
printf 'epoch,training,validation\n1,0.5,0.6\n2,0.25,0.3\n3,0.2,0.4\n' >"$work/training/losses.csv"

# figures, files, and what is to be sent: against other arithmetic and a foreign parser
name='<b onload>&"wave' title='</script><b onload="x">a wave'
expect 0 'takes away 75 % of the error at .* worst 80 mm at (left|right) \(vertex .*\), frame 11\.' "There is no page .*none\.html" \
  report "$name=$scene" -o "$work/made/deep" --frames 1-11 --training "$work/training" --limit-mean 30% --limit-max 70mm \
  --pictures 2 --title "$title"
"$quarn" play "$scene" --frames 1-11 --against target --json >"$work/played.json"
python3 tests/quarn/report/checkReport.py check "$work" "$work/made/deep" "$name" "$title"
expect 0 '"kept": false' '' report "$scene" -o "$work/made" --frames 1-11 --limit-max 70mm --pictures 0 --no-viewer --json
expect 1 'report ' 'more is left than asked for. aimed: Limits not kept: largest 80 mm \(70 mm allowed\)' \
  report "$scene" -o "$work/made" --frames 1-11 --limit-max 70mm --pictures 0 --no-viewer --judge
grep -q 'Limits not kept' "$work/made/report.html" || fail "what is judged is not written"
expect 0 'Limits kept: mean 25 %' '' \
  report a="$scene" b="$scene" -o "$work/made" --frames 1-3 --limit-mean 26% --pictures 0 --no-viewer --judge --poses

# refused before anything is measured, by name
expect 1 '' 'nothing/report\.json' report "$scene" -o "$work/lost" --training "$work/nothing"
expect 1 '' 'report\.json is no answer of trainer evaluate' report "$scene" -o "$work/lost" --evaluate "$work/training/report.json"
expect 1 '' 'moving\.json: strip has no target' report "$work/moving.json" -o "$work/lost"
expect 1 '' 'untrained\.json: the model of wave is off' report "$work/untrained.json" -o "$work/lost"
expect 2 '' 'two rows are called "aimed"' report "$scene" "$scene" -o "$work/lost"
[[ ! -e $work/lost ]] || fail "a report of nothing"
exit $bad
