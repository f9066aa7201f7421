#!/usr/bin/env bash
# exec.sh QUARN PLUGIN SCRIPT: exit codes of quarn, and what it writes to which stream.
set -euo pipefail
quarn=$1 plugin=$2 script=$3
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
bad=0

# expect STATUS OUT-PATTERN ERR-PATTERN ARGS...: patterns are regular expressions, "" for an empty stream
expect() {
  local status=0 wanted=$1 out=$2 err=$3
  shift 3
  "$quarn" "$@" >"$work/out" 2>"$work/err" <"$work/in" || status=$?
  if [[ $status != "$wanted" ]] || ! fits "$out" "$work/out" || ! fits "$err" "$work/err"; then
    printf 'quarn %s: status %s, not %s, or the streams do not fit /%s/ and /%s/:\n' "$*" "$status" "$wanted" "$out" "$err"
    cat "$work/out" "$work/err"
    bad=1
  fi
}
fits() { if [[ $1 ]]; then grep -Pqz -- "$1" "$2"; else [[ ! -s $2 ]]; fi; }

: >"$work/in"
expect 0 '^lift\n0\.2\npush\n0\.4\n2\n$' 'lift is one of mine' exec --plugin "$plugin" "$script"
expect 1 '' 'quarn: .*line 4: createNode: .*minimalRemap' exec "$script"
expect 1 '' 'plug-in .*/none\.so. cannot be loaded: there is no such file' exec --plugin /none.so "$script"
expect 1 '' 'none\.txt' exec /none.txt
expect 0 'exec (.|\n)*info ' '' --help
expect 0 '^quarn [0-9.]+\n$' '' --version

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

# neither of these is a call: not 0, and the answer is on standard error
for arguments in "" "exec" "dance" "exec --plugin" "listAttr"; do
  # shellcheck disable=SC2086 # words
  if "$quarn" $arguments >"$work/out" 2>"$work/err" || [[ -s $work/out || ! -s $work/err ]]; then
    printf 'quarn %s: no failure, or not on standard error alone\n' "$arguments"
    bad=1
  fi
done
exit $bad
