#!/usr/bin/env bash
# pre_commit.sh: looks at what is staged, not at the working tree: the format of the C++ files, and who includes whom.
# Exit status 1 when something is to be mended. ./run hooks makes git call it.
set -euo pipefail
cd "$(git rev-parse --show-toplevel)"

mapfile -t -d '' staged < <(git diff --cached --name-only --diff-filter=ACMR -z -- '*.cpp' '*.h')
((${#staged[@]})) || exit 0
tree=$(mktemp -d)
trap 'rm -rf "$tree"' EXIT
git checkout-index --all --prefix="$tree/"

bad=0
command -v clang-format-14 >/dev/null || {
  printf 'pre_commit: there is no clang-format-14; ./run hooks installs it\n' >&2
  exit 1
}
for file in "${staged[@]}"; do
  clang-format-14 --dry-run --Werror "$tree/$file" >/dev/null 2>&1 || {
    printf '%s: its format is not that of .clang-format; ./run format, and stage it again\n' "$file" >&2
    bad=1
  }
done
"$tree/tests/house/includes.sh" "$tree" >&2 || bad=1
exit $bad
