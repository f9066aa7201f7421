#!/usr/bin/env bash
# front_door.sh ROOT: what ./run answers by itself, in a copy of it where every program that installs, loads or builds
# only notes that it was called.
set -euo pipefail
root=$1
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
place=$work/checkout
mkdir -p "$place" "$work/bin" "$work/onnxruntime/lib"
touch "$work/onnxruntime/lib/libonnxruntime.so"
cp -r "$root/run" "$root/scripts" "$place"
for folder in libraries/geometry host/geometry host/graph plugin/gpu quarn/same plugin/x/same support; do
  mkdir -p "$place/tests/$folder" && touch "$place/tests/$folder/CMakeLists.txt"
done
for program in apt-get npm cmake ctest; do
  printf '#!/bin/sh\necho "%s $*" >>"%s"\n' "$program" "$work/called" >"$work/bin/$program"
done
# where something is missing, installing it would show among the calls as well
printf '#!/bin/sh\nexec "$@"\n' >"$work/bin/sudo"
printf '#!/bin/sh\nprintf "%%s: phony\\n" all clients/python/all quarn/quarn tests/plugin/gpu/all\n' >"$work/bin/ninja"
chmod +x "$work"/bin/*

failures=0
# run_row STATUS PATTERN CALL ARGS...: ./run ARGS, its status, an extended pattern in what it says, and one in what it
# calls ("nothing": it calls none of the programs)
run_row() {
  local status=$1 pattern=$2 call=$3 got=0 wrong=
  shift 3
  : >"$work/called"
  (cd "$work" && PATH="$work/bin:$PATH" ONNXRUNTIME_ROOT=$work/onnxruntime XDG_CACHE_HOME=$work/cache \
    "$place/run" "$@") >"$work/said" 2>&1 || got=$?
  [[ $got == "$status" ]] || wrong+=" status $got, not $status;"
  grep -qE -- "$pattern" "$work/said" || wrong+=" does not say '$pattern';"
  if [[ $call == nothing ]]; then
    [[ ! -s $work/called ]] || wrong+=" calls $(head -n 1 "$work/called");"
  else
    grep -qE -- "$call" "$work/called" || wrong+=" does not call '$call';"
  fi
  [[ $wrong ]] || return 0
  printf './run %s:%s\n' "$*" "$wrong"
  sed 's/^/  | /' "$work/said"
  failures=$((failures + 1))
}

# --- answered before anything is installed ---
run_row 0 'usage: ./run demo .*--all' nothing demo --help
run_row 0 'usage: ./run COMMAND' nothing
run_row 0 'usage: ./run COMMAND' nothing test --help
run_row 2 "no command named dance" nothing dance
run_row 2 "no preset named fast" nothing build fast
run_row 2 "not also 'dev'" nothing build release dev
run_row 2 "not 'most'" nothing check most
run_row 2 "not 'long'" nothing fuzz long
run_row 2 "not 'now'" nothing deps now
for command in format hooks package; do run_row 2 "$command takes no arguments, not 'now'" nothing $command now; done
for command in test coverage; do
  run_row 2 "no folder of tests named 'grap'; they are: .*host/graph .*plugin/gpu" nothing $command graph grap
  run_row 2 "'same' is the name of several folders of tests: plugin/x/same quarn/same" nothing $command same
  run_row 2 "no folder of tests named 'support'" nothing $command support # it has none
done
run_row 1 "no git checkout" nothing hooks
NW_JOBS=many run_row 2 "NW_JOBS is 'many'" nothing build
run_row 2 "does not know '--sample'" nothing demo --sample 40
run_row 2 "--epochs needs a value" nothing demo --epochs
for number in 0 9 1e3 -5 ten 99999999 ''; do
  run_row 2 "--samples takes a whole number from 10 to 9999999, not '$number'" nothing demo --samples "$number"
done
run_row 2 "needs a folder, not '--all'" nothing demo --output --all
touch "$work/file"
run_row 2 "$work/file: no folder" nothing demo --output file # which is in the caller's folder, not in the checkout

# --- tests of one folder, of some, of all ---
run_row 0 'testing libraries/geometry' '^cmake --build .* --target tests/libraries/geometry/all$' test geometry
run_row 0 'testing plugin/gpu' '^ctest --test-dir build/release/tests/plugin/gpu .* -R one$' \
  test tests/host/graph/ gpu -R one
# and with them what their command lines name: a program, a folder of which all is built, one that is only worked in
mkdir -p "$place/build/release/tests/plugin/gpu"
cat >"$place/build/release/tests/plugin/gpu/CTestTestfile.cmake" <<TESTS
add_test([=[one]=] "one.sh" "$place/build/release/quarn/quarn")
set_tests_properties([=[one]=] PROPERTIES ENVIRONMENT "PYTHONPATH=$place/build/release/clients/python;A=b"
  WORKING_DIRECTORY "$place/build/release/work")
TESTS
run_row 0 'testing plugin/gpu' '^cmake --build .* --target tests/plugin/gpu/all clients/python/all quarn/quarn$' test gpu
run_row 0 'testing release' '^ctest --preset release .* -R geometry$' test -R geometry

# --- a build goes on without the parts of the page ---
run_row 0 'the page of quarn view is left out' '^cmake --build' build

# --- a demo says what is coming ---
run_row 1 'posed 40 times.*its results go to .*/here' 'npm pack' demo --output here --samples 40 --epochs 3
for said in 'about 2 min .*to build it first' 'to be loaded: .*the hand \(94 MB\)'; do
  grep -qE "$said" "$work/said" || { echo "the demo does not say '$said'" && failures=$((failures + 1)); }
done

# --- on a terminal the line of a step counts: what its log says last ---
cat >"$work/steps.sh" <<'STEPS'
set -euo pipefail
. scripts/common.sh
. scripts/demo.sh
logs=$1
# goes on when the terminal shows the count
until_shown() {
  for ((i = 0; i < 300; ++i)); do ! grep -q "$1" "$logs/terminal" || return 0; sleep 0.2; done
}
counts_lines() {
  printf 'began\n' && sleep 1.5 && printf 'epoch 10 of 30: loss 1\nepoch 20 of 30: loss 1\n' && until_shown ' 20 of 30'
}
step "lines" counts_lines
step "fails" bash -c 'echo why; exit 3'
STEPS
(cd "$place" && script -qfec "bash '$work/steps.sh' '$work'" "$work/terminal" >/dev/null </dev/null) &&
  failures=$((failures + 1))
for said in 'lines .* 20 of 30' 'lines .* [0-9]+ s.?$' 'fails .*failed' '^why' 'fails: the command failed \(log: '; do
  grep -qE "$said" "$work/terminal" || { echo "a step does not show '$said'" && failures=$((failures + 1)); }
done

# --- a build tree of another place is made anew, one of this place is kept ---
tree=$place/build/release
for home in "$work/elsewhere" "$root" "$place"; do
  mkdir -p "$tree"
  touch "$tree/made"
  printf 'CMAKE_HOME_DIRECTORY:INTERNAL=%s\n' "$home" >"$tree/CMakeCache.txt"
  if [[ $home == "$place" ]]; then
    run_row 0 'configuring release' 'cmake --preset release' build
    [[ -e $tree/made ]] || { echo "the tree of this place was thrown away" && failures=$((failures + 1)); }
  else
    run_row 0 "build/release was made for $home: making it anew" 'cmake --preset release' build
    [[ ! -e $tree/made ]] || { echo "the tree of $home was kept" && failures=$((failures + 1)); }
  fi
done
exit $((failures > 0))
