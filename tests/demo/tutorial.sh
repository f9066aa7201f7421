#!/usr/bin/env bash
# tutorial.sh QUARN: the commands of docs/tutorial.md as they stand there, but for where they write, which quarn runs, and
# fewer poses and epochs. Even these have to bring the hand nearer to its target than the skin is.
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
  sed -e '/^\.\/run build$/d' -e "s|^quarn=.*|quarn=$quarn|" -e "s|^work=.*|work=$work|" \
    -e 's/^samples=600 epochs=250$/samples=100 epochs=60/' >"$work/commands"
grep -qx 'samples=100 epochs=60' "$work/commands" || { echo "the tutorial has lost its numbers"; exit 1; }
(($(grep -c '^\$quarn' "$work/commands") >= 10)) || { echo "the tutorial has lost its commands"; exit 1; }
QUARN=$quarn bash -euo pipefail "$work/commands" | tee "$work/said"

[[ -s $work/frame.png && -s $work/report/loss.png && -s $work/motion_neural.npy && -s $work/result/report.html ]]
grep -q 'joined to 1159' "$work/said"
# mean and p99 in mm, of what is left and of what was there before
mapfile -t left < <(sed -n 's/^distance[^:]*: mean \([0-9.]*\) mm .*, p99 \([0-9.]*\) mm .*, p99\.99.*/\1 \2/p' "$work/said")
awk -v after="${left[0]}" -v before="${left[1]}" 'BEGIN {
  split(after, a); split(before, b)
  exit !(b[1] > 0.6 && b[1] < 0.7 && a[1] < 0.6 * b[1] && a[2] < 0.8 * b[2])
}' || { echo "the model leaves ${left[0]} mm (mean, p99) of ${left[1]} mm"; exit 1; }
"$quarn" info "$work/models/hand.nwrp" --scene "$work/motion.json" | grep -qx 'fits'
