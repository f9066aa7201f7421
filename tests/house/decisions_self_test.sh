#!/usr/bin/env bash
# decisions_self_test.sh SCRIPT: plants one fault at a time into a small tree and asks decisions.sh --check for its
# verdict.
. "$(dirname "$0")/self_test.sh"
script=$1
records=$tree/docs/decisions

# try PATTERN COMMAND: what --check says after the command was run in a tree without faults; '' where it says nothing
try() {
  rm -rf "$tree/docs" && mkdir -p "$records"
  printf '# 0001: one\n\n**Date.** 2024-02-29\n\nLeads to [0002](0002-b.md).\n' >"$records/0001-a.md"
  printf '# 0002: two\n\n**Date.** 2024-03-01\n' >"$records/0002-b.md"
  printf '// decision 0001\n// by decisions 0001 and 0002, in 1970\n' >"$tree/docs/code.cpp"
  "$script" "$tree" || failed=1
  (cd "$tree/docs" && eval "$2")
  ask "$script" --check "$tree"
  if [[ $1 ]]; then [[ $status == 1 && $said =~ $1 ]]; else [[ $status == 0 && ! $said ]]; fi || wrong "'$1' after: $2"
}

try '' true
try '' "sed -i '3d;2d' decisions/0002-b.md; '$script' '$tree'" # today's date, and it is in the index
try '0002-b.md:3: not ' "sed -i '3d' decisions/0002-b.md"
try '0002-b.md:3: not ' "sed -i 's/03-01/3-1/' decisions/0002-b.md"
try "0002-b.md:1: not '# 0002: title'" "sed -i 's/0002/0003/' decisions/0002-b.md"
try 'README.md is not of today' "sed -i 's/two/three/' decisions/0002-b.md"
try 'README.md is not of today' "rm decisions/README.md"
try 'number 0001 is taken twice' "cp decisions/0001-a.md decisions/0001-c.md; '$script' '$tree' >/dev/null || true"
try 'docs/code.cpp:2: there is no decision 0003' "sed -i 's/and 0002/and 0003/' code.cpp"
try 'page.md:1: there is no docs/decisions/0002-c.md' "echo '[b](decisions/0002-c.md)' >page.md"
try 'page.md:1: there is no docs/decisions/0009-x.md' "echo 'see [x](docs/decisions/0009-x.md)' >page.md"
try 'there is no record' "rm decisions/0*"
exit $failed
