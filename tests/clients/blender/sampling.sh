#!/usr/bin/env bash
# sampling.sh QUARN: what the add-on samples of a rig in Blender, and what it refuses; skins are compared with quarn's.
set -euo pipefail
here=$(dirname "$0")
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source "$here/needs_blender.sh"

blender -b --factory-startup --python-exit-code 1 --python "$here/sampling.py" -- "$work" "$1" >"$work/log" 2>&1 ||
  { tail -40 "$work/log"; exit 1; }
grep '^passed' "$work/log"
