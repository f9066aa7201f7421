#!/usr/bin/env bash
# wholeWay.sh QUARN MODULE: the arm in Blender, from the rig to a neural deformation: sampled in one session, which ends
# while the training runs, trained in another, and used in a third.
set -euo pipefail
quarn=$1
modules=$2
here=$(dirname "$0")
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source "$here/needs_blender.sh"
scripts/find_python.sh >/dev/null 2>&1 || {
  [[ ${NW_ALL_CLIENTS:-} ]] && echo "failed: no Python with what the trainer needs" && exit 1
  echo "skipped: no Python with what the trainer needs"
  exit 77
}

# session PART: what PART of wholeWay.py does, in a Blender of its own
session() {
  PATH=$(dirname "$quarn"):$PATH PYTHONPATH=$modules blender -b --factory-startup --python-exit-code 1 \
    --python "$here/wholeWay.py" -- "$1" "$work" "$quarn" >"$work/log" 2>&1 || { tail -60 "$work/log"; exit 1; }
  sed -n '/^wholeWay: /s///p' "$work/log"
}

session sample
session train
session use
