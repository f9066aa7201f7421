#!/usr/bin/env bash
# Puts a parser of USD for node, and its licence, into build/deps/tinyusdz: a test reads what quarn writes by it. It
# comes from a pinned npm package whose content is checked against the hash below before anything is unpacked; of its
# dependencies, which are for showing a scene, none is fetched.
set -euo pipefail
cd "$(dirname "$0")/.."
. scripts/common.sh
. scripts/npm_package.sh

package=tinyusdz
version=0.9.0-rc10
integrity=MgToqEIhJoYaS4obCVHLllKjkMGiIQQqxDS9BO6GdvVQRpL6TQ/0kow4SOo1zQDwNv9EjYcJtHiPr506v+XOXg==
target=build/deps/tinyusdz

unpack() {
  local archive=$1 staging
  say "unpacking the parser of USD into $target"
  mkdir -p build/deps
  staging=$(mktemp -d build/deps/tinyusdz.XXXXXX)
  tar -xzf "$archive" --no-same-owner --strip-components 1 -C "$staging" \
    package/tinyusdz.js package/tinyusdz.wasm package/LICENSE
  mv "$staging/tinyusdz.js" "$staging/tinyusdz.mjs" # a module, which its package does not tell node
  printf '%s\n' "$integrity" >"$staging/stamp"
  chmod -R u+rwX,go+rX "$staging"
  publish_folder "$staging" "$target"
}

[[ -e $target/stamp && $(<"$target/stamp") == "$integrity" ]] && exit 0

cache=$(cache_folder)
scratch=$(mktemp -d "$cache/fetch.XXXXXX")
trap 'rm -rf "$scratch"' EXIT
npm_package "$package" "$version" "$integrity" "$scratch" ""
unpack "$archive"
