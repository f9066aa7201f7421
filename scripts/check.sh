# ./run check [--all]: sourced by ./run, whose functions it uses. Every phase runs, whatever the others said; tests, of what
# is built.

# The commit that the changes are counted from: where this branch left the main one, else the last commit but one.
change_base() {
  local head branch
  head=$(git_here rev-parse HEAD) || return 1
  for branch in "${NW_CHECK_BASE:-}" origin/HEAD origin/main main; do
    [[ -n $branch ]] || continue
    local base
    base=$(git_here merge-base HEAD "$branch") || continue
    [[ $base != "$head" ]] && printf '%s' "$base" && return 0
  done
  git_here rev-parse --verify HEAD~1
}

changed_files() {
  local base
  if have git && base=$(change_base); then
    { git_here diff --name-only "$base" && git_here ls-files --others --exclude-standard; } | sort -u
  else
    cpp_files # no history to compare with
  fi
}

# Among all files every header is seen through a source that includes it.
files_to_analyse() {
  if [[ $1 == --all ]]; then cpp_files | grep '\.cpp$'; else changed_files; fi
}

# A header has no compile command of its own: the unit that compiles it alone, or the source beside it, stands for it.
translation_units() {
  local file
  while read -r file; do
    case $file in
      *.cpp) printf '%s/%s\n' "$PWD" "$file" ;;
      *.h) printf '%s\n' "$PWD/build/asan/tests/house/headers/${file//\//_}.cpp" "$PWD/${file%.h}.cpp" ;;
    esac
  done | sort -u >"$1.wanted"
  sed -n 's/^ *"file": "\(.*\)".*/\1/p' build/asan/compile_commands.json | sort -u >"$1.known"
  comm -12 "$1.wanted" "$1.known"
}

check_format() {
  local files
  mapfile -t files < <(cpp_files)
  say "format: ${#files[@]} files"
  ((${#files[@]} == 0)) || clang-format-14 --dry-run --Werror "${files[@]}"
}

# setup.cfg says what is asked of the Python code
check_python() {
  local python
  python=$(scripts/find_python.sh 2>/dev/null)
  say "python: types, style"
  mypy --python-executable "$python" --cache-dir build/mypy && \
    flake8 trainer examples tests host bench clients clients/farm/neuralwarp-farm scripts scripts/neuralwarp-train setup.py
}

check_tidy() {
  local units
  configure asan
  mapfile -t units < <(files_to_analyse "$1" | translation_units build/tidy)
  say "static analysis: ${#units[@]} translation units"
  ((${#units[@]})) || return 0
  # findings come on standard output; standard error counts those in system headers, and says what went wrong
  printf '%s\0' "${units[@]}" | xargs -0 -n 1 -P "$(job_count)" clang-tidy-14 --quiet -p build/asan 2>build/tidy.log || {
    grep -v ' warnings\? generated' build/tidy.log >&2
    return 1
  }
}

command_check() {
  local scope=${1:-} preset
  [[ -z $scope || $scope == --all ]] || usage_error "check takes --all or nothing, not '$scope'"
  . scripts/phases.sh
  need_packages "${check_packages[@]}" "${python_packages[@]}"
  need_for_preset tsan
  begin_phases
  phase format check_format
  phase python check_python
  phase static-analysis check_tidy "${scope:-changed}"
  for preset in asan tsan; do
    phase "$preset-build" build "$preset"
    ((phase_status)) || phase "$preset-tests" run_tests "$preset"
  done
  close_phases check
}
