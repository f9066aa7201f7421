#!/usr/bin/env bash
# Plants one include, or one table, at a time into a small tree and asks includes.sh for its verdict.
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
tree=$(mktemp -d)
trap 'rm -rf "$tree"' EXIT
failed=0

mapfile -t folders < <(awk '$1 == "layer" { print $2 }' "$here/layers.txt")

plant() {
  rm -rf "${tree:?}"/*
  mkdir -p "${folders[@]/#/$tree/}" "$tree"/libraries/{geometry/quill,model/nw_model}
  touch "$tree"/libraries/geometry/{local.h,quill/val3.h} "$tree"/libraries/model/nw_model/session.h
}

fail() {
  printf 'expected %s\nstatus %s, output: %s\n' "$@"
  failed=1
}

# try VERDICT FILE LINE: allowed, or refused with a message that names the place
try() {
  local verdict=$1 file=$2 line=$3 output status=0
  plant
  mkdir -p "$tree/$(dirname "$file")"
  printf '// first line\n%s\n' "$line" >"$tree/$file"
  output=$("$here/includes.sh" "$tree" 2>&1) || status=$?
  case $verdict in
    allowed) [[ $status == 0 && -z $output ]] ;;
    refused) [[ $status == 1 && $output == *"$file:2: "* ]] ;;
    no_layer) [[ $status == 1 && $output == *"$file: "* ]] ;;
  esac || fail "$verdict: $line in $file" "$status" "$output"
}

# try_table SENTENCE ROW...: what is said of a table of these rows, "FOLDER PREFIX MAY-INCLUDE..."; empty for nothing
try_table() {
  local sentence=$1 output status=0
  shift
  plant
  printf 'layer %s\n' "$@" >"$tree/table"
  touch "$tree/libraries/geometry/local.h"
  output=$("$here/includes.sh" "$tree/libraries" "$tree/table" 2>&1) || status=$?
  [[ $output == "${sentence:+table: $sentence}" && $status == $((${#sentence} > 0)) ]] ||
    fail "\"$sentence\" of a table" "$status" "$output"
}

try allowed libraries/geometry/bulk.cpp '#include <vector>'
try allowed libraries/geometry/bulk.cpp '#include "quill/val3.h"'
try allowed libraries/geometry/bulk.cpp '#include "local.h"'
try allowed libraries/geometry/bulk.cpp '#include <oneapi/tbb/parallel_for.h>'
try allowed libraries/geometry/kernel.cpp '#include <immintrin.h>'
try allowed plugin/deformer/node.cpp '#include "nw_model/session.h"'
try allowed libraries/frame/sampler.cpp '#include "quill/val3.h"'
try allowed host/api/openquarn/gpu/HGpu.h '#include <CL/cl.h>'
try allowed tests/libraries/geometry/a.cpp '#include "nw_model/session.h"'
try allowed libraries/geometry/bulk.cpp '// #include <onnxruntime_cxx_api.h>'
try allowed quarn/play/play.cpp '#include "quarn/scene/plugs.h"'
try allowed quarn/play/play.cpp '#include "quarn/play/report.h"'
try allowed quarn/main.cpp '#include "quarn/play/commands.h"'

try refused libraries/geometry/bulk.cpp '#include "nw_model/session.h"'
try refused libraries/geometry/bulk.cpp '  #  include <nw_model/session.h>'
try refused libraries/geometry/bulk.cpp '#include <onnxruntime_cxx_api.h>'
try refused libraries/geometry/bulk.cpp '#include "../model/nw_model/session.h"'
try refused libraries/geometry/bulk.cpp '#include "quill/../../model/nw_model/session.h"'
try refused libraries/geometry/bulk.cpp '#include "missing.h"'
try refused libraries/geometry/bulk.cpp '#include <unistd.h>'
try refused libraries/geometry/bulk.cpp '#include SOME_MACRO'
try refused libraries/geometry/quill/up.h '#include "deformer/node.h"'
try refused libraries/frame/sampler.cpp '#include "nw_model/session.h"'
try refused libraries/frame/sampler.cpp '#include "openquarn/HPoint.h"'
try refused libraries/model/ModelSession.cpp '#include "quill/val3.h"'
try refused libraries/model/ModelSession.cpp '#include <emmintrin.h>'
try refused libraries/model/ModelSession.cpp '#include <tbb/parallel_for.h>'
try refused host/api/openquarn/HObject.h '#include <CL/cl.h>'
try refused host/api/openquarn/HObject.h '#include "gpu/HGpu.h"'
try refused plugin/deformer/node.cpp '#include "runtime/scene.h"'
try allowed host/runtime/gpu/Chain.cpp '#include "geometry/MeshData.h"'
try refused host/runtime/geometry/MeshData.cpp '#include "gpu/Chain.h"'
try refused host/runtime/core/text.h '#include "values/invertMatrix.h"'
try refused host/runtime/commands/dispatch.cpp '#include <dlfcn.h>'
try no_layer host/runtime/rest.cpp '#include <vector>'
try refused quarn/play/play.cpp '#include "quarn/render/View.h"'
try refused quarn/play/play.cpp '#include "../render/View.h"'
try refused quarn/scene/plugs.cpp '#include "quarn/import/commands.h"'
try refused quarn/console/Console.cpp '#include "quarn/scene/plugs.h"'
try refused quarn/character/read.cpp '#include <quarn/scene/plugs.h>'
try refused quarn/play/play.cpp '#include "quarn/main.h"'
try refused quarn/main.cpp '#include "quarn/scene/plugs.h"'
try no_layer somewhere/else.cpp '#include <vector>'
try no_layer somewhere/alone.cpp ''

try_table '' 'geometry quill' 'model m quill' 'storage s m quill'
try_table 'there is no folder gone' 'geometry quill' 'gone g' 'model m quill'
try_table 'model: quil is no prefix and no library' 'geometry quill' 'model m quil'
try_table 'a cycle: model -> storage -> model' 'geometry quill m' 'model m s' 'storage s m'
try_table 'a cycle: geometry -> model -> storage -> geometry' 'geometry quill m' 'model m s' 'storage s quill'
# of two rows with one prefix the nearer one is meant
try_table '' 'geometry/quill q' 'geometry g q' 'model/nw_model q g'
try_table 'a cycle: model -> model/nw_model -> model' 'geometry/quill q' 'geometry g q' 'model m q' 'model/nw_model q m'
exit $failed
