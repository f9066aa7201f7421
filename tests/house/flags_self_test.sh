#!/usr/bin/env bash
# flags_self_test.sh ROOT: plants one line at a time into a copy of the deformer, and asks flags.sh for its verdict.
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
tree=$(mktemp -d)
trap 'rm -rf "$tree"' EXIT
failed=0

# try VERDICT FILE LINE: allowed, or refused with a message that names the place
try() {
  local verdict=$1 file=plugin/deformer/$2 line=$3 output status=0
  rm -rf "${tree:?}/plugin"
  mkdir -p "$tree/plugin"
  cp -r "$root/plugin/deformer" "$tree/plugin/"
  printf '%s\n' "$line" >>"$tree/$file"
  output=$("$here/flags.sh" "$tree" 2>&1) || status=$?
  case $verdict in
    allowed) [[ $status == 0 && -z $output ]] ;;
    refused) [[ $status == 1 && $output == *"$file:"*"$line"* ]] ;;
  esac && return
  printf 'expected %s: %s in %s\nstatus %s, output: %s\n' "$verdict" "$line" "$file" "$status" "$output"
  failed=1
}

root=$1
try allowed neuralWarpNodeRest.cpp 'data.connectionsDirty = false;'
try allowed neuralWarpNodeDeform.cpp 'if (data.connectionsDirty == true)'
try allowed neuralWarpCmd.cpp '// data.connectionsDirty = false;'
try refused neuralWarpNodeDeform.cpp 'data.connectionsDirty = false;'
try refused neuralWarpNodeLoading.cpp 'data->restFramesDirty |= true;'
try refused neuralWarpNode.cpp 'data->modelPathDirty = true;'
try refused neuralWarpNodeTraining.cpp 'data.exportMode = data.modelApplied = false;'
try refused neuralWarpGPUNode.cpp 'std::exchange(data.modelApplied, false);'
try refused neuralWarpGPUNode.cpp 'bool& applied = *&data.modelApplied;'
try refused namedBuffers.cpp 'auto flag = &neuralWarpData::useAffectMap;'
exit $failed
