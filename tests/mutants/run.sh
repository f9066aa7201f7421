#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# run.sh [--at COMMIT] [NAME...]: are the tests worth their lines? Each NAME.patch of this folder (all, without names) is
# a fault that somebody could make. It is planted in a scratch worktree of HEAD, or of the commit, the targets that its
# header names are built, and the tests that it names are run: "caught" when one of them fails. Exit status 1 when a
# mutant got away. By hand, as it takes a minute each; the worktree stays in build/mutants for the next time.
#   fault:    what is wrong, in one sentence
#   targets:  what has to be built for the tests to see it
#   tests:    of CTest, as a regular expression
# A patch finds its file by its name where the file has moved.
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
root=$(git -C "$here" rev-parse --show-toplevel)
commit=HEAD
if [[ ${1-} == --at ]]; then
  commit=$2
  shift 2
fi
commit=$(git -C "$root" rev-parse --verify "$commit^{commit}")
[[ $# -gt 0 ]] || set -- "$here"/*.patch
tree=$root/build/mutants/tree
log=$root/build/mutants/log
export CCACHE_BASEDIR=$tree CCACHE_NOHASHDIR=1

field() { sed -n "s/^$2: //p" "$here/$1.patch"; }
in_tree() { git -C "$tree" "$@"; }
build() { (cd "$tree" && cmake --build build/release --parallel "${NW_JOBS:-$(nproc)}" --target "$@"); }
tests() { (cd "$tree" && ctest --test-dir build/release --no-tests=error --timeout 300 -j2 -R "$1"); }

# the patch without its header, for the file where it lies now
patch_for_tree() {
  local path now
  path=$(sed -n 's|^+++ b/||p' "$here/$1.patch")
  now=$path
  if [[ ! -e $tree/$path ]]; then
    now=$(in_tree ls-files "*/${path##*/}")
    [[ $now && $now != *$'\n'* ]] || now=$path
  fi
  sed -n "/^--- /,\$p" "$here/$1.patch" | sed "1,2s|$path|$now|"
}

mkdir -p "${tree%/*}"
[[ -e $tree ]] || git -C "$root" worktree add -q --detach "$tree" "$commit"
in_tree reset -q --hard
in_tree checkout -q --detach "$commit"
mkdir -p "$tree/build"
ln -sfn "$root/build/deps" "$tree/build/deps"
(cd "$tree" && cmake --preset release -D NW_BUILD_BENCH=OFF -D NW_REFERENCE_CASES="$root/../shared/cases") >"$log" 2>&1

escaped=0
declare -A sound
verdict() { printf '%-34s %s\n' "$1" "$2"; }
for name in "${@##*/}"; do
  name=${name%.patch}
  read -ra targets <<<"$(field "$name" targets)"
  pattern=$(field "$name" tests)
  # a test that fails without the fault catches nothing
  if [[ ! ${sound[$pattern]-} ]] && ! { build "${targets[@]}" && tests "$pattern"; } >"$log" 2>&1; then
    verdict "$name" "cannot be told: its tests fail without it (build/mutants/log)"
    exit 2
  fi
  sound[$pattern]=yes
  if ! patch_for_tree "$name" | in_tree apply >"$log" 2>&1; then
    verdict "$name" "DOES NOT APPLY"
    escaped=1
  elif ! build "${targets[@]}" >"$log" 2>&1; then
    verdict "$name" "DOES NOT BUILD"
    escaped=1
  elif tests "$pattern" >"$log" 2>&1; then
    skipped=$(sed -n 's/.* Test *#[0-9]*: \([^ ]*\) .*\*\*\*Skipped.*/\1/p' "$log" | head -n 1)
    verdict "$name" "GOT AWAY${skipped:+; skipped: $skipped}"
    escaped=1
  else
    verdict "$name" "caught by $(sed -n 's/^[[:space:]]*[0-9]* - \(.*\) (.*)$/\1/p' "$log" | head -n 1)"
  fi
  in_tree reset -q --hard
done
exit $escaped
