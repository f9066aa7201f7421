# shellcheck shell=bash
# ./run test and ./run coverage: the folders of tests that a command line names, what they need built, and what CTest is
# told. Sourced by ./run, whose functions it uses.

# Every folder of tests by its name below tests/, one a line: those that CMake knows.
test_folders() {
  find tests -mindepth 2 -name CMakeLists.txt -printf '%h\n' | sed 's,^tests/,,' |
    grep -vxE 'support|fuzz|house/consumer|plugin/entry/unload' | sort
}

# test_folder NAME: the folder meant, by its whole name, as a part of the libraries or of the plug-in, or by its last
# component where only one ends so
test_folder() {
  local name=${1%/} known folder found
  name=${name#tests/}
  known=$(test_folders)
  for folder in "$name" "libraries/$name" "plugin/$name"; do
    grep -qxF -- "$folder" <<<"$known" && printf '%s' "$folder" && return
  done
  mapfile -t found < <(awk -F/ -v name="$name" '$NF == name' <<<"$known")
  ((${#found[@]} < 2)) || usage_error "'$1' is the name of several folders of tests: ${found[*]}"
  ((${#found[@]})) || usage_error "no folder of tests named '$1'; they are: $(paste -s -d ' ' <<<"$known")"
  printf '%s' "${found[0]}"
}

# read_test_words WORDS...: names of folders, and from the first word that begins with '-' on what goes to CTest; sets
# `folders` and `ctest_words`
read_test_words() {
  local folder
  folders=() ctest_words=()
  while (($#)) && [[ $1 != -* ]]; do
    folder=$(test_folder "$1")
    folders+=("$folder")
    shift
  done
  ctest_words=("$@")
}

# needed_targets PRESET FOLDER: what Ninja has to build for the tests of a folder: its own programs, and what the
# command lines of its tests name of the build tree, as CMake has written them down, of a folder that is built all of it;
# everything for a test of the whole tree
needed_targets() {
  local tree=$PWD/build/$1 place=$PWD/build/$1/tests/$2 paths
  paths=$(find "$place" -name CTestTestfile.cmake -exec grep -hE '^ *(add_test|set_tests_properties)\(' {} + |
    grep -oE "$tree[^]\"; ,]*" | sort -u) || true
  if grep -qxF "$tree" <<<"$paths"; then
    printf 'all\n'
    return
  fi
  printf '%s\n' "tests/$2/all"
  # of these only what Ninja makes: a folder that a test works in is none of it
  comm -12 <(sed "s,^$tree/,,; p; s,/*$,/all," <<<"$paths" | sort -u) <(ninja -C "$tree" -t targets all | sed 's/: [^:]*$//' | sort -u)
}

# test_the_folders PRESET: builds what the tests of `folders` need, no more, and runs them, with `ctest_words`
test_the_folders() {
  local preset=$1 folder targets=() failed=0
  configure "$preset"
  for folder in "${folders[@]}"; do mapfile -t -O "${#targets[@]}" targets < <(needed_targets "$preset" "$folder"); done
  build_targets "$preset" "${targets[@]}"
  empty_pocl_cache "$preset"
  export POCL_CACHE_DIR=$PWD/build/$preset/pocl-cache # the rest of what a preset says of tests is in the next lines
  for folder in "${folders[@]}"; do
    say "testing $folder"
    ctest --test-dir "build/$preset/tests/$folder" --output-on-failure --no-tests=error --parallel "$(job_count)" \
      "${ctest_words[@]}" || failed=1
  done
  return $failed
}

# test_as_said PRESET: the folders, or everything
test_as_said() {
  if ((${#folders[@]})); then
    test_the_folders "$1"
  else
    build "$1"
    run_tests "$1" "${ctest_words[@]}"
  fi
}

command_test() {
  local folders ctest_words
  read_test_words "$@"
  # for the trainer's tests, the demo, the package and the debugger's test
  need_packages gdb "${python_packages[@]}" "${wheel_packages[@]}" "${package_packages[@]}"
  [[ -d ../shared/cases ]] || say "the reference cases were not there (../shared/cases): replay_cases is skipped"
  have chromium || say "chromium was not there (./run deps): the tests of pages in a browser are skipped"
  test_as_said release
}
