#!/usr/bin/env bash
# wheel.sh BUILD: packs the Python module and the add-on of Blender from what is installed, looks at what they carry, and
# tries both as a user has them: the wheel in an environment of its own, the zip installed by Blender.
set -euo pipefail
build=$1
cd "$(dirname "$0")/../.."
source=$PWD
. scripts/common.sh

# missing WHAT: ends the test, or fails it where nothing may be missing
missing() {
  [[ ${NW_ALL_CLIENTS:-} ]] && fail "$1"
  echo "skipped: $1"
  exit 77
}
have patchelf || missing "no patchelf"
python=$(scripts/find_python.sh) || missing "no Python"
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

# or_tell COMMAND...: what it said, when it fails
or_tell() {
  "$@" >"$work/said" 2>&1 || {
    cat "$work/said"
    fail "$*"
  }
}

or_tell cmake --install "$build" --prefix "$work/prefix"
mv "$work/prefix" "$work/moved"
or_tell "$python" scripts/pack_python.py "$work/moved" "$work/packages"
version=$(<VERSION)
wheel=$work/packages/neuralwarp-$version-$("$python" -c '
import sys; print("cp%d%d" % sys.version_info[:2])')
wheel=$(compgen -G "$wheel-*-linux_$(uname -m).whl") || fail "no such wheel: $(ls "$work/packages")"
add_on=$work/packages/neuralwarp_blender-$version.zip

# --- what is carried along ---
runtime='^(lib(c|m|dl|pthread|rt|gcc_s|stdc\+\+)\.so\.[0-9]+|ld-linux-x86-64\.so\.2)$'
# judge FOLDER: the package neuralwarp as it was packed
judge() {
  local file name
  for name in $(readelf -dW "$1"/*.so* | sed -n 's/.*(NEEDED).*\[\(.*\)\]$/\1/p' | sort -u); do
    [[ -s $1/$name || $name =~ $runtime ]] || fail "$name is needed and not there"
  done
  for file in _core.*.so _scene.*.so neuralWarp.so resources/*/kernels/*.cl; do
    [[ -s $(compgen -G "$1/$file" | head -n 1) ]] || fail "$file is not there"
  done
  for name in '' .onnxruntime .libtbb12 .ocl-icd-libopencl1 .zlib1g .pybind11-dev .rapidjson-dev; do
    [[ -s $1/licences/LICENSE$name ]] || fail "there is no licences/LICENSE$name"
  done
  for file in "$1"/*.so*; do
    readelf -dW "$file" | grep -qF 'runpath: [$ORIGIN]' || fail "${file##*/} looks for its libraries elsewhere"
  done
  ! readelf -SW "$1"/*.so* | grep -E '\.(symtab|debug_info)' || fail "symbols were left in"
  ! grep -rlF -e "$source" -e "$build" -e "$work" "$1" || fail "these files name the source, the build or the work"
}
"$python" -m zipfile -e "$wheel" "$work/wheel"
"$python" -m zipfile -e "$add_on" "$work/zip"
judge "$work/wheel/neuralwarp"
diff -r "$work/wheel/neuralwarp" "$work/zip/neuralwarp_blender/lib/neuralwarp" || fail "the wheel and the add-on carry different modules"
grep -qx "version = \"$version\"" "$work/zip/neuralwarp_blender/blender_manifest.toml" ||
  fail "blender_manifest.toml is not of version $version"

# --- the wheel, without a network, and used from another folder ---
or_tell "$python" -m venv --system-site-packages "$work/env"
PIP_FIND_LINKS= or_tell "$work/env/bin/python" -m pip install -q --no-index "$wheel[train]"
cp -r examples/wave "$work/wave"
mkdir "$work/elsewhere"
# elsewhere COMMAND...: with no other environment than a user's
elsewhere() {
  or_tell env -C "$work/elsewhere" -i HOME="$work/elsewhere" PATH=/usr/bin:/bin LANG=C.UTF-8 \
    BLENDER_USER_SCRIPTS="$work/scripts" "$@"
}
elsewhere "$work/env/bin/neuralwarp-train" --help
elsewhere "$work/env/bin/neuralwarp-train" --version
[[ $(<"$work/said") == *" $version" ]] || fail "the wheel's trainer is not of version $version"
elsewhere "$work/env/bin/python" "$source/tests/house/packed_module.py" "$work/env" "$work/wave"

# --- and as it is installed ---
elsewhere env PYTHONPATH="$work/moved/lib/python3" "$python" "$source/tests/house/packed_module.py" \
  "$work/moved" "$work/wave"
elsewhere env PYTHONPATH="$work/moved/lib/python3" "$python" -m neuralwarp_trainer --help

# --- the add-on ---
. tests/clients/blender/needs_blender.sh
elsewhere blender -b --factory-startup --python-exit-code 1 --python "$source/tests/house/packed_module.py" -- \
  "$add_on" "$work/scripts" "$work/wave"
