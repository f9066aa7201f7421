#!/usr/bin/env bash
# hooks.sh ROOT: ./run hooks and ./run format at work, in a small checkout and a worktree of it.
set -euo pipefail
root=$1
command -v git clang-format-14 >/dev/null || {
  echo "skipped: there is no git, or no clang-format-14"
  exit 77
}
place=$(mktemp -d)
trap 'rm -rf "$place"' EXIT
export GIT_CONFIG_GLOBAL=/dev/null GIT_CONFIG_SYSTEM=/dev/null
export GIT_{AUTHOR,COMMITTER}_NAME=nobody GIT_{AUTHOR,COMMITTER}_EMAIL=nobody
unset GIT_DIR GIT_WORK_TREE GIT_INDEX_FILE # as git sets them for a hook that runs this
failed=0
wrong() {
  printf '%s\n' "$*"
  failed=1
}

mkdir -p "$place/a/tests" "$place/a/libraries/geometry"
cd "$place/a"
cp -r "$root/run" "$root/scripts" "$root/.clang-format" .
cp -r "$root/tests/house" tests/
sed -n '/^library/p' "$root/tests/house/layers.txt" >tests/house/layers.txt
printf 'layer libraries/geometry quill tbb\nfree tests\n' >>tests/house/layers.txt
printf 'build/\n' >.gitignore
git init -q . && git add -A && git commit -qm first
./run hooks >/dev/null && ./run hooks >/dev/null || wrong "the hook cannot be installed twice"

# try STATUS SAYS TEXT: committing a file with this text
try() {
  local status=0 said
  printf '%s\n' "$3" >libraries/geometry/bulk.cpp
  git add -A
  said=$(git commit -qm try 2>&1) || status=1
  [[ $status == "$1" && $said == *"$2"* ]] || wrong "committing '$3': status $status, said: $said"
}
try 0 '' 'int a;'
try 1 'bulk.cpp: its format is not that' 'int  a ;'
try 1 'bulk.cpp:1: libraries/geometry may not include CL/cl.h' '#include <CL/cl.h>'
# what counts is what is staged
printf 'int b;\n' >libraries/geometry/bulk.cpp
git add -A
printf 'int  c ;\n' >libraries/geometry/bulk.cpp
git commit -qm "what is staged" || wrong "what is not staged was looked at"
[[ $(./run format) == *libraries/geometry/bulk.cpp*"1 of "*" files changed"* ]] ||
  wrong "format does not say what it changed"
[[ $(<libraries/geometry/bulk.cpp) == 'int c;' ]] || wrong "format did not format"

git worktree add -q "$place/b"
cd "$place/b"
try 1 'bulk.cpp: its format is not that' 'int  d ;'
git rm -qrf scripts/pre_commit.sh
try 0 '' 'int  e ;' # a branch that has no such script yet

cd "$place/a"
echo true >.git/hooks/pre-commit
said=$(./run hooks 2>&1) && wrong "a hook of somebody else was replaced"
[[ $said == *"not ours, and stays"* && $(<.git/hooks/pre-commit) == true ]] ||
  wrong "of a hook of somebody else it says: $said"
exit $failed
