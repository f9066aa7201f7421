#!/usr/bin/env bash
# exit_codes.sh QUARN: what a process of quarn ends with that another one is in the way of, or that is asked to end; and
# that what it leaves is for the group as well, where the umask says so.
set -euo pipefail
source tests/support/movingWave.sh
quarn=$(realpath "$1")
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source tests/support/expect.sh
umask 002
moving_wave "$quarn" "$work" <<<'connectAttr strip.outMesh wave.targetGeometry[0]; file -saveAs moving.json'
cd "$work"

# begin PATTERN ARGS...: starts quarn, until a file of that pattern, or one that will be whole, is there; it is $!
begin() {
  local pattern=$1 i
  shift
  "$quarn" "$@" >out 2>err &
  for ((i = 0; i < 1200; ++i)); do
    [[ ! $(compgen -G "$pattern"; compgen -G '.whole-*') ]] && kill -0 $! || return 0
    sleep 0.05
  done
}
# ends SIGNAL STATUS: it does so, and says that it was interrupted
ends() {
  local status=0
  kill "-$1" $!
  wait $! || status=$?
  [[ $status == "$2" ]] && grep -q '^quarn: interrupted$' err || fail "SIG$1: status $status, not $2"
}

begin 'set.part/deltas.npy' export moving.json --frames 1-400000 -o set
expect 75 '' 'quarn: another quarn export is writing .*/set\.part; wait until it is done\n$' \
  export moving.json --frames 1-400000 -o set
ends TERM 143
expect 1 '' 'was begun with another set-up' export moving.json --frames 1-4 -o set
begin 'set.part/lock' export moving.json --frames 1-400000 -o set
ends INT 130
for command in 'play moving.json' 'bake moving.json strip.outMesh'; do
  # shellcheck disable=SC2086 # words
  begin 'long.npy.part/*' $command --frames 1-400000 -o long.npy
  ends TERM 143
done

mkdir group
cd group
for command in 'export ../moving.json -o set' 'play ../moving.json -o deep/played.npy --log log' \
  'play ../moving.json -o mesh.####.obj' 'render ../moving.json -o picture.png --size 40x30' \
  'bake ../moving.json strip.outMesh -o a.npz'; do
  # shellcheck disable=SC2086 # words
  "$quarn" $command --frames 1-4 >../out 2>../err || fail "$command: status $?"
done
left=$(find . ! -perm -g=w)
[[ ! $left ]] || fail "not for the group: $left"
exit $bad
