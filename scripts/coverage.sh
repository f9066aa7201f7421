# shellcheck shell=bash
# ./run coverage: sourced by ./run after test.sh, whose functions it uses.

# coverage_by_folder TABLE: the table of gcovr (file, lines, lines reached, ...) as one row a folder
coverage_by_folder() {
  awk -F, '
    NR > 1 { folder = $1; sub("/[^/]*$", "", folder); lines[folder] += $2; reached[folder] += $3; all += $2; hit += $3 }
    END {
      row = "%-40s %7d of %7d lines  %5.1f %%\n"
      for (folder in lines) printf row, folder, reached[folder], lines[folder], part(reached[folder], lines[folder]) | "sort"
      close("sort")
      printf row, "all", hit, all, part(hit, all)
    }
    function part(some, whole) { return 100 * some / (whole ? whole : 1) }' "$1"
}

command_coverage() {
  local folders ctest_words failed=0 tree=build/coverage
  read_test_words "$@"
  need_packages "${python_packages[@]}" "${wheel_packages[@]}" "${package_packages[@]}"
  if [[ -d $tree ]]; then find "$tree" -name '*.gcda' -delete; fi # what earlier runs have counted
  test_as_said coverage || failed=1
  say "coverage: lines that the tests have reached, by folder; file by file in $tree/coverage.csv"
  gcovr --root . --object-directory "$tree" --filter '(libraries|host|plugin|quarn|clients)/' --exclude-throw-branches \
    -j "$(job_count)" --csv "$tree/coverage.csv" "$tree" 2>"$tree/gcovr.log" || {
    tail -n 5 "$tree/gcovr.log" >&2
    return 1
  }
  coverage_by_folder "$tree/coverage.csv"
  return $failed
}
