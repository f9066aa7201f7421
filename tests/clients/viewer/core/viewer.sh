#!/usr/bin/env bash
# viewer.sh SAMPLES_PROGRAM [VIEWER_WASM]: viewer.mjs under node. Skipped, in a word, where node or viewer.wasm is
# missing; a failure then where NW_ALL_CLIENTS is set.
set -euo pipefail
missing=
command -v node >/dev/null || missing="no node"
[[ -e ${2:-} ]] || missing="no viewer.wasm: clang's WebAssembly target is missing"
if [[ $missing ]]; then
  [[ ${NW_ALL_CLIENTS:-} ]] && echo "failed: $missing" && exit 1
  echo "skipped: $missing"
  exit 77
fi
folder=$(mktemp -d)
trap 'rm -rf "$folder"' EXIT
"$1" "$folder"
node "$(dirname "$0")/viewer.mjs" "$2" "$folder"
