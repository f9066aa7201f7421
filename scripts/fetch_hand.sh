#!/usr/bin/env bash
# Puts the rigged hand of the demo, and its licence, into build/deps/hand. It comes from a pinned npm package whose
# content is checked against the hash below before anything is unpacked.
set -euo pipefail
cd "$(dirname "$0")/.."
. scripts/common.sh
. scripts/npm_package.sh

package=@webxr-input-profiles/assets
version=1.0.20
integrity=V/8NB4Ywgm//TBVMgo0TgJ9DtxsBoo0iiaF8AdfiP0F0cgbwkuQycEZAIOsplyd/iZ8L3mrFYNJBC6rzQb4tJA==
model=package/dist/profiles/generic-hand/left.glb
target=build/deps/hand

unpack() {
  local archive=$1 staging
  say "unpacking the hand into $target"
  mkdir -p build/deps
  staging=$(mktemp -d build/deps/hand.XXXXXX)
  tar -xzf "$archive" --no-same-owner -C "$scratch" "$model" package/LICENSE.md
  mv "$scratch/$model" "$scratch/package/LICENSE.md" "$staging/"
  printf '%s\n' "$integrity" >"$staging/stamp"
  chmod -R u+rwX,go+rX "$staging"
  publish_folder "$staging" "$target"
}

[[ -e $target/stamp && $(<"$target/stamp") == "$integrity" ]] && exit 0
if [[ ${1:-} == --what ]]; then # what would be loaded, and how much
  say_what_to_load "the hand" 94 "$package" "$version"
  exit 0
fi

cache=$(cache_folder)
scratch=$(mktemp -d "$cache/fetch.XXXXXX")
trap 'rm -rf "$scratch"' EXIT
npm_package "$package" "$version" "$integrity" "$scratch" ""
unpack "$archive"
