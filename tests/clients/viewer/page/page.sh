#!/usr/bin/env bash
# page.sh: the tests of the page's modules. Skipped, in one word, where node is missing; fails then where NW_ALL_CLIENTS
# is set.
set -euo pipefail

if ! command -v node >/dev/null; then
  echo "skipped: no node"
  [[ ! ${NW_ALL_CLIENTS:-} ]] || exit 1
  exit 77
fi
node "$(dirname "$0")/modules.mjs"
