#!/usr/bin/env bash
# flags_self_test.sh ROOT: plants one line at a time into a copy of the deformer, and asks flags.sh for its verdict.
. "$(dirname "$0")/self_test.sh"
root=$1

# try VERDICT FILE LINE: allowed, or refused with a message that names the place
try() {
  local verdict=$1 file=plugin/deformer/$2 line=$3
  rm -rf "${tree:?}/plugin"
  mkdir -p "$tree/plugin"
  cp -r "$root/plugin/deformer" "$tree/plugin/"
  printf '%s\n' "$line" >>"$tree/$file"
  ask "$here/flags.sh" "$tree"
  case $verdict in
    allowed) [[ $status == 0 && ! $said ]] ;;
    refused) [[ $status == 1 && $said == *"$file:"*"$line"* ]] ;;
  esac || wrong "$verdict: $line in $file"
}

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
