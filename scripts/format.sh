# shellcheck shell=bash
# ./run format: sourced by ./run.

# format_files: formats each file that is named on standard input, and prints those that it changed
format_files() {
  # shellcheck disable=SC2016 # the dollars are the inner shell's
  xargs -r -d '\n' -P "$(job_count)" -n 32 bash -c 'for file; do
    clang-format-14 --dry-run --Werror "$file" 2>/dev/null || { clang-format-14 -i "$file" && printf "%s\n" "$file"; }
  done' - | sort
}

command_format() {
  local files changed
  need_packages clang-format-14
  mapfile -t files < <(cpp_files)
  mapfile -t changed < <(printf '%s\n' "${files[@]}" | format_files)
  ((${#changed[@]} == 0)) || printf '%s\n' "${changed[@]}"
  say "format: ${#changed[@]} of ${#files[@]} files changed"
}
