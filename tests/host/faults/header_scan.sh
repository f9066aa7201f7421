#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# header_scan.sh ROOT: compares the headers below ROOT/host/api with the tables of operations and the sources of the
# runtime. Lists what does not fit, one line each, and fails then:
#   - a function that can fail and has no row FAULT_POINT; one that cannot, is [main] or [eval], and has no CANNOT_FAIL;
#   - a row whose function has gone, or whose tag is not its function's; a function without a thread tag;
#   - a function with a row that does not go through it, or goes through another's: all overloads.
# What counts as a function, and which are exempt: see operations.awk and fault_points.awk.
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
cd "$1"
scratch=$(mktemp)
trap 'rm -f "$scratch"' EXIT

find host/api/openquarn -name '*.h' -print0 | sort -z | xargs -0 awk -f "$here/operations.awk" >"$scratch"

{
  sed 's/^/function\t/' "$scratch"
  find host/runtime -name '*.def' -exec sed -nE 's/^(FAULT_POINT|CANNOT_FAIL)\((\w+), (\w+)(, (\w+))?\)$/\1\t\2\t\3\t\5/p' {} +
  find host/runtime -name '*.cpp' -print0 | sort -z | xargs -0 awk -f "$here/fault_points.awk"
} | awk -F '\t' '
  function bad(text) {
      if (!(text in said))
          print text
      said[text] = 1
      ++failures
  }
  { name = $2 "::" $3 }
  $1 == "FAULT_POINT" || $1 == "CANNOT_FAIL" {
      if (name in kind_of)
          bad(name " has two rows")
      kind_of[name] = $1
      tag_of[name] = $4 == "" ? "any" : $4
  }
  # the templates of HArray, which are in its header, go through HArrayBase::admit
  $1 == "uses" && $3 != $4 && $3 != "HArrayBase::admit" { bad($3 " goes through the row of " $4 " (" $2 ")") }
  $1 == "uses" { used[$4] = 1 }
  $1 == "none" { without[$3] = $2 }
  $1 == "loses" { bad($3 " loses the status of its fault point (" $2 ")") }
  $1 == "function" && $4 != "attach" {
      row[++rows] = $0
  }
  END {
      for (i = 1; i <= rows; ++i) {
          split(row[i], field, "\t")
          name = field[2] "::" field[3]
          kind = field[4]
          tag = field[5]
          where = " (" field[6] ")"
          if (kind == "inline" || kind == "plugin")
              continue
          declared[name] = 1
          if (tag == "-")
              bad(name " has no thread tag" where)
          if (kind == "plain" && tag == "any")
              continue
          wanted = kind == "fails" ? "FAULT_POINT" : "CANNOT_FAIL"
          if (kind_of[name] != wanted)
              bad(name " has no row " wanted where)
          else if (tag != "-" && tag_of[name] != tag)
              bad(name " is [" tag "], and its row says [" tag_of[name] "]" where)
      }
      for (name in kind_of) {
          if (kind_of[name] == "FAULT_POINT" && !(name in declared))
              bad(name " has a row and is no function of the headers")
          else if (!(name in used))
              bad(name " has a row that nothing goes through")
          if (kind_of[name] == "FAULT_POINT" && name in without)
              bad(name " does not go through its row (" without[name] ")")
      }
      exit failures > 0
  }'
