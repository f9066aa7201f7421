#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# header_scan.sh ROOT: compares the headers below ROOT/host/api with the tables of fault points and the sources of the
# runtime. Lists what does not fit, one line each, and fails then:
#   - a function that can fail and has no fault point, and a fault point whose function has gone;
#   - a function without a thread tag, and a fault point whose tag is not its function's;
#   - a function that is [main] or [eval], cannot fail, and does not check it by a call that names it, as in
#     isRefused(ThreadTag::main, "HPxCommand::syntax");
#   - a function that can fail and does not go through its own fault point, and through no other: all overloads.
# What counts as a function, and which are exempt: see operations.awk and fault_points.awk.
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
cd "$1"
scratch=$(mktemp)
trap 'rm -f "$scratch"' EXIT

find host/api/openquarn -name '*.h' -print0 | sort -z | xargs -0 awk -f "$here/operations.awk" >"$scratch"

{
  sed 's/^/function\t/' "$scratch"
  find host/runtime -name '*.def' -exec sed -nE 's|^FAULT_POINT\((\w+), (\w+)(, (\w+))?\)$|point\t\1\t\2\t\4|p' {} +
  # toRead() of HDataBlock.cpp and readablePlugin() of HFnPlugin.cpp check for their callers
  find host/runtime -name '*.cpp' -exec sed -nE \
    -e 's|.*ThreadTag::(\w+), "(\w+)::(\w+)"\).*|checked\t\2\t\3\t\1|p' \
    -e 's|.*toRead\(.*"(\w+)::(\w+)"\).*|checked\t\1\t\2\teval|p' \
    -e 's|.*readablePlugin\(.*"(\w+)::(\w+)"\).*|checked\t\1\t\2\tmain|p' {} +
  find host/runtime -name '*.cpp' -print0 | sort -z | xargs -0 awk -f "$here/fault_points.awk"
} | awk -F '\t' '
  function bad(text) {
      if (!(text in said))
          print text
      said[text] = 1
      ++failures
  }
  { name = $2 "::" $3 }
  $1 == "point" {
      if (name in point)
          bad(name " has two fault points")
      point[name] = $4 == "" ? "any" : $4
  }
  $1 == "checked" { checked[name] = $4 }
  # the templates of HArray, which are in its header, go through HArrayBase::admit
  $1 == "uses" && $3 != $4 && $3 != "HArrayBase::admit" { bad($3 " fails under the name of " $4 " (" $2 ")") }
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
          else if (kind == "plain" && tag != "any" && checked[name] != tag)
              bad(name " is [" tag "] and does not check it" where)
          if (kind == "fails" && !(name in point))
              bad(name " can fail and has no fault point" where)
          else if (kind == "fails" && tag != "-" && point[name] != tag)
              bad(name " is [" tag "], and its fault point says [" point[name] "]" where)
      }
      for (name in point) {
          if (!(name in declared))
              bad(name " has a fault point and is no function of the headers")
          else if (!(name in used))
              bad(name " has a fault point that nothing goes through")
          if (name in without)
              bad(name " does not go through its fault point (" without[name] ")")
      }
      exit failures > 0
  }'
