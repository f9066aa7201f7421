#!/usr/bin/env bash
# stubs.sh: the stubs of the extension modules say what is in them, by mypy's stubtest.
# Skipped, in one word, where mypy is missing; fails then where NW_ALL_CLIENTS is set.
set -euo pipefail
python=$(scripts/find_python.sh)
if ! "$python" -c 'import mypy.stubtest' 2>/dev/null; then
  echo "skipped: no mypy"
  [[ ! ${NW_ALL_CLIENTS:-} ]] || exit 1
  exit 77
fi
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
# where the stubs are looked for, and no other code of the project
MYPYPATH=$(realpath "${PYTHONPATH%%:*}")
export MYPYPATH
printf '[mypy]\nfollow_imports = silent\n' >"$work/mypy.ini"
# not of the stubs: how pybind11 makes classes, those that nobody constructs, the plug-in, which is no module, and Python
printf '%s\n' 'neuralwarp(\._core|\._scene)?\.[A-Z]\w+' 'neuralwarp(\._core|\._scene)?\.(Model|Plugs|Scene)\.__init__' \
  'neuralwarp\.neuralWarp' 'neuralwarp\.training\..*' >"$work/allowed"
cd "$work"
"$python" -m mypy.stubtest --mypy-config-file mypy.ini --allowlist allowed --ignore-unused-allowlist neuralwarp
