#!/usr/bin/env bash
# package.sh BUILD: packs what is installed, unpacks the archive, moves it, and goes from the hand's file to a
# trained model with nothing but that and a Python: no word of it may lead back into the source or the build tree.
set -euo pipefail
build=$1
cd "$(dirname "$0")/../.."
source=$PWD
. scripts/common.sh
python=$(scripts/find_python.sh) || {
  echo "skipped: there is no Python for the trainer"
  exit 77
}
scripts/fetch_hand.sh
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

# or_tell LOG COMMAND...: what it said, when it fails
or_tell() {
  local log=$1
  shift
  "$@" >"$log" 2>&1 || {
    cat "$log"
    fail "$*"
  }
}

pack() { or_tell "$work/cpack.log" cpack -G "$1" --config "$build/CPackConfig.cmake" -B "$work/packages"; }

# --- the archive: unpacked and moved ---
pack TGZ
mkdir "$work/unpacked"
tar -xzf "$work"/packages/*.tar.gz -C "$work/unpacked"
mv "$work"/unpacked/* "$work/moved"
[[ -s $work/moved/README.md ]] || fail "the archive does not say what it needs"
grep -rlF -e "$source" -e "$build" "$work/moved" && fail "these files name the source or the build tree"
cp build/deps/hand/left.glb "$work/left.glb"

# --- the trainer in an environment of its own, without a network ---
"$python" -m venv --system-site-packages "$work/env"
cp -r "$work/moved/share/neuralWarp" "$work/trainer"
PIP_NO_INDEX=1 or_tell "$work/pip.log" \
  "$work/env/bin/python" -m pip install -q --no-build-isolation --no-deps "$work/trainer"

# --- from the hand to a model, as docs/installed.md says it ---
# installed COMMAND...: in the folder of the work, with no other environment than a user's
installed() {
  (cd "$work" && env -i HOME="$work/home" PATH="$work/moved/bin:${python%/*}:/usr/bin:/bin" LANG=C.UTF-8 \
    POCL_CACHE_DIR="$work/pocl" "$@") >"$work/said" 2>"$work/errors" || {
    cat "$work/said" "$work/errors"
    fail "$*"
  }
}
mkdir "$work/home" "$work/pocl"
sed -n '/^hand=share/,/^```$/{/^```$/d;p}' "$work/moved/share/doc/neuralWarp/README.md" |
  sed -e "s,\bshare/neuralWarp,moved/&," -e "s,^bin/,moved/bin/," -e "s,^python3 ,$python ," \
    -e 's/--samples 600/--samples 60/' -e 's/--epochs 250/--epochs 20/' >"$work/commands"
(($(wc -l <"$work/commands") == 9)) || fail "docs/installed.md has other commands than this test knows"
mkdir "$work/work"
installed bash -euo pipefail commands
installed quarn info work/models/hand.nwrp --scene work/poses.json
grep -qx fits "$work/said" || fail "the model does not fit the scene"
installed env/bin/neuralwarp-train evaluate work/data work/models/hand.nwrp --json
"$python" -c '
import json, sys
errors = json.load(open(sys.argv[1]))
if errors["ranWith"] != "quarn" or not errors["network"]["mean"]["mm"] < 0.9 * errors["base"]["mean"]["mm"]:
    sys.exit(f"the model is no better than none: {errors}")' "$work/said"
if [[ -e $build/clients/viewer/viewer.html ]]; then
  installed quarn view work/poses.json -o work/hand.html --frames 1-5
  grep -q 'id="block-basis.values"' "$work/work/hand.html" || fail "quarn view has written no page of the hand"
  grep -q 'Permission is hereby granted' "$work/moved/share/doc/neuralWarp/LICENSE.three" || fail "three.js has no licence"
else
  echo "the page of quarn view was not built: that part is not tried"
fi
installed env PYTHONPATH=moved/lib/python3 "$python" -c "import neuralwarp; neuralwarp.Scene"
for program in quarn neuralwarp-train neuralwarp-farm env/bin/neuralwarp-train; do
  installed "$program" --version
  [[ $(<"$work/said") == *" $(<VERSION)" ]] || fail "$program is not of version $(<VERSION)"
done

# --- the Debian package, where there is what makes one ---
have dpkg-shlibdeps && have file || {
  echo "without dpkg-dev and file no Debian package can be made here: that part is not tried"
  exit 0
}
pack DEB
deb=("$work"/packages/*.deb)
dpkg-deb --extract "${deb[0]}" "$work/root"
needs=$(dpkg-deb --field "${deb[0]}" Depends)
for package in libtbb12 libassimp5 libmeshoptimizer2d libpugixml1v5 ocl-icd-libopencl1 python3-torch python3-onnx; do
  [[ $needs == *"$package"* ]] || fail "the Debian package does not need $package: $needs"
done
[[ $(dpkg-deb --field "${deb[0]}" Version) == "$(<VERSION)"* ]] || fail "the Debian package has another version"
for program in quarn neuralwarp-train neuralwarp-farm; do installed "$work/root/usr/bin/$program" --version; done
