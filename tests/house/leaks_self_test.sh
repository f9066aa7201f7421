#!/usr/bin/env bash
# Plants one line at a time and asks leaks.sh for its verdict. The lines are put together here so that this file has none.
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
tree=$(mktemp -d)
trap 'rm -rf "$tree"' EXIT
failed=0

try() {
  local expected=$1 text=$2 status=0
  printf 'before\n%s\n' "$text" >"$tree/file.txt"
  "$here/leaks.sh" "$tree" >"$tree.log" || status=$?
  [[ $status == "$expected" ]] || {
    printf 'expected status %s, had %s: %s\n' "$expected" "$status" "$text"
    failed=1
  }
  rm -f "$tree.log"
}

for folder in root home/ann work Users/Ann; do
  try 1 "set(DIR \"/$folder/project\")"
  try 1 "/$folder/project"
done
for host in registry.example.org npm.example.org/registry deb.""debian.org mirror.example.org; do
  try 1 "get https:/""/$host/package"
done
try 1 "  \"resolved\""": \"somewhere\""
try 0 'https://www.apache.org/licenses/'
try 0 'tests/work/file, ./root/a, the /workshop, rework/home'
exit $failed
