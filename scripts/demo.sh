# shellcheck shell=bash
# ./run demo: from a rigged hand to a neural deformation and its report. Sourced by ./run.
#
# Every step is a command that docs/tutorial.md explains; what it prints goes to a file in the log folder. The rows of the
# report are two delta modes, with --all by two kinds of model; each network of a demo without it is in a picture.

demo_usage() {
  cat <<'TEXT'
usage: ./run demo [--all] [--output FOLDER] [--samples N] [--epochs N]

  --all             also two networks that learn the deltas themselves, without principal shapes; no picture shows them
  --output FOLDER   where the results go (default: demo-out); results of an earlier demo there are replaced
  --samples N       training poses, 10 or more (default 3000)
  --epochs N        passes over them (default 250)
TEXT
}

# demo_number FLAG LEAST VALUE: the value, if it is a whole number that can be meant
demo_number() {
  [[ $3 =~ ^[1-9][0-9]{0,6}$ && $3 -ge $2 ]] || usage_error "$1 takes a whole number from $2 to 9999999, not '$3'"
  printf '%s' "$3"
}

demo_options() {
  demo_out=demo-out demo_samples=3000 demo_epochs=250 demo_kinds=(principal)
  while (($#)); do
    case $1 in
      -h | --help)
        demo_usage
        exit 0
        ;;
      --all) demo_kinds=(principal direct) && shift && continue ;;
      --output | --samples | --epochs) (($# > 1)) || usage_error "$1 needs a value; ./run demo --help says more" ;;
      *) usage_error "demo does not know '$1'; ./run demo --help says what it knows" ;;
    esac
    case $1 in
      --output) demo_out=$2 ;;
      --samples) demo_samples=$(demo_number "$1" 10 "$2") ;;
      --epochs) demo_epochs=$(demo_number "$1" 1 "$2") ;;
    esac
    shift 2
  done
  demo_place
}

# The folder of the results is the caller's, and there before minutes are spent.
demo_place() {
  [[ $demo_out && $demo_out != -* ]] || usage_error "--output needs a folder, not '$demo_out'"
  if [[ $demo_out != demo-out && $demo_out != /* && ${caller:-$PWD} != "$PWD" ]]; then demo_out=$caller/$demo_out; fi
  { mkdir -p "$demo_out" && [[ -w $demo_out ]]; } 2>/dev/null || usage_error "--output $demo_out: no folder that can be written"
}

# --- what is coming ---

# Seconds of one core, measured: a target shape 0.04, a pose in an epoch of a network of shapes 0.0001, of a direct one
# 0.0005; the rest of a demo 50. Targets are shared between the cores, and trainings go two side by side.
demo_seconds() {
  local cores kind seconds
  cores=$(job_count)
  seconds=$((50 + (demo_samples + 120) * 40 / (1000 * cores)))
  for kind in "${demo_kinds[@]}"; do
    local cost=1
    if [[ $kind == direct ]]; then cost=5; fi
    seconds=$((seconds + demo_samples * demo_epochs * cost / 10000 * (cores > 1 ? 1 : 2)))
  done
  printf '%s' "$seconds"
}

# One line for each thing that is loaded; nothing where all of it is there.
demo_loads() {
  local missing
  find_missing "${build_packages[@]}" "${python_packages[@]}"
  if ((${#missing[@]})); then printf 'Debian packages (%s missing, on a bare system 210 MB)\n' "${#missing[@]}"; fi
  scripts/fetch_onnxruntime.sh --what
  scripts/fetch_hand.sh --what
}

demo_announce() {
  local seconds loads build=''
  seconds=$(demo_seconds)
  loads=$(demo_loads | paste -s -d ';' | sed 's/;/, /g')
  [[ -x build/release/quarn/quarn ]] || build=", and a few more to build it first (5 on two cores)"
  say "the demo: a hand is rigged, posed $demo_samples times, learned and played; its results go to $demo_out"
  say "it takes about $(((seconds + 59) / 60)) min on $(job_count) free cores$build"
  say "to be loaded: ${loads:-nothing, all of it is there}"
}

# --- its steps ---

# step LABEL COMMAND...: one line and the time it took; on a failure the end of what the command said. On a terminal the
# line counts meanwhile.
step() {
  local label=$1 start=$SECONDS log counting='' status=0
  shift
  log=$logs/$(printf '%s' "$label" | tr -cs 'a-z0-9' '-').log
  printf '   %-52s' "$label"
  : >"$log"
  if [[ -t 1 ]]; then
    count_aloud "$label" "$log" &
    counting=$!
  fi
  "$@" >"$log" 2>&1 || status=$?
  if [[ $counting ]]; then
    kill "$counting" 2>/dev/null || true
    wait "$counting" 2>/dev/null || true
    printf '\r   %-52s\033[K' "$label"
  fi
  if ((status)); then
    printf 'failed\n'
    tail -n 15 "$log" >&2
    fail "$label: the command failed (log: $log)"
  fi
  printf '%4d s\n' "$((SECONDS - start))"
}

# count_aloud LABEL LOG: seconds, and the last "N of M" of the log, once a second until it is ended. A step that makes
# files has them counted: its caller sets made_in to their folder and made_of to their number.
count_aloud() {
  local from=$SECONDS count
  while sleep 1; do
    count=$(tail -c 500 "$2" | grep -oE '[0-9]+ of [0-9]+' | tail -n 1) || count= # the log has none yet
    if [[ ${made_of:-} ]]; then count="$(find "$made_in" -name '*.png' | wc -l) of $made_of"; fi
    printf '\r   %-52s%4d s  %s\033[K' "$1" "$((SECONDS - from))" "$count"
  done
}

# Ctrl-C: the step at hand has had it too, but for what it had put beside itself. It comes in the middle of a step, whose
# output goes to its log.
watch_for_interrupt() {
  exec {demo_errors}>&2
  trap 'demo_interrupted' INT
}

demo_interrupted() {
  local beside
  mapfile -t beside < <(jobs -p)
  kill "${beside[@]}" 2>/dev/null || true
  printf '\nrun: the demo was interrupted; what it had made is in %s\n' "$demo_out" >&"$demo_errors"
  exit 130
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
  for kind in "${demo_kinds[@]}"; do
    step "training: both modes, $kind" train_both_modes "$kind"
    for row in "surface_$kind" "offset_$kind"; do
      step "the motion with the model ${row/_/, }" measure_row "$row"
    done
  done
}

demo_pictures() {
  local panels=(--panel "skin=$skin_plug" --panel "target=$target_plug" --panel "neural=warp.outputGeom[0]"
    --heat "error=warp.outputGeom[0]:$target_plug" --range 2 --view 90,20)
  step "pictures" \
    "$QUARN" render "$data/motion_surface.json" "${panels[@]}" --model surface_principal --size 480x480 --frames 20-100x20 \
    -o "$demo_out/pictures/motion.####.png"
  step "a picture of the network of offsets" \
    "$QUARN" render "$data/motion_offset.json" "${panels[@]}" --model offset_principal --size 480x480 --frames 60 \
    -o "$demo_out/pictures/offset.####.png"
  made_in=$data/preview made_of=60 step "the moving picture" \
    "$QUARN" render "$data/motion_surface.json" "${panels[@]}" --model surface_principal --size 300x300 --frames 1-120x2 \
    -o "$data/preview/frame.####.png"
}

command_demo() {
  local data logs python demo_out demo_samples demo_epochs demo_kinds
  local surface_smoothing=5 activation_rate=0.8 skin_plug target_plug start=$SECONDS judge=()
  demo_options "$@"
  demo_announce
  demo_install
  demo_folders
  watch_for_interrupt
  say "what each step prints goes to $logs"
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
