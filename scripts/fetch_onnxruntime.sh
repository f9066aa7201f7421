#!/usr/bin/env bash
# Puts ONNX Runtime (headers, Linux x64 library, licence) into build/deps/onnxruntime, unless one is given already.
# It comes from a pinned npm package whose content is checked against the hash below before anything is unpacked.
set -euo pipefail
cd "$(dirname "$0")/.."
. scripts/common.sh
. scripts/npm_package.sh

package=com.github.asus4.onnxruntime
version=0.4.9
integrity=BkzxduSZ9IkeDP6Q8lz2TFU2ie7hSSvS7ZIfzMooExoq0CNzJnuuGaUJ7IsojBgqO4ouD1jXah8OYyJbCN29Fg==
target=build/deps/onnxruntime
headers="package/Plugins/iOS~/onnxruntime.xcframework/ios-arm64/onnxruntime.framework/Headers"
library=package/Plugins/Linux/x64/libonnxruntime.so

# The same places, in the same order, as cmake/FindOnnxRuntime.cmake.
is_given() {
  local prefix prefixes
  IFS=':;' read -ra prefixes <<<"${CMAKE_PREFIX_PATH:-}"
  for prefix in "${prefixes[@]}" /usr/local /usr; do
    compgen -G "$prefix/lib*/cmake/onnxruntime/onnxruntimeConfig.cmake" >/dev/null && return 0
    compgen -G "$prefix/lib/*/cmake/onnxruntime/onnxruntimeConfig.cmake" >/dev/null && return 0
  done
  [[ -n ${ONNXRUNTIME_ROOT:-} ]] || return 1
  compgen -G "$ONNXRUNTIME_ROOT/lib*/libonnxruntime.so*" >/dev/null ||
    fail "ONNXRUNTIME_ROOT=$ONNXRUNTIME_ROOT holds no lib/libonnxruntime.so; unset it to fetch the pinned one"
}

unpack() {
  local archive=$1 staging
  say "unpacking ONNX Runtime into $target"
  mkdir -p build/deps
  staging=$(mktemp -d build/deps/onnxruntime.XXXXXX)
  tar -xzf "$archive" --no-same-owner -C "$scratch" "$headers" "$library" package/LICENSE
  mkdir "$staging/lib"
  mv "$scratch/$headers" "$staging/include"
  mv "$scratch/$library" "$staging/lib/"
  ln -s libonnxruntime.so "$staging/lib/libonnxruntime.so.1" # its SONAME, which the loader asks for
  mv "$scratch/package/LICENSE" "$staging/"
  printf '%s\n' "$integrity" >"$staging/stamp"
  chmod -R u+rwX,go+rX "$staging"
  publish_folder "$staging" "$target"
}

is_given && exit 0
[[ -e $target/stamp && $(<"$target/stamp") == "$integrity" ]] && exit 0
[[ $(uname -m) == x86_64 ]] ||
  fail "the pinned ONNX Runtime is for x86-64 processors: set ONNXRUNTIME_ROOT to one for this machine"
if [[ ${1:-} == --what ]]; then # what would be loaded, and how much
  say_what_to_load "ONNX Runtime" 150 "$package" "$version"
  exit 0
fi

cache=$(cache_folder)
scratch=$(mktemp -d "$cache/fetch.XXXXXX")
trap 'rm -rf "$scratch"' EXIT
npm_package "$package" "$version" "$integrity" "$scratch" ", or set ONNXRUNTIME_ROOT"
unpack "$archive"
