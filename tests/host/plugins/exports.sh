#!/usr/bin/env bash
# exports.sh PLUGIN...: each exports the three symbols of a plug-in and no other, and none that has to be unique in the
# process: the loader never unmaps a library that has one.
set -euo pipefail
expected='HApiVersion initializePlugin uninitializePlugin'
for plugin in "$@"; do
  symbols=$(LC_ALL=C readelf --dyn-syms --wide "$plugin")
  # columns: number, value, size, type, binding, visibility, section, name
  defined=$(awk '$1 ~ /^[0-9]+:$/ && $7 != "UND" && NF >= 8 { print $8 }' <<<"$symbols" | sort | xargs)
  unique=$(awk '$5 == "UNIQUE" { print $8 }' <<<"$symbols")
  if [[ $defined != "$expected" || $unique ]]; then
    printf '%s\n  exports: %s\n  unique: %s\n' "$plugin" "$defined" "$unique"
    exit 1
  fi
done
