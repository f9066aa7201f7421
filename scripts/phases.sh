# shellcheck shell=bash
# The phases of a long command: each runs whatever the others said, its output is shown and kept in build/phases/NAME.log,
# and the command closes with where the time went and with what failed. Sourced by .ci/run and ./run check, which both
# set pipefail.
#
# The rows of the table are in a file, which a command that runs others hands on to them: name, seconds, verdict.
phase_folder=$PWD/build/phases
phase_rows=${NW_PHASE_ROWS:-$phase_folder/rows}
phase_status=0

# begin_phases: what an earlier command left is none of this one's, unless that one runs this
begin_phases() {
  mkdir -p "$phase_folder"
  [[ ${NW_PHASE_ROWS:-} ]] || rm -f "$phase_folder"/*
  touch "$phase_rows"
}

# phase NAME COMMAND...: runs it in a shell of its own; sets phase_status to what it ended with
phase() {
  local name=$1 start=$SECONDS verdict=passed log=$phase_folder/$1.log
  shift
  phase_status=0
  printf '%s\n' "$name" >"$phase_folder/running"
  # in the background, because `set -e` has no effect on what stands left of `||`
  ( (set -e && "$@") 2>&1 | tee "$log") &
  wait $! || phase_status=$?
  ((phase_status == 0)) || verdict=FAILED
  rm -f "$phase_folder/running"
  printf '%s\t%d\t%s\n' "$name" $((SECONDS - start)) "$verdict" >>"$phase_rows"
}

failed_phases() { awk -F '\t' '$3 != "passed" { print $1 }' "$phase_rows"; }

# what CTest says of all tests of a log, and which of them were skipped
tests_of_log() {
  sed -nE 's/^([0-9]+% tests passed.*)/\1/p; s/^[ \t]*[0-9]+ - (.*) \(Skipped\)$/skipped: \1/p' "$1" | paste -s -d ';' | sed 's/;/; /g'
}

phase_table() {
  local name seconds verdict
  while IFS=$'\t' read -r name seconds verdict; do
    printf '%-16s %5d s  %-6s  %s\n' "$name" "$seconds" "$verdict" "$(tests_of_log "$phase_folder/$name.log")"
  done <"$phase_rows"
}

slowest_tests() {
  local log
  for log in "$phase_folder"/*-tests.log; do
    [[ -e $log ]] || continue
    sed -nE "s/^ *[0-9]+\/[0-9]+ Test +#[0-9]+: ([^ ]+) .* ([0-9.]+) sec *$/\2 $(basename "$log" .log) \1/p" "$log"
  done | sort -rn | sed -n "1,$1p" | while read -r seconds phase test; do
    printf '%7.1f s  %-16s %s\n' "$seconds" "$phase" "$test"
  done
}

# what_failed LOG: of a log of tests what those say that failed, of one of a build the units that failed, of others the end
what_failed() {
  local found
  found=$(awk '
    /^ *Start +[0-9]+: / || /^\[[0-9]+\/[0-9]+\] / || /^[0-9]+% tests passed/ { shown = 0 }
    /^ *[0-9]+\/[0-9]+ Test +#[0-9]+: / { shown = /\*\*\*/ && !/\*\*\*Skipped/ ? 30 : 0 }
    /^FAILED: / { shown = 30 }
    /^The following tests FAILED:/ { shown = 30 }
    shown-- > 0 { print }' "$1" | tail -n 120)
  if [[ $found ]]; then printf '%s\n' "$found"; else tail -n 30 "$1"; fi | cut -c 1-300
}

# close_phases COMMAND: says the table, what failed with the last that it said, and, as the last line, the verdict; its status
# is 1 when a phase failed or did not end. Of a command that another one runs, that one says it.
close_phases() {
  local name failed
  if [[ ${NW_PHASE_ROWS:-} ]]; then
    [[ ! $(failed_phases) ]]
    return
  fi
  if [[ -e $phase_folder/running ]]; then
    name=$(<"$phase_folder/running")
    printf '%s\t%d\tdid not end\n' "$name" $(($(date +%s) - $(stat -c %Y "$phase_folder/running"))) >>"$phase_rows"
  fi
  say "$1: seconds per phase"
  phase_table
  if compgen -G "$phase_folder/*-tests.log" >/dev/null; then
    say "$1: the slowest tests"
    slowest_tests 10
  fi
  mapfile -t failed < <(failed_phases)
  for name in "${failed[@]}"; do
    say "$1: what failed in $name (all of it: build/phases/$name.log)"
    what_failed "$phase_folder/$name.log"
  done
  if ((${#failed[@]})); then
    say "$1: FAILED in ${failed[*]}, after $SECONDS s"
    return 1
  fi
  say "$1: passed, in $SECONDS s"
}
