#!/usr/bin/env bash
# farm.sh QUARN: ./run farm-demo on fewer poses and passes: parts on a real Slurm, of which one is killed, leave the bytes
# of one machine. Skipped, in a word, where Slurm or PyTorch is missing.
set -euo pipefail
cd "$(dirname "$0")/../.."
. scripts/common.sh
. scripts/farm_demo.sh
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
found=$(scripts/find_python.sh) || {
  echo "no Python with PyTorch here: the farm's demo is not tried"
  exit 77
}
if ! have sbatch; then
  echo "skipped: no Slurm (./run deps)"
  [[ ! ${NW_ALL_CLIENTS:-} ]] || exit 1
  exit 77
fi

# shellcheck disable=SC2317 # called by command_farm_demo
farm_demo_install() {
  scripts/fetch_hand.sh
  # shellcheck disable=SC2034 # command_farm_demo's
  python=$found quarn=$given
}
given=$1
command_farm_demo --output "$work/farm" --samples 40 --parts 3 --epochs 4 | tee "$work/said"
grep -q '^   killed: part-' "$work/said"
grep -q 'part-[0-9]* begins again' "$work"/farm/plans/targets/logs/*.log
