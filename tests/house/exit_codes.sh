#!/usr/bin/env bash
# exit_codes.sh ROOT: the tables of what programs end with are one table: a name and a number a row. Exit status 1, with
# the rows that differ, when they are not.
set -euo pipefail
cd "$1"
# names as the host language writes them become NOT_YET
codes() { sed -nE "s/$1/\1 \2/p" "$2" | sed -E 's/([a-z])([A-Z])/\1_\2/g; s/ ([a-z])/_\1/g' | tr '[:lower:]' '[:upper:]'; }
table=$(sed -nE 's/^\| ([0-9]+) \| ([a-z ]+) \|.*/\2 \1/p' docs/exitCodes.md | codes '^(.*) ([0-9]+)$' /dev/stdin)
(($(wc -l <<<"$table") >= 7)) || { echo "docs/exitCodes.md has no such table"; exit 1; }
bad=0
compare() { diff --label docs/exitCodes.md --label "$2" -U0 <(echo "$table") <(codes "$1" "$2") || bad=1; }
compare '^constexpr int ([A-Za-z]+) = ([0-9]+);.*' quarn/console/exitCodes.h
for file in trainer/errors.py clients/farm/neuralwarp_farm/codes.py; do
  compare '^([A-Z_]+)[^=]* = ([0-9]+)( .*)?' "$file"
done
exit $bad
