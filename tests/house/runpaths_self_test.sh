#!/usr/bin/env bash
# runpaths_self_test.sh COMPILER: links a library with one RUNPATH at a time and asks runpaths.sh for its verdict.
. "$(dirname "$0")/self_test.sh"
compiler=$1
echo 'int answer() { return 42; }' >"$tree/answer.cpp"

try() {
  "$compiler" -shared -fPIC "$tree/answer.cpp" -o "$tree/answer.so" "-Wl,-rpath,$2"
  ask "$here/runpaths.sh" "$tree"
  [[ $status == "$1" ]] || wrong "status $1: $2"
}

try 0 /usr/lib
try 0 '/usr/lib:$ORIGIN:$ORIGIN/../lib/.'
for path in '/usr/lib:' ':/usr/lib' '/usr/lib::$ORIGIN' lib '/usr/lib:lib' . '$ORIGINAL/lib'; do try 1 "$path"; done
exit $failed
