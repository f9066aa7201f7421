#!/usr/bin/env bash
# telemetry.sh ROOT QUARN HOST TESTS: the network runtime leaves nothing behind, in none of our processes and in none
# of a host that is not ours: QUARN, HOST (which has no network of its own and loads the plug-in), and TESTS (which
# links the model library) each load a network and run it.
set -euo pipefail
cd "$1"
quarn=$2 host=$3 tests=$4
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
mkdir "$work/scene"
. tests/support/movingWave.sh
moving_wave "$quarn" "$work/scene" </dev/null

failed=0
complain() {
  printf '%s\n' "$*" >&2
  failed=1
}

# leaves_nothing NAME TEMPORARY COMMAND...: in empty folders, as somebody who has never heard of the variable; TEMPORARY
# is what env does with TMPDIR
leaves_nothing() {
  local name=$1 temporary=$2 pid left
  shift 2
  rm -rf "$work/user"
  mkdir -p "$work/user/home" "$work/user/tmp" "$work/user/here"
  # shellcheck disable=SC2086
  (cd "$work/user/here" && exec env -u ORT_DISABLE_TELEMETRY -u XDG_CACHE_HOME $temporary \
    HOME="$work/user/home" "$@") >"$work/out" 2>&1 &
  pid=$!
  wait "$pid" || complain "$name failed: $(tail -n 5 "$work/out")"
  left=$(find "$work/user" ! -type d)
  [ -z "$left" ] || complain "$name left behind: $left"
  left=$(find /tmp -maxdepth 1 -name "*-$pid.log")
  [ -z "$left" ] || complain "$name left behind: $left"
}

for temporary in "TMPDIR=$work/user/tmp" "-u TMPDIR"; do
  leaves_nothing "quarn play" "$temporary" "$quarn" play "$work/scene/moving.json"
  leaves_nothing "quarn info" "$temporary" "$quarn" info "$work/scene/models/wave.nwrp"
  leaves_nothing "a host" "$temporary" "$host"
  leaves_nothing "tests of the library" "$temporary" "$tests" --gtest_filter='ModelSessionRun.*-*.SessionsRunSideBySide'
done
exit "$failed"
