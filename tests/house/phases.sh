#!/usr/bin/env bash
# phases.sh ROOT: how .ci/run closes, whatever happens in it: here with a ./run that only does what a word of it says.
set -euo pipefail
root=$1
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
mkdir -p "$work/.ci" "$work/scripts"
cp "$root/.ci/run" "$work/.ci"
cp "$root/scripts/common.sh" "$root/scripts/phases.sh" "$work/scripts"
cat >"$work/run" <<'RUN'
#!/usr/bin/env bash
set -euo pipefail
cd "$(dirname "$0")"
. scripts/common.sh
many_lines() { seq 1000 | sed 's/^/line /'; }
tests() { # a failure among what passed, as CTest says it with two at a time
  cat <<'LOG'
      Start   1: one.fails
      Start   2: two
1/3 Test   #2: two .......   Passed    1.25 sec
      Start   3: three
2/3 Test   #1: one.fails .***Failed    0.50 sec
the reason of one
3/3 Test   #3: three .....   Passed  162.35 sec
67% tests passed, 1 tests failed out of 3
The following tests FAILED:
	  1 - one.fails (Failed)
LOG
  [[ $1 != break ]]
}
fails() { many_lines && echo "the reason of $1" && return 3; }
waits() { touch waiting && sleep 30; }
case $1,$WORD in
  deps,deps | build,build) fails "$1" ;;
  check,early) fails check ;;
  check,*)
    . scripts/phases.sh
    begin_phases
    phase format many_lines
    case $WORD in
      python) phase python fails python ;;
      kill) phase python waits ;;
      tests) phase asan-tests tests break ;;
    esac
    phase tsan-tests tests hold
    close_phases check
    ;;
  test,*) many_lines && tests hold ;;
esac
RUN
chmod +x "$work/run"

failed=0
# closes WORD STATUS REGEX...: the status, the last line by the first pattern, and every other one in the sixty before it
closes() {
  local word=$1 wanted=$2 last=$3 pattern
  shift 3
  tail -n 1 "$work/said" | grep -qE -- "$last" || { echo "$word: its last line is no '$last'" && failed=1; }
  for pattern; do
    tail -n 60 "$work/said" | grep -qE -- "$pattern" || { echo "$word: no '$pattern' at the end" && failed=1; }
  done
  [[ $status == "$wanted" ]] || { echo "$word: status $status, not $wanted" && failed=1; }
}
ci() {
  status=0
  WORD=$1 "$work/.ci/run" >"$work/said" 2>&1 || status=$?
}

ci nothing
closes nothing 0 'passed, in [0-9]+ s$' '^deps +[0-9]+ s  passed' '^format ' '^release-build ' '67% tests passed' \
  '162.4 s  release-tests +three$' '162.4 s  tsan-tests +three$'
for word in deps build python; do
  ci $word
  closes $word 1 "FAILED in (release-)?$word, after" "^(release-)?$word +[0-9]+ s  FAILED" "^the reason of $word"
done
ci early
closes early 1 'FAILED in check, after' '^the reason of check' '^release-tests .* passed'
ci tests
closes tests 1 'FAILED in asan-tests, after' '^the reason of one' '1 - one.fails' '^tsan-tests .* passed'
if tail -n 8 "$work/said" | grep -q three; then echo "tests: says what passed" && failed=1; fi

status=0
set -m # a group of its own, all of which is told to end
WORD='kill' "$work/.ci/run" >"$work/said" 2>&1 & pid=$!
set +m
for ((i = 0; i < 100; ++i)); do [[ ! -e $work/waiting ]] || break; sleep 0.1; done
kill -- "-$pid"
wait "$pid" || status=$?
closes kill 143 'FAILED in python, after' '^python .* did not end' '^deps .* passed'
exit $failed
