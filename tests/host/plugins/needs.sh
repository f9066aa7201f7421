#!/usr/bin/env bash
# needs.sh LIBRARY NAME: the library names another one, whose file name begins with NAME, as needed.
set -euo pipefail
LC_ALL=C readelf --dynamic --wide "$1" | grep -E "\(NEEDED\).*\[$2\."
