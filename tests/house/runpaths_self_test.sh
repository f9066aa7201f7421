#!/usr/bin/env bash
# runpaths_self_test.sh COMPILER: links a library with one RUNPATH at a time and asks runpaths.sh for its verdict.
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
folder=$(mktemp -d)
trap 'rm -rf "$folder"' EXIT
failed=0
echo 'int answer() { return 42; }' >"$folder/answer.cpp"

try() {
  local expected=$1 path=$2 status=0
  "$3" -shared -fPIC "$folder/answer.cpp" -o "$folder/answer.so" "-Wl,-rpath,$path"
  "$here/runpaths.sh" "$folder" >/dev/null || status=$?
  [[ $status == "$expected" ]] || {
    printf 'expected status %s, had %s: %s\n' "$expected" "$status" "$path"
    failed=1
  }
}

try 0 /usr/lib "$1"
try 0 '/usr/lib:$ORIGIN:$ORIGIN/../lib/.' "$1"
for path in '/usr/lib:' ':/usr/lib' '/usr/lib::$ORIGIN' lib '/usr/lib:lib' . '$ORIGINAL/lib'; do try 1 "$path" "$1"; done
exit $failed
