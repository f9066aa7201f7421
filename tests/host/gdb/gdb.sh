#!/usr/bin/env bash
# gdb.sh PROGRAM PRINTERS: stops the program where its handles are, and compares what GDB shows of each.
set -euo pipefail
program=$1 printers=$2
skip() {
  echo "SKIPPED: $*"
  exit 77
}
command -v gdb >/dev/null || skip "there is no gdb"

shown=$(gdb -nx -batch -iex 'set auto-load off' -ex "source $printers" -ex 'set style enabled off' -ex 'break stopHere' \
  -ex run -ex up -ex 'print node' -ex 'print gone' -ex 'print attribute' -ex 'print ofGone' -ex 'print value' \
  -ex 'print label' -ex 'print total' -ex 'print scale' -ex 'print values' -ex 'print missing' -ex 'print child' \
  -ex 'print null' "$program" 2>&1) || true
[[ $shown != *"ptrace: "* && $shown != *"Couldn't get registers"* ]] || skip "this system lets nobody debug: $shown"

diff <(sed -n 's/^\$[0-9]* = //p' <<<"$shown") - <<'END' && exit
node "sum1" (testSum)
deleted node "sum2" (testSum)
attribute "values" (double[])
plug of a deleted node
sum1.values[3] = 4 (double, clean)
sum1.text = "a "text"" (string, clean)
sum1.total = 2.5 (double, dirty, told)
sum1.scale = 1 (double, clean)
sum1.values (double[], clean)
sum1.values[4] (not there)
lists1.lists[2].weight (not there)
null
END
printf '%s\n' "$shown"
exit 1
