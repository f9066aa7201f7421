#!/usr/bin/env bash
# For tests of a check, to be sourced: an empty folder $tree, and `failed` for their exit status.
set -euo pipefail
here=$(cd "$(dirname "${BASH_SOURCE[0]}")" && pwd)
tree=$(mktemp -d)
trap 'rm -rf "$tree"' EXIT
failed=0

# ask COMMAND...: sets `said` and `status` to what it says and ends with
ask() {
  status=0
  said=$("$@" 2>&1) || status=$?
}

# wrong WHAT: what the answer should have been
wrong() {
  printf 'expected %s\nstatus %s, output: %s\n' "$*" "$status" "$said"
  failed=1
}
