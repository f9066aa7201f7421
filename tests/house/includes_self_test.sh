#!/usr/bin/env bash
# Plants one include, or one table, at a time into a small tree and asks includes.sh for its verdict.
. "$(dirname "$0")/self_test.sh"

mapfile -t folders < <(awk '$1 == "layer" { print $2 }' "$here/layers.txt")

plant() {
  rm -rf "${tree:?}"/*
  mkdir -p "${folders[@]/#/$tree/}" "$tree"/libraries/{geometry/quill,model/nw_model}
  touch "$tree"/libraries/geometry/{local.h,quill/val3.h} "$tree"/libraries/model/nw_model/session.h
}

# try VERDICT FILE LINE: allowed, or refused with a message that names the place
try() {
  local verdict=$1 file=$2 line=$3
  plant
  mkdir -p "$tree/$(dirname "$file")"
  printf '// first line\n%s\n' "$line" >"$tree/$file"
  ask "$here/includes.sh" "$tree"
  case $verdict in
    allowed) [[ $status == 0 && ! $said ]] ;;
    refused) [[ $status == 1 && $said == *"$file:2: "* ]] ;;
    no_layer) [[ $status == 1 && $said == *"$file: "* ]] ;;
  esac || wrong "$verdict: $line in $file"
}

# try_table SENTENCE ROW...: what is said of a table of these rows, "FOLDER PREFIX MAY-INCLUDE..."; empty for nothing
try_table() {
  local sentence=$1
  shift
  plant
  printf 'layer %s\n' "$@" >"$tree/table"
  ask "$here/includes.sh" "$tree/libraries" "$tree/table"
  [[ $said == "${sentence:+table: $sentence}" && $status == $((${#sentence} > 0)) ]] ||
    wrong "\"$sentence\" of a table of: $*"
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
try refused host/api/openquarn/HObject.h '#include <CL/cl.h>'
try refused host/api/openquarn/HObject.h '#include "gpu/HGpu.h"'
try no_layer host/runtime/rest.cpp '#include <vector>'
try refused quarn/play/play.cpp '#include "quarn/render/View.h"'
try refused quarn/play/play.cpp '#include "quarn/main.h"'
try refused quarn/main.cpp '#include "quarn/scene/plugs.h"'
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
