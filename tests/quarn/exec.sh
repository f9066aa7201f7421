#!/usr/bin/env bash
# exec.sh QUARN PLUGIN SCRIPT: exit codes of quarn, and what it writes to which stream.
set -euo pipefail
quarn=$1 plugin=$2 script=$3
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source tests/support/expect.sh

: >"$work/in"
expect 0 lift 'lift is one of mine' exec --plugin "$plugin" "$script"
diff "${script%/*}/expected.txt" "$work/out" || bad=1
expect 1 '' 'quarn: .*line 4: createNode: .*minimalRemap' exec "$script"
expect 1 '' 'plug-in .*/none\.so. cannot be loaded: there is no such file' exec --plugin /none.so "$script"
expect 1 '' 'none\.txt' exec /none.txt
expect 0 'exec (.|\n)*info ' '' --help
expect 0 '^quarn [0-9.]+\n$' '' --version

# a commit of this history, where there is one
if git -c safe.directory="$PWD" rev-parse HEAD &>/dev/null; then built='[0-9a-f]{12}\+?'; else built='\w+'; fi
expect 0 "^quarn [0-9.]+, built from $built\ninstruction set (scalar|AVX.*)\n$" '' info --build
commit=$(sed -nE 's/.*built from (\w+).*/\1/p' "$work/out")
[[ $built == '\w+' ]] || git -c safe.directory="$PWD" cat-file -e "$commit^{commit}" || bad=1
expect 0 "\"version\": \"[0-9.]+\",\n +\"build\": \"$commit\+?\",\n +\"instructionSet\": \"\w" '' info --build --json

echo 'createNode' >"$work/in"
expect 1 '' 'standard input, line 1: createNode' exec -
echo "createNode minimalRemap -name kept; file -saveAs $work/scene.json" >"$work/in"
expect 0 "kept\n$work/scene.json\n" '' exec --plugin "$plugin" -
: >"$work/in"
expect 0 '1 minimalRemap\n' '' info "$work/scene.json"
expect 0 '"minimalRemap": 1' '' info --json "$work/scene.json"
expect 1 '' 'quarn: .*none\.json' info /none.json

expect 0 'message \(msg\): (.|\n)*\ninputMax \(im\): double = 1; affects output\n' '' \
  listAttr --plugin "$plugin" minimalRemap
expect 0 '\n  weights \(wts\): array of float = 1, inherited; affects outputGeom\namount \(am\)' '' \
  listAttr --plugin "$plugin" minimalPush
expect 0 '^\[(.|\n)*"name": "inMesh",(.|\n)*"attribute": "outMesh",(.|\n)*\]\n$' '' listAttr --json mesh
expect 1 '' "quarn: there is no node type 'minimalRemap'" listAttr minimalRemap

# errors that are shown: the script goes on, or ends with --stop; try expects one
printf 'print a\ncreateNode minimalRemap -name r; disconnectAttr r.nope r.nope\n' >"$work/in"
expect 1 'r\n' 'info: a\nquarn: standard input, line 2: disconnectAttr' exec --plugin "$plugin" -
printf 'file -open examples/wave/wave.json; setAttr wave.models[0].modelName wade\n%s\n%s\n' \
  'meshInfo wave.outputGeom[0]' 'print on' >"$work/in"
shown='quarn: an error was shown in standard input, line 2: meshInfo: \[NEURAL WARP\] .*models/wade\.nwrp\n$'
expect 1 '369 vertices' "info: on\n$shown" exec -
expect 1 '369 vertices' "wade\.nwrp\n$shown" exec --stop -
sed -i 's/^mesh/try mesh/' "$work/in"
expect 0 'models/wade\.nwrp\n$' 'info: on\n$' exec -
echo 'try print a' >"$work/in"
expect 1 '' "line 1: try: no error came of 'print'" exec -

# networks may say how many threads they want, unless the user does not wish it; a path shows what is set
printf 'createNode pointCache -name c; setAttr c.cacheFile "/%s.npy"; meshInfo c.outMesh\n' \
  '$ORT_LOAD_CONFIG_FROM_MODEL' >"$work/in"
expect 1 'c\n' "'/1\.npy'" exec -
export ORT_LOAD_CONFIG_FROM_MODEL=0
expect 1 'c\n' "'/0\.npy'" exec -
export ORT_LOAD_CONFIG_FROM_MODEL=2
expect 1 '' '^quarn: the environment variable ORT_LOAD_CONFIG_FROM_MODEL is "2", and may only be 0 or 1\n$' exec -
unset ORT_LOAD_CONFIG_FROM_MODEL

# a scene that cannot be read is said once
for command in info play 'render -o x.png'; do
  # shellcheck disable=SC2086 # words
  expect 1 '' '^quarn: .*nothing\.json: does not exist\n$' $command nothing.json
done
expect 1 '' 'quarn import arm\.glb -o arm\.json makes a scene of it' info arm.glb
expect 2 '' 'there is no command "dance"; there are import, ' dance

# neither of these is a call: 2, and the answer is on standard error
for arguments in "" "exec" "exec --plugin" "listAttr"; do
  # shellcheck disable=SC2086 # words
  expect 2 '' . $arguments
done
exit $bad
