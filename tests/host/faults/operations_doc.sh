#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# operations_doc.sh ROOT: writes ROOT/docs/host-operations.md, the list of all operations of the host that can fail, from
# the headers and the tables of fault points. With --check first, only says whether the file is what would be written;
# exit status 1 when it is not.
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
check=
if [[ $1 == --check ]]; then
  check=yes
  shift
fi
cd "$1"
page=docs/host-operations.md
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT

find host/api/openquarn -name '*.h' -print0 | sort -z | xargs -0 awk -f "$here/operations.awk" >"$scratch/functions"
for table in $(find host/runtime -name '*.def'); do
  sed -nE "s|^FAULT_POINT\((\w+), (\w+).*|$(basename "$table" .def)\t\1::\2|p" "$table"
done | sort >"$scratch/points"

awk -F '\t' '
  FILENAME ~ /functions$/ {
      name = $1 "::" $2
      if (!(name in header) && ($3 == "fails" || $3 == "plain")) {
          header[name] = $5
          tag[name] = $4
      }
  }
  FILENAME ~ /points$/ {
      if ($1 != family) {
          family = $1
          printf "\n## %s\n\n| operation | header | thread |\n|---|---|---|\n",
              toupper(substr(family, 1, 1)) substr(family, 2)
      }
      printf "| `%s` | `%s` | %s |\n", $2, header[$2], tag[$2]
      ++operations
  }
  END { printf "\n%d operations.\n", operations }
' "$scratch/functions" "$scratch/points" >"$scratch/list"

{
  cat <<'PAGE'
# Operations of the host

All operations of the H-API that can fail: those that return an `HStatus` or write one. Each can be made to fail on
demand, by name and by count of calls (`openquarn_app/Faults.h`); a test reads in the sources that each, with all its
overloads, goes through its own fault point (`tests/host/faults/header_scan.sh`). Overloads share a line. The
constructors of function sets that take an object fail as `HFnBase::setObject` does.

Threads: `main` is the thread that the application runs the host on, outside of an evaluation; `eval` that one, or a
thread that is evaluating a node; `any` every thread.

This page is generated: `tests/host/faults/operations_doc.sh .` writes it anew, and a test fails when it is out of date.
PAGE
  cat "$scratch/list"
} >"$scratch/page"

if [[ -z $check ]]; then
  cp "$scratch/page" "$page"
elif ! diff -u "$page" "$scratch/page"; then
  echo "$page is out of date: run tests/host/faults/operations_doc.sh ."
  exit 1
fi
