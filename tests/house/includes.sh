#!/usr/bin/env bash
# includes.sh ROOT: reads every C++ file of every layer under ROOT and lists the includes that layers.txt, beside this
# script, does not allow. Exit status 1 when there is one.
set -euo pipefail
shopt -s extglob
here=$(cd "$(dirname "$0")" && pwd)
cd "$1"

declare -A patterns_of=() prefix_of=() allowed_of=() is_prefix=()
free=()

read_table() {
  local kind name rest
  while read -r kind name rest; do
    case $kind in
      library) patterns_of[$name]=$rest ;;
      layer)
        prefix_of[$name]=${rest%% *}
        is_prefix[${rest%% *}]=yes
        allowed_of[$name]=$rest # its own prefix first
        ;;
      free) read -ra free <<<"$name $rest" ;;
    esac
  done < <(sed 's/#.*//' "$here/layers.txt")
}

# The layer of a file is the row with the longest folder that the file lies in; sets `layer`.
find_layer() {
  layer=$(dirname "$1")
  while [[ ! ${prefix_of[$layer]:-} && $layer == */* ]]; do layer=${layer%/*}; done
  [[ ${prefix_of[$layer]:-} ]]
}

is_standard() {
  [[ $1 != *[./]* || $1 == @(assert|ctype|errno|float|limits|math|signal|stdarg|stddef|stdint|stdio|stdlib|string|time).h ]]
}

is_allowed() {
  local file=$1 quote=$2 name=$3 right pattern
  [[ $name != *../* && $name != /* ]] || return 1
  if [[ $quote == '<' ]] && is_standard "$name"; then return 0; fi

  # a quoted name without any layer's prefix is a file beside this one (or below it, in the same layer)
  if [[ $quote == '"' && ! ${is_prefix[${name%%/*}]:-} && -e $(dirname "$file")/$name ]]; then
    local own=$layer
    find_layer "$(dirname "$file")/$name" && [[ $layer == "$own" ]]
    return
  fi

  for right in ${allowed_of[$layer]}; do
    for pattern in ${patterns_of[$right]:-"$right/*"}; do
      # shellcheck disable=SC2053 # the right side is a pattern
      [[ $name == $pattern ]] && return 0
    done
  done
  return 1
}

read_table
set -f # patterns are matched, never expanded to file names

bad=0
complain() {
  printf '%s\n' "$*"
  bad=1
}

is_free() {
  local folder
  for folder in "${free[@]}"; do [[ $1 == "$folder"/* ]] && return 0; done
  return 1
}

mapfile -t files < <(find . \( -path ./build -o -name '.?*' \) -prune -o -type f \
  \( -name '*.h' -o -name '*.hpp' -o -name '*.cpp' -o -name '*.cc' -o -name '*.inl' \) -printf '%P\n' | sort)
((${#files[@]})) || complain "no C++ file under $1"

for file in "${files[@]}"; do
  is_free "$file" && continue
  find_layer "$file" || {
    complain "$file: lies in no layer of layers.txt"
    continue
  }
  own=$layer
  while IFS=: read -r line text; do
    layer=$own
    if [[ $text =~ ^[[:space:]]*#[[:space:]]*include(_next)?[[:space:]]*([\"\<])([^\"\>]+) ]]; then
      is_allowed "$file" "${BASH_REMATCH[2]}" "${BASH_REMATCH[3]}" ||
        complain "$file:$line: $own may not include ${BASH_REMATCH[3]}"
    else
      complain "$file:$line: an include that cannot be read: $text"
    fi
  done < <(grep -nE '^[[:space:]]*#[[:space:]]*include' "$file")
done
exit $bad
