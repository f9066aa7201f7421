#!/usr/bin/env bash
# Puts what the page of `quarn view` is bundled from into build/deps/viewer: three.js, which draws it, with its licence,
# and esbuild, a program of the build alone. They come from pinned npm packages whose content is checked against the
# hashes below before anything is unpacked.
set -euo pipefail
cd "$(dirname "$0")/.."
. scripts/common.sh
. scripts/npm_package.sh

three=(three 0.187.0 Qiu7R+Cmh8CstZsY1uJOSWnVlfo7ZtNLV7mF8Jltk3LB3AtDu9cRZlcnRKkAk8Y4z6KKw35z7Y7Urd7jWY8etA==)
esbuild=(@esbuild/linux-x64 0.28.2 4xTZr1FUmSoQW4XIWmit3tzQrUTZM+N3P0XV8xROKYF50XfI7xeO90+1bZvNwxIufQ9hDQVRJH5YhgPVF8A/HQ==)
target=build/deps/viewer
stamp=$(printf '%s\n' "${three[2]}" "${esbuild[2]}")

# unpack ARCHIVE NAME PATH...: those paths of a package, into a folder of that name beside the other package
unpack() {
  local archive=$1 name=$2
  shift 2
  mkdir -p "$staging/$name"
  tar -xzf "$archive" --no-same-owner --strip-components 1 -C "$staging/$name" "${@/#/package/}"
}

[[ -e $target/stamp && $(<"$target/stamp") == "$stamp" ]] && exit 0
if [[ ${1:-} == --what ]]; then # what would be loaded, and how much
  say_what_to_load "three.js" 5 "${three[@]:0:2}"
  say_what_to_load "esbuild" 5 "${esbuild[@]:0:2}"
  exit 0
fi
[[ $(uname -m) == x86_64 ]] || fail "the page of quarn view is bundled on x86-64 only"

cache=$(cache_folder)
scratch=$(mktemp -d "$cache/fetch.XXXXXX")
mkdir -p build/deps
staging=$(mktemp -d build/deps/viewer.XXXXXX)
trap 'rm -rf "$scratch" "$staging"' EXIT
npm_package "${three[@]}" "$scratch" "; without it the page of quarn view is left out"
unpack "$archive" three package.json LICENSE build/three.module.js build/three.core.js \
  examples/jsm/controls/OrbitControls.js
npm_package "${esbuild[@]}" "$scratch" "; without it the page of quarn view is left out"
unpack "$archive" esbuild bin/esbuild
say "unpacking three.js and esbuild into $target"
printf '%s\n' "$stamp" >"$staging/stamp"
chmod -R u+rwX,go+rX "$staging"
publish_folder "$staging" "$target"
