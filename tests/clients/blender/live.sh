#!/usr/bin/env bash
# live.sh QUARN MODULE: a model in use on the rebuilt arm in Blender, in all that may happen to an object and its file.
set -euo pipefail
here=$(dirname "$0")
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source "$here/needs_blender.sh"

blender -b --factory-startup --python-exit-code 1 --python "$here/live.py" -- \
  "$work" "$1" "$2" >"$work/log" 2>&1 || { tail -40 "$work/log"; exit 1; }
grep '^passed' "$work/log"
