#!/usr/bin/env bash
# Plants one include at a time into a small tree and asks includes.sh for its verdict.
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
tree=$(mktemp -d)
trap 'rm -rf "$tree"' EXIT
failed=0

# try VERDICT FILE LINE: allowed, or refused with a message that names the place
try() {
  local verdict=$1 file=$2 line=$3 output status=0
  rm -rf "${tree:?}"/*
  mkdir -p "$tree"/{libraries/geometry/quill,libraries/model/nw_model,plugin/deformer} "$tree/$(dirname "$file")"
  touch "$tree/libraries/geometry/local.h" "$tree/libraries/geometry/quill/val3.h" "$tree/libraries/model/nw_model/session.h"
  printf '// first line\n%s\n' "$line" >"$tree/$file"
  output=$("$here/includes.sh" "$tree" 2>&1) || status=$?
  case $verdict in
    allowed) [[ $status == 0 && -z $output ]] ;;
    refused) [[ $status == 1 && $output == *"$file:2: "* ]] ;;
    no_layer) [[ $status == 1 && $output == *"$file: "* ]] ;;
  esac && return
  printf 'expected %s: %s in %s\nstatus %s, output: %s\n' "$verdict" "$line" "$file" "$status" "$output"
  failed=1
}

try allowed libraries/geometry/bulk.cpp '#include <vector>'
try allowed libraries/geometry/bulk.cpp '#include "quill/val3.h"'
try allowed libraries/geometry/bulk.cpp '#include "local.h"'
try allowed libraries/geometry/bulk.cpp '#include <oneapi/tbb/parallel_for.h>'
try allowed libraries/geometry/kernel.cpp '#include <immintrin.h>'
try allowed plugin/deformer/node.cpp '#include "nw_model/session.h"'
try allowed host/api/openquarn/gpu/HGpu.h '#include <CL/cl.h>'
try allowed tests/libraries/geometry/a.cpp '#include "nw_model/session.h"'
try allowed libraries/geometry/bulk.cpp '// #include <onnxruntime_cxx_api.h>'

try refused libraries/geometry/bulk.cpp '#include "nw_model/session.h"'
try refused libraries/geometry/bulk.cpp '  #  include <nw_model/session.h>'
try refused libraries/geometry/bulk.cpp '#include <onnxruntime_cxx_api.h>'
try refused libraries/geometry/bulk.cpp '#include "../model/nw_model/session.h"'
try refused libraries/geometry/bulk.cpp '#include "quill/../../model/nw_model/session.h"'
try refused libraries/geometry/bulk.cpp '#include "missing.h"'
try refused libraries/geometry/bulk.cpp '#include <unistd.h>'
try refused libraries/geometry/bulk.cpp '#include SOME_MACRO'
try refused libraries/geometry/quill/up.h '#include "deformer/node.h"'
try refused libraries/model/ModelSession.cpp '#include "quill/val3.h"'
try refused libraries/model/ModelSession.cpp '#include <emmintrin.h>'
try refused libraries/model/ModelSession.cpp '#include <tbb/parallel_for.h>'
try refused host/api/openquarn/HObject.h '#include <CL/cl.h>'
try refused host/api/openquarn/HObject.h '#include "gpu/HGpu.h"'
try refused plugin/deformer/node.cpp '#include "runtime/scene.h"'
try no_layer somewhere/else.cpp '#include <vector>'
exit $failed
