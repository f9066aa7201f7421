#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# run.sh QUARN: quarn run on a triangle that a joint moves, as far as no trainer is needed: what it leaves for a tool,
# that it goes on where it was, whatever ended it, and what it does not take.
set -euo pipefail
quarn=$(realpath "$1")
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
. "$(dirname "$0")/../../support/expect.sh"
cp tests/fuzz/corpus/fuzz_gltf/accepted_text "$work/bone.gltf"
cd "$work"
options=(--import-option=--with-roots --samples 6 --held-out 3)
# targets are the skin, 0.1 higher: frames are asked for in parts, and nothing says whether that is the first run
cat >lift.sh <<'SCRIPT'
set -e
field() { sed -n "s/.*\"$1\": \"\(.*\)\".*/\1/p" "$request"; }
request=$1
echo "asked for $(tr -d ' \n' <"$request" | grep -o '"frames":[^]]*]')"
[ ! -e "$(dirname "$0")/wait" ] || { echo waiting; exec sleep 1000; }
[ -e "$(dirname "$0")/go" ] || { echo "not yet"; exit 5; }
# the file of the skin is what is to be written, as long as all is asked for
sed -n '/"skin"/,/}/s/.*"file": "\(.*\)",/\1/p' "$request" | xargs -I{} cp {} "$(field write)"
SCRIPT
with_targets=("${options[@]}" --target-command sh lift.sh)

# --- to the poses, and no further ---
expect 0 'then the same command goes on, with --targets FILE added' 'skin +\d+\.\d s\n$' \
  run bone.gltf -o made "${options[@]}"
expect 0 'targets are shaped alike' '^4 of 4 steps were done already\n$' run bone.gltf -o made "${options[@]}"
[[ -s made/poses.glb && -s made/limits.json && -n $(find made/data -name poses_skin.npy) && ! -e made/lock ]] ||
  fail "not what a tool needs"
others='its arguments are others: --samples 11, was --samples 9'
expect 0 "import: done\nposes: to do, as $others\nrest: done\nskin: done, but" '' \
  run bone.gltf -o made --import-option=--with-roots --samples 8 --held-out 3 --explain

# state FOLDER PATTERN: what the run's progress.json says, on one line
state() { tr -d ' \n' <"$1/progress.json" | grep -qE "$2" || fail "$1 says of its progress: $(cat "$1/progress.json")"; }
state made '"state":"done","error":"","step":"skin","number":4,"of":4,'

# --- a target command that fails, is killed, and works ---
said='  \| asked for "frames":\[1,.*,9\]\n  \| not yet\n'
expect 1 '' "targets ended with status 5\n${said}all that it said is in .*/made/log/targets\.log" \
  run bone.gltf -o made "${with_targets[@]}"
state made '"state":"failed","error":"targetsendedwithstatus5.*,"step":"targets","number":5,'
# interrupt SIGNAL: while the command is at work; the status goes to $status
interrupt() {
  touch wait
  rm -f made/log/targets.log
  "$quarn" run bone.gltf -o made "${with_targets[@]}" >said.txt 2>errors.txt &
  local process=$!
  for ((i = 0; i < 1200; ++i)); do ! grep -qs waiting made/log/targets.log || break; sleep 0.05; done
  expect 75 '' 'another quarn run is writing .*/made; wait' run bone.gltf -o made "${options[@]}"
  kill "-$1" "$process"
  status=0
  wait "$process" 2>wait.txt || status=$?
  rm wait
}
# what the program says with its status is passed on
echo 'exit 75' >later.sh
expect 75 '' "targets ended with status 75" run bone.gltf -o made "${options[@]}" --target-command sh later.sh
interrupt TERM
[[ $status == 143 ]] && grep -q 'what was done before targets is kept .*: the same command goes on' errors.txt ||
  { fail "interrupted: status $status"; cat errors.txt; }
state made '"state":"interrupted","error":"","step":"targets"'
interrupt KILL
state made '"process":[0-9]+,"state":"running"' # and there is no such process
touch go
expect 0 '' 'targets +\d.*\ntarget .*\n(  the targets are 0 mm .*\n)?export .*\nheld-out .*\n4 of 8 steps were done' \
  run bone.gltf -o made --until held-out "${with_targets[@]}"
[[ ! -e made/scratch && -s $(find made/data -name dataset.json | head -n 1) ]] ||
  fail "no data set, or a scratch folder"

# --- on a terminal the line of a step counts, and the run's progress always: what its log says last ---
cat >count.sh <<SCRIPT
printf '10 of 30\n20 of 30\n'
for i in \$(seq 300); do
  ! { grep -q '20 of 30' "$work/terminal" && grep -q '"done": 20' "$work/counted/progress.json"; } || exit 7
  sleep 0.1
done
SCRIPT
counted="'$quarn' run bone.gltf -o counted ${options[*]} --target-command sh count.sh"
! script -qfec "$counted" terminal >/dev/null </dev/null || fail "a target command that fails is taken"
grep -q 'targets ended with status 7' terminal || fail "the line does not count: $(cat terminal)"

# --- nothing twice; what is spoiled, and what follows from a change, again ---
expect 0 '' '^8 of 8 steps were done already\n$' run bone.gltf -o made --until held-out "${with_targets[@]}"
skin=$(find made/data -name poses_skin.npy)
cp "$skin" cache.npy
echo spoiled >"$skin"
why='\s*"done": true,\s*"why":'
expect 0 '"skin",'"$why"' "its output .*_skin\.npy has changed"(.|\n)*"targets",'"$why"' ""' \
  '^skin .*\n7 of 8' run bone.gltf -o made --until held-out --json "${with_targets[@]}"
echo '# changed' >>lift.sh
expect 0 '' '^targets .*\n7 of 8' run bone.gltf -o made --until held-out "${with_targets[@]}"
mv made moved
expect 0 '' '^8 of 8 steps were done already\n$' run bone.gltf -o moved --until held-out "${with_targets[@]}"

# --- limits: the run's own until somebody edits them, and then taken as they are, until they are gone ---
limited=(run bone.gltf -o limited --until poses --import-option=--with-roots --samples 6)
wider=("${limited[@]}" --import-option=--limits-margin=0.5)
turns() { "$quarn" info limited/character.json --joints | grep -o 'rotateZ [^;]*'; }
expect 0 '' '\nposes' "${limited[@]}"
expect 0 '' '^import .*\n' "${wider[@]}" # what it has written is in nobody's way
sed -i 's/-270\.0/-12.5.5/' limited/limits.json
expect 0 'import: to do, as limits\.json, which it had made, was edited' '' "${wider[@]}" --explain
expect 1 '' 'limits\.json: line' "${wider[@]}"
sed -i 's/12\.5\.5/12.5/' limited/limits.json
expect 0 '' '^import .*\n(.*\n)*poses' "${wider[@]}"
[[ $(turns) == 'rotateZ -12.5 to 90 degrees' ]] || fail "not the limits that were edited: $(turns)"
expect 0 '' '^2 of 2 steps were done already' "${wider[@]}"
rm limited/limits.json
expect 0 '' '^import .*\n(.*\n)*poses' "${limited[@]}"
[[ $(turns) == 'rotateZ -180 to 0 degrees' && -s limited/limits.json ]] || fail "not its own limits: $(turns)"

# --- targets in a file, from a recipe ---
mkdir recipes
cat >recipes/bone.json <<'RECIPE'
{"character": "../bone.gltf", "import-option": "--with-roots", "samples": 6, "held-out": 3, "targets": "../cache.npy"}
RECIPE
expect 0 '' 'target .*\n(.|\n)*held-out .*s\n$' run --recipe recipes/bone.json -o file --until held-out
sed 's|"targets": .*|"target-command": ["true"]}|' recipes/bone.json >recipes/command.json
expect 1 '' 'command\.json would start a program .*: --allow-commands lets it' run --recipe recipes/command.json -o file
expect 1 '' 'targets ended with status 0, and has not written the file' \
  run --recipe recipes/command.json -o other --allow-commands

# --- a skin in a file: what is learned on, and compared with; it counts as targets do ---
cp cache.npy dual.npy
skinned=(run --recipe recipes/bone.json --skin dual.npy --until held-out -o skinned)
expect 0 '' 'target .*\n(  the skin is .*)?(.|\n)*held-out .*s\n$' "${skinned[@]}"
expect 0 'mesh\): .* skin .*dual\.npy, ' '' info skinned/poses.mesh.json
expect 0 '' '^7 of 7 steps were done already\n$' "${skinned[@]}"
cp moved/data/mesh/rest.npy dual.npy
expect 0 'target: to do, as its input .*/dual\.npy has changed' '' "${skinned[@]}" --explain
expect 1 '' 'target ended with status 1\n(.|\n)*the skin is at rest in all of them' "${skinned[@]}"

# --- targets in a file a frame: each of them counts ---
expect 0 '' 'wrote 9 frames' bake moved/poses.mesh.json mesh_target.outMesh --frames 1-9 -o 'seq.##.obj' \
  --progress baked.json
tr -d ' \n' <baked.json | grep -q '^{"what":"[^"]*","done":9,"total":9,"seconds":[^,]*,"secondsLeft":0.0}$' ||
  fail "not all frames are done: $(cat baked.json)"
expect 1 '' 'none/baked\.json' bake moved/poses.mesh.json mesh_target.outMesh --frames 1-9 -o other.npy \
  --progress /proc/none/baked.json
sequence=(run bone.gltf -o sequence "${options[@]}" --targets 'seq.##.obj' --until target)
expect 0 '' 'target .*s\n(.|\n)*' "${sequence[@]}"
expect 0 '' '^5 of 5 steps were done already\n$' "${sequence[@]}"
sed -i '0,/^v /s/^v .*/v 0 0 0.25/' seq.05.obj
expect 0 'target: to do, as its input .*seq\.##\.obj' '' "${sequence[@]}" --explain
mv seq.05.obj away.obj
expect 1 '' 'of its frames 1-9 there are no files of 5\n' "${sequence[@]}"

# --- two meshes: a model each, for those that have targets ---
sed -e 's/"nodes":\[0,2\]/"nodes":[0,2,3]/' -e 's/{"mesh":0,"skin":0}/&,{"name":"other","mesh":0,"skin":0}/' \
  bone.gltf >two.gltf
expect 0 '' 'targets mesh +\d(.|\n)*targets other(.|\n)*held-out mesh .*\nheld-out other' \
  run two.gltf -o two --until held-out "${with_targets[@]}"
expect 0 '' 'target other .*\n(  .*\n)?export other .*\nheld-out other .*\nmesh has no targets, and gets no model\n$' \
  run two.gltf -o one --until held-out "${options[@]}" --targets other=cache.npy
expect 1 '' 'several meshes, mesh, other: whose targets are in .*cache\.npy\? Give them as MESH=FILE' \
  run two.gltf -o one "${options[@]}" --targets cache.npy

# --- what is not taken ---
touch mine
expect 1 '' 'is not empty \(' run bone.gltf -o .
expect 2 '' 'there is no step "trian"; steps are import, ' run bone.gltf -o made --until trian
expect 2 '' '--target-command needs a program' run bone.gltf -o made --target-command
expect 2 '' 'samples is 1, not a whole number' run bone.gltf -o made --samples 1
expect 1 '' 'none\.glb, which import needs, is not there' run none.glb -o none
[[ ! -e none/run.json ]] || fail "a run of nothing"
exit $bad
