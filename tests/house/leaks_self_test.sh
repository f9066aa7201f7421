#!/usr/bin/env bash
# Plants one line at a time and asks leaks.sh for its verdict. The lines are put together so that this file has none.
. "$(dirname "$0")/self_test.sh"

try() {
  printf 'before\n%s\n' "$2" >"$tree/file.txt"
  ask "$here/leaks.sh" "$tree"
  [[ $status == "$1" ]] || wrong "status $1: $2"
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
