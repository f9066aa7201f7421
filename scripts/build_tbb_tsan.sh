#!/usr/bin/env bash
# Builds oneTBB for the thread sanitizer from Debian's own source package into build/deps/tbb-tsan. Debian's binary is
# not instrumented: with it the sanitizer cannot see how tasks are ordered, and reports races that are none.
set -euo pipefail
cd "$(dirname "$0")/.."
. scripts/common.sh

target=build/deps/tbb-tsan

# The machine's Debian sources with source packages instead of binary ones; other suppliers' sources are left out.
source_lists() {
  local codename file
  codename=$(. /etc/os-release && printf '%s' "$VERSION_CODENAME")
  for file in /etc/apt/sources.list /etc/apt/sources.list.d/*.list; do
    [[ -e $file ]] || continue
    awk -v codename="$codename" '
      { sub(/#.*/, "") }
      $1 == "deb" { for (i = 2; i < NF; ++i) if ($i ~ "^" codename) { $1 = "deb-src"; print; next } }' \
      "$file" >>"$1/machine.list"
  done
  for file in /etc/apt/sources.list.d/*.sources; do
    [[ -e $file ]] || continue
    # one stanza at a time: comments go, and so do stanzas that are switched off or not of this release
    sed '/^#/d' "$file" | awk -v RS= -v codename="$codename" '
      /(^|\n)Enabled: *no/ || $0 !~ "(^|\n)Suites:[^\n]*" codename { next }
      { sub(/(^|\n)Types:[^\n]*/, "\nTypes: deb-src"); sub(/^\n/, ""); print $0 "\n" }' >>"$1/machine.sources"
  done
}

# apt with lists, cache and sources of our own: the machine's configuration stays as it is. No root needed.
private_apt() {
  apt-get -q -o Dir::Etc::sourcelist=/dev/null -o Dir::Etc::sourceparts="$scratch/sources" \
    -o Dir::State::lists="$scratch/lists" -o Dir::Cache="$scratch/cache" \
    -o APT::Sandbox::User="$(id -un)" -o Debug::NoLocking=true "$@" </dev/null
}

fetch_source() {
  mkdir -p "$scratch"/{sources,lists/partial,cache/archives/partial,source}
  source_lists "$scratch/sources"
  private_apt update >"$scratch/apt.log" 2>&1 ||
    fail "apt-get update for source packages failed: $(grep -m 1 '^E:' "$scratch/apt.log")"
  # the version that is installed, or the newest where that one is no longer published
  (cd "$scratch/source" && { private_apt source "onetbb=$version" || private_apt source onetbb; }) \
    >>"$scratch/apt.log" 2>&1 ||
    fail "apt-get source onetbb failed: $(grep -m 1 '^E:' "$scratch/apt.log")"
}

configure_build_install() {
  local source=("$scratch"/source/onetbb-*/)
  cmake -S "${source[0]}" -B "$scratch/build" -G Ninja -DCMAKE_BUILD_TYPE=RelWithDebInfo \
    -DCMAKE_CXX_COMPILER=clang++-14 -DCMAKE_C_COMPILER=clang-14 -DCMAKE_INSTALL_PREFIX="$scratch/install" \
    -DCMAKE_INSTALL_LIBDIR=lib -DTBB_SANITIZE=thread -DTBB_TEST=OFF -DTBB_STRICT=OFF -DTBBMALLOC_BUILD=OFF &&
    cmake --build "$scratch/build" --parallel "$(job_count)" &&
    cmake --install "$scratch/build"
}

build() {
  say "building oneTBB $version for the thread sanitizer"
  configure_build_install >"$scratch/build.log" 2>&1 && return
  tail -n 30 "$scratch/build.log" >&2
  fail "oneTBB did not build for the thread sanitizer (its last lines are above)"
}

unpack() {
  local staging
  mkdir -p build/deps
  staging=$(mktemp -d build/deps/tbb-tsan.XXXXXX)
  tar -xzf "$1" -C "$staging" || { rm -rf "$staging" "$1"; return 1; }
  chmod u+rwX,go+rX "$staging"
  printf '%s\n' "$name" >"$staging/stamp"
  publish_folder "$staging" "$target"
}

need_packages clang-14 libclang-rt-14-dev cmake ninja-build libtbb-dev dpkg-dev
version=$(dpkg-query -W -f '${source:Version}' libtbb-dev 2>/dev/null) ||
  fail "the thread sanitizer's oneTBB is built from Debian's source package, and this machine has no dpkg"
name=tbb-tsan-$version-clang-$(clang++-14 -dumpversion)
[[ -e $target/stamp && $(<"$target/stamp") == "$name" ]] && exit 0
archive=$(cache_folder)/$name.tar.gz
if [[ -e $archive ]]; then
  say "taking oneTBB for the thread sanitizer from $archive"
  unpack "$archive" && exit 0
  say "it is damaged: building it again"
fi

scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
fetch_source
build
tar -czf "$archive.$$" -C "$scratch/install" .
mv "$archive.$$" "$archive"
unpack "$archive"
