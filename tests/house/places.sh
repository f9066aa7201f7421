#!/usr/bin/env bash
# places.sh ROOT: what is done at one place of the product is done at no second one: reading JSON, beginning a NumPy
# file, putting a new file into the place of an old one. Lists what is found elsewhere, or no more at its place. Exit
# status 1 when there is something.
set -euo pipefail
cd "$1"
bad=0

# only_at WHAT PATTERN FILE...: a line of each file matches, comments aside, and no other line of the product
only_at() {
  local what=$1 pattern=$2 found
  shift 2
  found=$(grep -rnE --include='*.cpp' --include='*.h' "$pattern" libraries host plugin quarn | sed 's|//.*||' |
    grep -E "$pattern") || [[ -z $found ]]
  [[ $(cut -d: -f1 <<<"$found" | sort) == "$(printf '%s\n' "$@")" ]] && return
  printf '%s, which belongs into %s alone:\n%s\n' "$what" "$*" "$found"
  bad=1
}

storage=libraries/storage
only_at "calls a JSON parser" '\b(Iterative)?Parse(Stream|Insitu|Init|Next)?[<(]' $storage/Json.cpp
only_at "has the first bytes of a NumPy file" '[^\\]\\(x93|223)NUMPY' $storage/npyHeader.cpp
# of folders by two calls, of files by one
only_at "renames" '\brename(at2?)?\(' $storage/Folder.cpp $storage/Folder.cpp $storage/TemporaryFile.cpp
only_at "encodes base 64" 'xyz0123456789\+/' $storage/encodings.cpp
exit $bad
