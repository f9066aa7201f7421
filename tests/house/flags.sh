#!/usr/bin/env bash
# flags.sh ROOT: reads the product's C++ files under ROOT and lists the places that write a flag of flags.txt, beside
# this script, without a right to. Exit status 1 when there is one, and when the table names a flag or a file that there
# is not.
set -euo pipefail
table=$(cd "$(dirname "$0")" && pwd)/flags.txt
cd "$1"
home=plugin/deformer
failed=0
complain() {
  printf '%s\n' "$1"
  failed=1
}

while read -r flag files; do
  grep -q "^ *\(bool\|unsigned\) $flag = .*;" "$home/neuralWarpData.h" || complain "the state has no flag '$flag'"
  allowed=() # the one place that declares it, and those of the table
  for file in $files; do
    grep -q "\b$flag\b" "$home/$file" || complain "$home/$file: does not know '$flag'"
    allowed+=(-e "^$home/$file:")
  done
  # assigned, also by an operator; exchanged, swapped, or given away by reference or as a member
  writes="\b$flag *([|&^]?=([^=]|\$))|(exchange|swap)\([^;]*\b$flag\b|&(neuralWarpData::|[A-Za-z_.]*(\.|->))$flag\b"
  while IFS= read -r place; do
    [[ $place == "$home/neuralWarpData.h:"*:*"bool $flag = "* ]] || complain "$place"
  done < <(grep -rnE --include=*.cpp --include=*.h "$writes" plugin libraries quarn host 2>/dev/null |
    grep -vE '^[^:]*:[0-9]+: *//' | grep -v "${allowed[@]}")
done < <(sed 's/#.*//; /^ *$/d' "$table")
exit $failed
