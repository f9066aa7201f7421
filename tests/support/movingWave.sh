# SPDX-License-Identifier: Apache-2.0
# moving_wave QUARN FOLDER: copies the example of the wave into FOLDER, and makes moving.json of it, where the first
# control goes from 0 to 1 in the frames 1 to 11. Lines of standard input are run after that.
moving_wave() {
  local quarn=$1 folder=$2
  cp -r examples/wave/models examples/wave/wave.json "$folder"
  {
    cat <<'SCRIPT'
file -open wave.json
createNode animCurve -name ramp
setAttr ramp.keyTimes 1 11
setAttr ramp.keyValues 0 1
connectAttr time1.outTime ramp.time
connectAttr ramp.output controls.inputList[0].input[0]
file -saveAs moving.json
SCRIPT
    cat
  } >"$folder/setup.txt"
  (cd "$folder" && "$quarn" exec setup.txt >/dev/null)
}
