#!/usr/bin/env bash
# gpu.sh CMAKE BUILD: installs the build tree and moves the installation: its quarn plays the example scene on the
# OpenCL device with the kernels that lie there, and on the CPU when one of them is gone. Status 77: no device.
set -euo pipefail
source tests/support/movingWave.sh
cmake=$1 build=$2
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
bad=0

fail() { echo "$*"; cat "$work/err"; bad=1; }
# play NAME ARGS...: plays into NAME.npy; status, report and messages are looked at by the caller
play() {
  local name=$1
  shift
  "$work/moved/bin/quarn" play "$work/moving.json" --frames 1-11 --json -o "$work/$name.npy" "$@" \
    >"$work/$name.json" 2>"$work/err" || fail "play $*: status $?"
}
reports() { grep -Pqz -- "$2" "$work/$1.json" || fail "$1: not /$2/ in: $(cat "$work/$1.json")"; }

"$cmake" --install "$build" --prefix "$work/prefix" >/dev/null
mv "$work/prefix" "$work/moved"
moving_wave "$work/moved/bin/quarn" "$work" </dev/null
if "$work/moved/bin/quarn" info --devices | grep -q 'no OpenCL device'; then
  echo "there is no OpenCL device: the installed kernels were not run"
  exit 77
fi

play cpu
play gpu --evaluator gpu
reports gpu '"onGpu": 10,\s*"onCpu": 1,\s*"fallbacks": 0'
[[ ! -s $work/err ]] || fail "messages of a play on the device"

for kernel in "$work"/moved/share/OpenQuarn/GPUBuiltInDeformer/kernels/*.cl; do
  mv "$kernel" "$work/gone"
  play fallback --evaluator gpu
  mv "$work/gone" "$kernel"
  reports fallback '"onGpu": 0,\s*"onCpu": 11,\s*"fallbacks": 10'
  if [[ $(wc -l <"$work/err") != 1 ]] || ! grep -q "^warning: .*/${kernel##*/}\"" "$work/err"; then
    fail "not one warning of $kernel"
  fi
  cmp "$work/fallback.npy" "$work/cpu.npy" || fail "other frames than the CPU's without $kernel"
done
exit $bad
