#!/usr/bin/env bash
# includes.sh ROOT [TABLE]: reads every C++ file of every layer under ROOT and lists the includes that TABLE, layers.txt
# beside this script if none is given, does not allow. The table itself is judged too: its folders and names exist, and
# no chain of "may include" leads back to where it began. Exit status 1 when there is something to list.
set -euo pipefail
shopt -s extglob
table=$(realpath "${2:-$(dirname "$0")/layers.txt}")
cd "$1"

declare -A patterns_of=() # of a library: its headers
declare -A prefix_of=()   # of a row's folder: how its headers are named
declare -A allowed_of=()  # of a row's folder: prefixes and libraries that it may include, its own prefix first
declare -A rows_of=()     # of a prefix: its rows' folders
rows=()                   # folders, as they stand in the table
free=()
bad=0

complain() {
  printf '%s\n' "$*"
  bad=1
}

read_table() {
  local kind name rest
  while read -r kind name rest; do
    case $kind in
      library) patterns_of[$name]=$rest ;;
      layer)
        [[ -d $name ]] || complain "${table##*/}: there is no folder $name"
        rows+=("$name")
        prefix_of[$name]=${rest%% *}
        rows_of[${rest%% *}]+=" $name"
        allowed_of[$name]=$rest
        ;;
      free) read -ra free <<<"$name $rest" ;;
    esac
  done < <(sed 's/#.*//' "$table")
}

# --- the table: a graph without a cycle ---

# How many folders two paths have in common from the root on; sets `common`.
count_common() {
  local -a a b
  IFS=/ read -ra a <<<"$1"
  IFS=/ read -ra b <<<"$2"
  for ((common = 0; common < ${#a[@]}; ++common)); do
    [[ ${a[common]} == "${b[common]:-}" ]] || return 0
  done
}

# The rows that row $1 means by prefix $2: of several that have it, those that lie nearest; sets `meant`.
find_meant() {
  local row common best=-1
  meant=()
  for row in ${rows_of[$2]:-}; do
    count_common "$1" "$row"
    ((common >= best)) || continue
    ((common == best)) || meant=()
    best=$common
    meant+=("$row")
  done
}

# Goes down from row $1; $2 is the way here: " -> quarn/play -> quarn/scene -> ".
declare -A state_of=()
descend() {
  local row=$1 way=$2 right next
  local -a meant
  state_of[$row]=open
  for right in ${allowed_of[$row]}; do
    [[ $right != "${prefix_of[$row]}" ]] || continue
    find_meant "$row" "$right"
    for next in "${meant[@]}"; do
      case ${state_of[$next]:-new} in
        new) descend "$next" "$way$next -> " ;;
        open) complain "${table##*/}: a cycle: $next -> ${way#*" -> $next -> "}$next" ;;
      esac
    done
  done
  state_of[$row]=closed
}

check_table() {
  local row right
  for row in "${rows[@]}"; do
    for right in ${allowed_of[$row]}; do
      [[ ${rows_of[$right]:-}${patterns_of[$right]:-} ]] ||
        complain "${table##*/}: $row: $right is no prefix and no library"
    done
    [[ ${state_of[$row]:-} ]] || descend "$row" " -> $row -> "
  done
}

# --- the files ---

# The row of a folder is the one with the longest folder that it lies in; sets `layer`, empty for none.
declare -A layer_of=()
find_layer() {
  layer=$1
  if [[ ! -v layer_of[$1] ]]; then
    while [[ ! ${prefix_of[$layer]:-} && $layer == */* ]]; do layer=${layer%/*}; done
    layer_of[$1]=${prefix_of[$layer]:+$layer}
  fi
  layer=${layer_of[$1]}
}

# The longest prefix of the table that a header's name begins with; sets `prefix`, empty for none.
find_prefix() {
  prefix=$1
  while [[ $prefix == */* ]]; do
    prefix=${prefix%/*}
    [[ ! ${rows_of[$prefix]:-} ]] || return 0
  done
  prefix=
}

standard_c='@(assert|ctype|errno|float|limits|math|signal|stdarg|stddef|stdint|stdio|stdlib|string|time).h'
is_standard() {
  # shellcheck disable=SC2053 # the right side is a pattern
  [[ $1 != *[./]* || $1 == $standard_c ]]
}

# Whether a file of folder $1, in row $2, may include $4, which stands behind the quote $3.
is_allowed() {
  local folder=$1 own=$2 quote=$3 name=$4 prefix layer right pattern
  [[ $name != *../* && $name != /* ]] || return 1
  if [[ $quote == '<' ]] && is_standard "$name"; then return 0; fi

  find_prefix "$name"
  # a quoted name without any layer's prefix is a file beside this one (or below it, in the same layer)
  if [[ $quote == '"' && ! $prefix && -e $folder/$name ]]; then
    [[ $name == */* ]] && folder+=/${name%/*}
    find_layer "$folder"
    [[ $layer == "$own" ]]
    return
  fi

  for right in ${allowed_of[$own]}; do
    [[ $right != "$prefix" ]] || return 0
    [[ ! ${rows_of[$right]:-} ]] || continue
    for pattern in ${patterns_of[$right]:-"$right/*"}; do
      # shellcheck disable=SC2053 # the right side is a pattern
      [[ $name == $pattern ]] && return 0
    done
  done
  return 1
}

is_free() {
  local folder
  for folder in "${free[@]}"; do [[ $1 == "$folder"/* ]] && return 0; done
  return 1
}

# The files that layers are made of; sets `files`.
find_files() {
  local file layer
  local -a all
  mapfile -t all < <(find . \( -path ./build -o -name '.?*' \) -prune -o -type f \
    \( -name '*.h' -o -name '*.hpp' -o -name '*.cpp' -o -name '*.cc' -o -name '*.inl' \) -printf '%P\n' | sort)
  ((${#all[@]})) || complain "no C++ file under $PWD"
  files=()
  for file in "${all[@]}"; do
    is_free "$file" && continue
    find_layer "${file%/*}"
    if [[ $layer ]]; then files+=("$file"); else complain "$file: lies in no layer of ${table##*/}"; fi
  done
}

check_files() {
  local file line text folder layer
  while IFS=: read -r file line text; do
    folder=${file%/*}
    find_layer "$folder"
    if [[ $text =~ ^[[:space:]]*#[[:space:]]*include(_next)?[[:space:]]*([\"\<])([^\"\>]+) ]]; then
      is_allowed "$folder" "$layer" "${BASH_REMATCH[2]}" "${BASH_REMATCH[3]}" ||
        complain "$file:$line: $layer may not include ${BASH_REMATCH[3]}"
    else
      complain "$file:$line: an include that cannot be read: $text"
    fi
  done < <(printf '%s\0' "${files[@]}" | xargs -0 grep -HnE '^[[:space:]]*#[[:space:]]*include')
}

set -f # patterns are matched, never expanded to file names
read_table
check_table
find_files
((${#files[@]} == 0)) || check_files
exit $bad
