#!/usr/bin/env bash
# Puts ONNX Runtime (headers, Linux x64 library, licence) into build/deps/onnxruntime, unless one is given already.
# It comes from a pinned npm package whose content is checked against the hash below before anything is unpacked.
set -euo pipefail
cd "$(dirname "$0")/.."
. scripts/common.sh

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

is_intact() {
  local expected actual
  expected=$(base64 -d <<<"$integrity" | od -An -v -tx1 | tr -d ' \n')
  actual=$(sha512sum <"$1" | cut -d ' ' -f 1)
  [[ $actual == "$expected" ]]
}

# Leaves the verified archive in the cache; the last step of a download is a rename, so a broken one leaves nothing.
download() {
  local archive=$1 log=$scratch/npm.log
  need_packages npm
  say "fetching $package $version (150 MB)"
  (cd "$scratch" && npm pack --loglevel=error "$package@$version" </dev/null >"$log" 2>&1) ||
    fail "npm could not fetch $package@$version ($(grep -m 1 -i 'err' "$log" || tail -n 1 "$log")); check the network and npm's registry, or set ONNXRUNTIME_ROOT"
  is_intact "$scratch/$package-$version.tgz" ||
    fail "$package-$version.tgz does not have the pinned hash: check npm's registry, or set ONNXRUNTIME_ROOT"
  mv "$scratch/$package-$version.tgz" "$archive"
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
  chmod -R u+rwX,go+rX "$staging"
  publish_folder "$staging" "$target"
}

is_given && exit 0
[[ -e $target/lib/libonnxruntime.so.1 && -e $target/LICENSE ]] && exit 0

cache=$(cache_folder)
archive=$cache/$package-$version.tgz
scratch=$(mktemp -d "$cache/fetch.XXXXXX")
trap 'rm -rf "$scratch"' EXIT
if [[ -e $archive ]] && ! is_intact "$archive"; then
  say "the cached $archive is damaged: fetching it again"
  rm -f "$archive"
fi
[[ -e $archive ]] || download "$archive"
unpack "$archive"
