# shellcheck shell=bash
# Ends a test, in one word, where Blender or its Python's NumPy is missing: it fails then where NW_ALL_CLIENTS is set.
if ! blender -b --python-exit-code 1 --python-expr 'import numpy' >/dev/null 2>&1; then
  [[ ${NW_ALL_CLIENTS:-} ]] && echo "failed: no Blender, or none with NumPy" && exit 1
  echo "skipped: no Blender, or none with NumPy"
  exit 77
fi
