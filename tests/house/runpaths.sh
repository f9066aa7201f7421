#!/usr/bin/env bash
# runpaths.sh FOLDER: every program and library below it looks for its libraries in absolute folders, or in such that
# lie beside itself. An empty or relative element of a RUNPATH is the current folder of whoever starts it. Exit status 1
# when there is one, or nothing to look at.
set -euo pipefail

mapfile -t files < <(find "$1" -type f \( -perm /111 -o -name '*.so' -o -name '*.so.*' \) | sort)
((${#files[@]})) || {
  printf 'no program below %s\n' "$1"
  exit 1
}

# a line "FILE: RUNPATH" for each that has one; readelf complains of scripts, and goes on
{ LC_ALL=C readelf --dynamic --wide -- "${files[@]}" /dev/null 2>/dev/null || true; } | awk '
  /^File: / { file = substr($0, 7) }
  /\((RPATH|RUNPATH)\)/ { sub(/^[^[]*\[/, ""); sub(/\]$/, ""); print file ": " $0 }' | {
  seen=0 bad=0
  while IFS= read -r line; do
    seen=1
    path=${line##*: }
    while IFS= read -r -d : element; do
      case $element in
        /* | '$ORIGIN' | '$ORIGIN'/*) ;;
        *)
          printf '%s: element "%s"\n' "$line" "$element"
          bad=1
          ;;
      esac
    done <<<"$path:"
  done
  ((seen)) || printf 'nothing below %s has a RUNPATH\n' "$1"
  ((seen && !bad))
}
