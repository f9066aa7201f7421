#!/usr/bin/env bash
# Finds a Python 3 that has what the trainer needs: $NW_PYTHON if that is set (and no other), else /usr/bin/python3,
# else the python3 of the PATH. Its path goes to standard output, a line that says which to standard error; status 1
# and a sentence if there is none.
set -euo pipefail

modules=(numpy scipy torch onnx tqdm matplotlib xxhash)

# The first of the modules that the interpreter lacks, or nothing. Finding is enough: importing takes seconds.
missing_of() {
  "$1" -c 'import sys, importlib.util as u
print(next((m for m in sys.argv[1:] if u.find_spec(m) is None), ""))' "${modules[@]}" 2>/dev/null ||
    echo 'a working interpreter'
}

reasons=
candidates=(/usr/bin/python3 python3)
if [[ ${NW_PYTHON:-} ]]; then candidates=("$NW_PYTHON"); fi
for candidate in "${candidates[@]}"; do
  path=$(command -v "$candidate" 2>/dev/null) || {
    reasons+="$candidate is not there; "
    continue
  }
  missing=$(missing_of "$path")
  if [[ -z $missing ]]; then
    printf 'the trainer runs with %s (%s)\n' "$path" "$("$path" --version 2>&1)" >&2
    printf '%s\n' "$path"
    exit 0
  fi
  reasons+="$path lacks $missing; "
done
printf 'find_python: no Python for the trainer: %sinstall (Debian) %s, or set NW_PYTHON\n' \
  "$reasons" "${modules[*]/#/python3-}" >&2
exit 1
