# ./run fuzz [seconds]: sourced by ./run, whose functions it uses.

fuzz_work=build/fuzz/work

# what the presets give to CTest's tests; libFuzzer looks for leaks too
export LSAN_OPTIONS="suppressions='$PWD/tests/sanitizers/lsan.supp':print_suppressions=0"
export UBSAN_OPTIONS=print_stacktrace=1 PATH=$PATH:/usr/lib/llvm-14/bin

# Fuzzes one target on a copy of its corpus, so that what it finds stays in the build tree.
fuzz_target() {
  local program=$1 seconds=$2 name=${1##*/}
  local work=$PWD/$fuzz_work/$name
  local corpus=tests/fuzz/corpus/$name
  [[ -d $corpus ]] || corpus=tests/fuzz/corpus/${name#fuzz_}
  mkdir -p "$work/corpus" "$work/artifacts"
  if [[ -d $corpus ]]; then cp -r "$corpus/." "$work/corpus/"; fi
  "$program" "$work/corpus" -max_total_time="$seconds" -rss_limit_mb=2048 -timeout=25 -print_final_stats=1 \
    -artifact_prefix="$work/artifacts/" >"$work/log" 2>&1 </dev/null
}

# The edge coverage that libFuzzer prints on its first line after reading the corpus, and on its last.
coverage_of() {
  sed -n "s/.*[[:space:]]$2[[:space:]]*cov: \([0-9]*\).*/\1/p" "$1" | tail -n 1
}

report_target() {
  local name=$1 status=$2 log=$fuzz_work/$1/log
  local start end runs
  start=$(coverage_of "$log" INITED)
  end=$(coverage_of "$log" DONE)
  runs=$(sed -n 's/^stat::number_of_executed_units: *//p' "$log")
  printf '%-32s edges at start %6s, at end %6s, runs %10s: %s\n' "$name" "${start:--}" "${end:--}" "${runs:--}" \
    "$([[ $status == 0 ]] && printf 'nothing found' || printf 'FOUND SOMETHING')"
  [[ $status == 0 ]] && return 0
  tail -n 60 "$log"
  find "$fuzz_work/$name/artifacts" -type f -printf 'input: %p\n'
  return 1
}

command_fuzz() {
  local seconds=${1:-60} program failed=0
  [[ $seconds =~ ^[1-9][0-9]*$ ]] || usage_error "fuzz takes a number of seconds, not '$seconds'"
  build fuzz
  rm -rf "$fuzz_work"

  local programs=() names=() pids=()
  for program in build/fuzz/tests/fuzz/fuzz_*; do
    if [[ -f $program && -x $program ]]; then programs+=("$program"); fi
  done
  ((${#programs[@]})) || fail "there is no fuzz target in build/fuzz/tests/fuzz yet"

  local i j status at_once=2
  (($(job_count) > 1)) || at_once=1
  say "fuzzing ${#programs[@]} targets for $seconds s each, $at_once at a time"
  for ((i = 0; i < ${#programs[@]}; i += at_once)); do
    names=() pids=()
    for program in "${programs[@]:i:at_once}"; do
      fuzz_target "$program" "$seconds" &
      pids+=($!) names+=("${program##*/}")
    done
    for j in "${!pids[@]}"; do
      status=0
      wait "${pids[j]}" || status=$?
      report_target "${names[j]}" "$status" || failed=1
    done
  done
  return $failed
}
