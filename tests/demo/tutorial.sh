#!/usr/bin/env bash
# tutorial.sh QUARN: the commands of docs/tutorial.md as they stand there, but for where they write and which quarn runs.
set -euo pipefail
cd "$(dirname "$0")/../.."
quarn=$1
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
scripts/find_python.sh >"$work/python" || {
  echo "no Python with PyTorch here: the tutorial is not tried"
  exit 77
}

sed -n '/^```sh$/,/^```$/{/^```/d;p}' docs/tutorial.md |
  sed -e '/^\.\/run build$/d' -e "s|^quarn=.*|quarn=$quarn|" -e "s|^work=.*|work=$work|" >"$work/commands"
(($(grep -c '^\$quarn' "$work/commands") >= 10)) || { echo "the tutorial has lost its commands"; exit 1; }
QUARN=$quarn bash -euo pipefail "$work/commands" | tee "$work/said"

[[ -s $work/frame.png && -s $work/report/loss.png && -s $work/motion_neural.npy ]]
grep -q 'joined to 1159' "$work/said"
grep -q 'distance before the deformer: mean 0\.6' "$work/said"
"$quarn" info "$work/models/hand.nwrp" --scene "$work/motion.json" | grep -qx 'fits'
