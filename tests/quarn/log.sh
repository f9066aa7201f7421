#!/usr/bin/env bash
# log.sh QUARN: what --verbose and --log say of every command, and where they may not write.
set -euo pipefail
source tests/support/movingWave.sh
quarn=$(realpath "$1")
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
bad=0

moving_wave "$quarn" "$work" </dev/null
cp tests/fuzz/corpus/fuzz_gltf/accepted_text "$work/bone.gltf"
cd "$work"
echo 'createNode mesh' >script.txt
unset NEURALWARP_PLUGIN

fail() { printf '%s\n' "$*"; head -n 40 out err log 2>/dev/null || true; bad=1; }
# each pattern is found in some line of the file
has() { local file=$1 pattern; shift; for pattern in "$@"; do grep -Pq -- "$pattern" "$file" || return 1; done; }
stamps='^ *\d+\.\d{3} s  '

# says ARGS... -- PATTERN...: the command says so in its log, and on standard error, and answers as it does without
says() {
  local plugin="$stamps"'loading plug-in .*neuralWarp\.so: neuralWarp [\d.]+, \d+ node types, [\d.]+ ms$'
  local -a command=() patterns=("$plugin")
  while [[ $1 != -- ]]; do command+=("$1") && shift; done
  shift
  [[ (${command[0]} == info && ${command[1]} != *.json) || ${command[0]} == run ]] && patterns=()
  patterns+=("$stamps"'quarn [\d.]+, built from \w+\+?, instruction set (scalar|AVX\S*)$')
  patterns+=("${@/#/$stamps}" "$stamps"'done$')
  rm -f log
  "$quarn" "${command[@]}" >plain 2>err || fail "quarn ${command[*]}: failed"
  "$quarn" "${command[@]}" --log log >out 2>err || fail "quarn ${command[*]} --log: failed"
  cmp -s plain out || [[ ${command[0]} == play ]] || fail "quarn ${command[*]} --log: another answer"
  has log "^quarn log, 20\d\d-.*Z: .*quarn ${command[0]} .* --log log$" "${patterns[@]}" ||
    fail "quarn ${command[*]} --log: not ${patterns[*]}"
  "$quarn" "${command[@]}" --verbose >out 2>err || fail "quarn ${command[*]} --verbose: failed"
  has err "${patterns[@]}" || fail "quarn ${command[*]} --verbose: not ${patterns[*]}"
  ! has out "$stamps" || fail "quarn ${command[*]} --verbose: lines in the answer"
}
opens() { echo "opening scene .*/$1: \\d+ nodes, [\\d.]+ ms\$"; }

says import bone.gltf -o bone.json --neural-warp --with-roots --json -- \
  'reading character .*bone\.gltf: 1 meshes, \d+ joints, .*ms$' 'writing .*\.vertices\.npy' 'saving scene .*/bone\.json: [\d.]+ ms$'
says pose bone.json -o posed.json --samples 3 -- "$(opens bone.json)" 'sampling poses for \w+: 3 poses of \d+ values, '
says bake moving.json 'strip.outMesh' --frames 1-3 -o target.npy -- "$(opens moving.json)" \
  'playing strip\.outMesh: 3 frames, 1 times, ' 'frame 2: \d+ plugs of \d+ nodes computed, [\d.]+ ms$'
says target moving.json --cache target.npy -o aimed.json --json -- 'reading point cache .*target\.npy for strip: '
says export aimed.json --frames 1-3 -o data --overwrite --json -- 'exporting strip to .*/data: 3 rows, ' 'frame 3: '
says play moving.json --frames 1-3 --json -- 'frame 1: \d+ plugs of \d+ nodes computed, 1 model loaded, [\d.]+ ms$' \
  'wave applies the model models/wave\.nwrp to strip: ' 'deformers run on the cpu$'
says render moving.json --size 16x16 -o picture.png --json -- 'looking at the frames: ' 'drawing .*/picture\.png: '
says info moving.json --json -- 'looking into scene moving\.json: ' "$(opens moving.json)"
says info models/wave.nwrp -- 'reading model .*/wave\.nwrp in a process apart: 0 problems, [\d.]+ ms$'
says info --devices --json -- '\d+ OpenCL devices$'
says listAttr neuralWarp -- 'neuralWarp has \d+ attributes$'
says run bone.gltf -o ran --import-option=--with-roots --samples 3 --held-out 3 -- 'skin was done already$'
says exec script.txt -- 'running script\.txt: [\d.]+ ms$'

# what fell back, and why
rm log
OCL_ICD_VENDORS=$work/none "$quarn" play moving.json --frames 1-3 --evaluator gpu --log log >out 2>err
has log 'warning: deformers are evaluated on the CPU: no OpenCL device' \
  'no device: 0 deformations there, 3 on the CPU, 2 of them after a failure' || fail "no reason for the CPU"

# refused STATUS SENTENCE LOG...: and what was there stays
refused() {
  local wanted=$1 sentence=$2 status=0
  shift 2
  cp moving.json before
  "$quarn" exec script.txt --log "$@" >out 2>err || status=$?
  [[ $status == "$wanted" && ! -s out ]] && has err "$sentence" && cmp before moving.json || fail "--log $*: $status"
}
refused 1 'moving\.json is there already and is another kind of file' moving.json
refused 1 'models could not be written: Is a directory' models
refused 1 '/dev/full could not be written: it is a device' /dev/full
refused 1 '/dev/stdout is standard output' /dev/stdout
refused 1 'out is standard output' out
refused 1 'script\.txt/log could not be written' script.txt/log
status=0
"$quarn" play moving.json --quiet --verbose >out 2>err || status=$?
[[ $status == 2 ]] && has err '--verbose.*--quiet|--quiet.*--verbose' || fail "--quiet goes with --verbose"

# what fails is in it; later runs stand behind earlier ones; a name is no line of its own, and moves no cursor
name=$'none\n   0.000 s  done\e[2J.json'
for _ in 1 2; do "$quarn" play "$name" --log made/log >out 2>err && fail "opened nothing"; done
has made/log "$stamps"'failed with 1: .*none\\n   0\.000 s  done\\u001b\[2J\.json' &&
  [[ $(grep -c '^quarn log, ' made/log) == 2 && $(grep -Pc "$stamps"'done' made/log) == 0 ]] || fail "$(cat made/log)"

# and a run that is killed has left what it did so far
rm log
mkfifo pipe
"$quarn" exec - --log log <pipe & child=$!
exec 3>pipe
until has log 'running -$' 2>/dev/null; do sleep 0.1; done
kill -KILL $child
exec 3>&-
wait $child 2>/dev/null || true
has log 'running -$' || fail "the log went with the run"
exit $bad
