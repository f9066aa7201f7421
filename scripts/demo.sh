# shellcheck shell=bash
# ./run demo: from a rigged hand to a neural deformation and its report. Sourced by ./run.
#
# Every step is a command that docs/tutorial.md explains; what it prints goes to a file in the log folder. The four
# rows of the report are two delta modes by two kinds of model; the pictures show surface deltas with principal shapes.

demo_usage() {
  cat <<'TEXT'
usage: ./run demo [--output FOLDER] [--samples N] [--epochs N]

  --output FOLDER   where the results go (default: demo-out); results of an earlier demo there are replaced
  --samples N       training poses (default 3000)
  --epochs N        passes over them (default 250)
TEXT
}

demo_rows=(surface_principal surface_direct offset_principal offset_direct)

# step LABEL COMMAND...: one line and the time it took; on a failure the end of what the command said
step() {
  local label=$1 start=$SECONDS log
  shift
  log=$logs/$(printf '%s' "$label" | tr -cs 'a-z0-9' '-').log
  printf '   %-52s' "$label"
  if ! "$@" >"$log" 2>&1; then
    printf 'failed\n'
    tail -n 15 "$log" >&2
    fail "$label: the command failed (log: $log)"
  fi
  printf '%4d s\n' "$((SECONDS - start))"
}

demo_options() {
  demo_out=demo-out demo_samples=3000 demo_epochs=250
  while (($#)); do
    case $1 in
      --output) demo_out=${2:?--output needs a folder} ;;
      --samples) demo_samples=${2:?--samples needs a number} ;;
      --epochs) demo_epochs=${2:?--epochs needs a number} ;;
      *)
        demo_usage >&2
        exit 2
        ;;
    esac
    shift 2
  done
}

# everything that a demo needs; sets `python` and QUARN
demo_install() {
  need_packages "${build_packages[@]}" "${python_packages[@]}"
  scripts/fetch_onnxruntime.sh
  scripts/fetch_hand.sh
  python=$(scripts/find_python.sh)
  configure release
  say "building quarn and the plug-in"
  cmake --build --preset release --parallel "$(job_count)" --target quarn neuralWarp
  export QUARN=$PWD/build/release/quarn/quarn
}

# only what a demo makes goes: a folder of the user's keeps whatever else is in it
demo_folders() {
  data=$demo_out/data logs=$demo_out/log
  rm -rf "$data" "$demo_out/pictures" "$logs"
  rm -f "$demo_out"/report.{html,json} "$demo_out"/{table.txt,preview.webp}
  mkdir -p "$data"/{models,results,preview} "$demo_out/pictures" "$logs"
}

# the rig, its controls and the deformer, from the file as it was published
demo_import() {
  step "importing the rigged hand" \
    "$QUARN" import build/deps/hand/left.glb -o "$data/hand.json" --neural-warp --model-root models \
    --parents examples/hand/parents.json --limits examples/hand/limits.json --smoothing "$surface_smoothing"
}

# set_mode SCENE surface|offset: the same scene with the other settings of its deltas
set_mode() {
  local scene=$1 mode=$2 smoothing=0 label=Offset
  if [[ $mode == surface ]]; then smoothing=$surface_smoothing label=Surface; fi
  printf 'file -open "%s"\nsetAttr warp.export[0].deltaMode %s\nsetAttr warp.export[0].smoothingIterations %s\nfile -saveAs "%s"\n' \
    "$scene" "$label" "$smoothing" "${scene%.json}_$mode.json" | "$QUARN" exec -
}

# targets and data sets of both modes for a posed scene: data/NAME.json
demo_targets_and_sets() {
  local name=$1 mode
  step "$name: linear skinning, every frame" \
    "$QUARN" bake "$data/$name.json" "$skin_plug" -o "$data/${name}_skin.npy"
  step "$name: target shapes" \
    "$python" examples/hand/targets.py "$data/$name.json" "$data/${name}_skin.npy" -o "$data/${name}_target.npy" \
    --jobs "$(job_count)"
  step "$name: connecting the targets" \
    "$QUARN" target "$data/$name.json" --cache "$data/${name}_target.npy" -o "$data/$name.json"
  for mode in surface offset; do
    step "$name: $mode settings" set_mode "$data/$name.json" "$mode"
    step "$name: $mode deltas" "$QUARN" export "$data/${name}_$mode.json" -o "$data/sets/${name}_$mode"
  done
}

demo_poses() {
  step "sampling $demo_samples poses" \
    "$QUARN" pose "$data/hand.json" --samples "$demo_samples" --activation-rate "$activation_rate" --seed 1 \
    -o "$data/poses.json"
  demo_targets_and_sets poses
  step "the held-out motion" "$QUARN" pose "$data/hand.json" --keys examples/hand/motion.json -o "$data/motion.json"
  demo_targets_and_sets motion
}

# kind_flags ROW: how the trainer is told the kind of model
kind_flags() {
  if [[ $1 == *_principal ]]; then
    printf '%s\n' --principal-shapes --principal-limit 100 --principal-accuracy 0.999
  else
    printf '%s\n' --direct
  fi
}

# train_row ROW
train_row() {
  local row=$1 flags
  mapfile -t flags < <(kind_flags "$row")
  "$python" -m trainer train "$data/sets/poses_${row%_*}" -o "$data/models/$row.nwrp" --seed 1 \
    --epochs "$demo_epochs" --learning-rate 0.001 "${flags[@]}" --report "$data/results/$row"
}

# a training uses one core: two go side by side
train_both_modes() {
  local kind=$1 failed=0 surface
  train_row "surface_$kind" &
  surface=$!
  train_row "offset_$kind" || failed=1
  wait "$surface" || failed=1
  return "$failed"
}

# the motion through the plug-in against the target, on the CPU and on the OpenCL device, and what the trainer says of
# the same frames
measure_row() {
  local row=$1 evaluator
  for evaluator in cpu gpu; do
    "$QUARN" play "$data/motion_${row%_*}.json" --model "$row" --against target --repeat 3 --evaluator "$evaluator" \
      -o "$data/motion_${row}_$evaluator.npy" --json >"$data/results/$row/play_$evaluator.json" || return
  done
  "$python" -m trainer evaluate "$data/sets/motion_${row%_*}" "$data/models/$row.nwrp" --json \
    >"$data/results/$row/evaluate.json"
}

demo_models() {
  local kind row
  for kind in principal direct; do
    step "training: both modes, $kind" train_both_modes "$kind"
  done
  for row in "${demo_rows[@]}"; do
    step "the motion with the model ${row/_/, }" measure_row "$row"
  done
}

demo_pictures() {
  local panels=(--panel "skin=$skin_plug" --panel "target=$target_plug" --panel "neural=warp.outputGeom[0]"
    --heat "error=warp.outputGeom[0]:$target_plug" --model surface_principal --range 2 --view 90,20)
  step "pictures" \
    "$QUARN" render "$data/motion_surface.json" "${panels[@]}" --size 480x480 --frames 20-100x20 \
    -o "$demo_out/pictures/motion.####.png"
  step "the moving picture" \
    "$QUARN" render "$data/motion_surface.json" "${panels[@]}" --size 300x300 --frames 1-120x2 \
    -o "$data/preview/frame.####.png"
}

command_demo() {
  local data logs python demo_out demo_samples demo_epochs
  local surface_smoothing=5 activation_rate=0.8 skin_plug target_plug start=$SECONDS judge=()
  demo_options "$@"
  demo_install
  demo_folders
  say "the demo; its results go to $demo_out"
  demo_import
  skin_plug=l_handMeshNode_skin.outputGeom[0] target_plug=l_handMeshNode_target.outMesh
  demo_poses
  demo_models
  demo_pictures
  # fewer poses or passes than these are for trying the commands: they cannot keep the limits
  ((demo_samples >= 3000 && demo_epochs >= 250)) && judge=(--judge)
  "$python" examples/hand/report.py "$demo_out" "${judge[@]}"
  say "done after $((SECONDS - start)) s: open $demo_out/report.html"
}
