#!/usr/bin/env bash
# places.sh ROOT: what is done at one place of the product is done at no second one: reading JSON, beginning a NumPy
# file, putting a new file into the place of an old one. Nor does the name of a type mean two things in one namespace:
# the linker would take the functions of either for both. Lists what is found elsewhere, or no more at its place. Exit
# status 1 when there is something.
set -euo pipefail
cd "$1"
bad=0

# only_at WHAT PATTERN FILE...: a line of each file matches, comments aside, and no other line of the product
only_at() {
  local what=$1 pattern=$2 found
  shift 2
  found=$(grep -rnE --include='*.cpp' --include='*.h' "$pattern" libraries host plugin quarn clients | sed 's|//.*||' |
    grep -E "$pattern") || [[ -z $found ]]
  [[ $(cut -d: -f1 <<<"$found" | sort) == "$(printf '%s\n' "$@")" ]] && return
  printf '%s, which belongs into %s alone:\n%s\n' "$what" "$*" "$found"
  bad=1
}

# "namespace::Type file" of each type that a file defines, those of unnamed namespaces aside
types() {
  find libraries host plugin quarn clients -name '*.h' -o -name '*.cpp' | sort | xargs awk '
    FNR == 1 { space = ""; isUnnamed = 0 }
    /^namespace [{]/ { isUnnamed = 1 }
    /^[}] \/\/ namespace$/ { isUnnamed = 0 }
    /^namespace [A-Za-z]/ { space = $2 }
    !isUnnamed && /^(struct|class) [A-Za-z0-9_]+( final)?( :.*)? *[{]/ { print space "::" $2, FILENAME }' | sort -u
}

twice=$(types | awk '{ files[$1] = files[$1] " " $2 } files[$1] ~ / .* / { print $1 ":" files[$1] }')
if [[ $twice ]]; then
  printf 'names that stand for two types:\n%s\n' "$twice"
  bad=1
fi

storage=libraries/storage
only_at "calls a JSON parser" '\b(Iterative)?Parse(Stream|Insitu|Init|Next)?[<(]' $storage/Json.cpp
only_at "has the first bytes of a NumPy file" '[^\\]\\(x93|223)NUMPY' $storage/npyHeader.cpp
# of folders by two calls, of files by one
only_at "renames" '\brename(at2?)?\(' $storage/Folder.cpp $storage/Folder.cpp $storage/TemporaryFile.cpp
only_at "encodes base 64" 'xyz0123456789\+/' $storage/encodings.cpp
exit $bad
