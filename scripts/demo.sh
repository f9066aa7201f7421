# shellcheck shell=bash
# ./run demo: from a rigged hand, and from an arm, to a neural deformation and its report. Sourced by ./run.
#
# A row of the report is a quarn run (docs/run.md), whose steps are the commands that docs/tutorial.md explains; what a
# step prints goes to a file in its log folder. Rows are two delta modes, with --all by two kinds of model. Each has a page
# of the viewer beside the report.

demo_usage() {
  cat <<'TEXT'
usage: ./run demo [--all] [--output FOLDER] [--samples N] [--epochs N]

  --all             also two networks that learn the deltas themselves, without principal shapes
  --output FOLDER   where the results go (default: demo-out); those of an earlier demo there are replaced, but for
                    steps that would come out the same
  --samples N       training poses of the hand, 10 or more (default 3000); the arm, which has fewer joints, gets a fifth
                    of them, 40 at least
  --epochs N        passes over them (default 150)

The hand's report is report.html, and hand.html shows it in a browser: to be turned, posed and compared. The arm takes
about a minute of the demo; its report is arm/report.html, its page arm.html, and its picture arm.png.
TEXT
}

# demo_number FLAG LEAST VALUE: the value, if it is a whole number that can be meant
demo_number() {
  [[ $3 =~ ^[1-9][0-9]{0,6}$ && $3 -ge $2 ]] || usage_error "$1 takes a whole number from $2 to 9999999, not '$3'"
  printf '%s' "$3"
}

demo_options() {
  demo_out=demo-out demo_samples=3000 demo_epochs=150 demo_kinds=(principal)
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
# 0.0005; the rest of a demo 50, and the arm 40. Targets are shared between the cores, and trainings go two side by
# side.
demo_seconds() {
  local cores kind seconds
  cores=$(job_count)
  seconds=$((90 + (demo_samples + 120) * 40 / (1000 * cores) + $(arm_samples) * demo_epochs / 10000))
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
  find_missing "${build_packages[@]}" "${python_packages[@]}" "${viewer_packages[@]}"
  if ((${#missing[@]})); then printf 'Debian packages (%s missing, on a bare system 255 MB)\n' "${#missing[@]}"; fi
  scripts/fetch_onnxruntime.sh --what
  scripts/fetch_viewer_parts.sh --what
  scripts/fetch_hand.sh --what
}

demo_announce() {
  local seconds loads build=''
  seconds=$(demo_seconds)
  loads=$(demo_loads | paste -s -d ';' | sed 's/;/, /g')
  [[ -x build/release/quarn/quarn ]] || build=", and a few more to build it first (5 on two cores)"
  say "the demo: a hand is rigged, posed $demo_samples times, learned and played, then an arm; its results go to $demo_out"
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

# count_aloud LABEL LOG: seconds, and the last "N of M" of the log, once a second until it is ended.
count_aloud() {
  local from=$SECONDS count
  while sleep 1; do
    count=$(tail -c 500 "$2" | grep -oE '[0-9]+ of [0-9]+' | tail -n 1) || count= # the log has none yet
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
  say "building quarn, the plug-in and the page of the viewer"
  cmake --build --preset release --parallel "$(job_count)" --target quarn neuralWarp clients/viewer/all
  export QUARN=$PWD/build/release/quarn/quarn
}

# What an earlier demo has made of the same poses and settings is kept: quarn run knows. Pictures and report are made
# anew; a folder of the user's keeps whatever else is in it.
demo_folders() {
  data=$demo_out/data logs=$demo_out/log
  rm -rf "$demo_out/pictures" "$logs"
  rm -f "$demo_out"/report.{html,json} "$demo_out"/{table.txt,arm.png,arm.html} "$demo_out"/hand{,-offset}{,-direct}.html
  mkdir -p "$data" "$logs"
}

# demo_row ROW STEP ARGS...: the row's quarn run, up to the step, in the folder data/ROW
demo_row() {
  local row=$1 last=$2 smoothing=0 kind=()
  shift 2
  [[ $row != surface_* ]] || smoothing=$surface_smoothing
  [[ $row != *_direct ]] || kind=(--train-option=--direct)
  NW_PYTHON=$python "$QUARN" run build/deps/hand/left.glb -o "$data/$row" --until "$last" \
    --parents examples/hand/parents.json --limits examples/hand/limits.json \
    --import-option=--delta-mode --import-option="${row%_*}" --import-option=--smoothing --import-option="$smoothing" \
    --samples "$demo_samples" --activation-rate "$activation_rate" --limit-rate 0.3 --seed 1 --motion examples/hand/motion.json \
    --epochs "$demo_epochs" "${kind[@]}" "$@"
}

# demo_row_with_targets ROW STEP ARGS...: the first row has them made, the others take them from there
demo_row_with_targets() {
  local made=$data/surface_principal/data/$mesh
  if [[ $1 == surface_principal ]]; then
    demo_row "$@" --target-command "$python" examples/hand/target_command.py
  else
    demo_row "$@" --targets "$made/poses_target.npy" --motion-targets "$made/motion_target.npy"
  fi
}

# Targets take all cores, a training one: the rows of both modes go side by side, and one of them in silence.
demo_rows() {
  local kind beside log
  say "rig, poses and targets"
  demo_row_with_targets surface_principal motion-target
  for kind in "${demo_kinds[@]}"; do
    say "deltas, training and figures: both modes, $kind"
    log=$logs/offset_$kind.log
    demo_row_with_targets "offset_$kind" evaluate --quiet >"$log" 2>&1 &
    beside=$!
    demo_row_with_targets "surface_$kind" evaluate
    wait "$beside" || {
      cat "$log" >&2
      fail "the row of offsets, $kind, failed"
    }
  done
}

# The arm is a character of our own, and goes all the way in one quarn run.
arm_samples() { printf '%s' "$((demo_samples > 200 ? demo_samples / 5 : 40))"; }

demo_arm() {
  say "an arm, all the way"
  "$python" examples/arm/write_arm.py "$demo_out/arm.glb"
  NW_PYTHON=$python "$QUARN" run "$demo_out/arm.glb" -o "$demo_out/arm" --limits examples/arm/limits.json \
    --samples "$(arm_samples)" --activation-rate 0.8 --seed 1 --motion examples/arm/motion.json \
    --epochs "$demo_epochs" \
    --render-option=--view --render-option=15,15 --render-option=--range --render-option=30 \
    --target-command "$python" examples/arm/arm_targets.py >"$logs/arm.log"
  local skin=arm_skin.outputGeom[0] target=arm_target.outMesh neural=warp.outputGeom[0]
  step "the arm's picture" \
    "$QUARN" render "$demo_out/arm/motion.arm.json" --panel "skin=$skin" --panel "target=$target" \
    --panel "neural=$neural" --heat "before=$skin:$target" --heat "after=$neural:$target" --range 30 --view 15,15 \
    --model arm --size 400x400 --frames 34 -o "$demo_out/arm.png"
  if [[ -e $demo_out/arm/arm.html ]]; then cp "$demo_out/arm/arm.html" "$demo_out/arm.html"; fi
}

# What a model has to achieve on the held-out motion, in parts of the mean that the better of the skin and the deformer
# without deltas leaves: a sixteenth, and of offsets a twelfth (decision 0089). Of the largest it is a quarter.
demo_limit() { [[ $1 == offset_principal ]] && printf 0.0833333 || printf 0.0625; }

# demo_report NAME=ROW...: what the rows have made, each under its name
demo_report() {
  local pair name row run words=()
  for pair; do
    name=${pair%%=*} row=${pair#*=}
    run=$data/$row
    words+=("$name=$run/motion.$mesh.json" --training "$name=$run/data/$mesh/training"
      --evaluate "$name=$run/answers/evaluate-$mesh.json" --limit-mean "$name=$(demo_limit "$row")")
  done
  "$QUARN" report "${words[@]}" -o "$demo_out" --title "A hand that keeps its volume" --model "$mesh" --limit-max 0.25 \
    --view 90,20 --range 5 "${judge[@]}"
}

command_demo() {
  local data logs python demo_out demo_samples demo_epochs demo_kinds kind
  local surface_smoothing=5 activation_rate=0.8 mesh=l_handMeshNode start=$SECONDS judge=() rows=()
  demo_options "$@"
  demo_announce
  demo_install
  demo_folders
  watch_for_interrupt
  say "what each step prints goes to $data/ROW/log and $logs"
  demo_rows
  demo_arm
  # fewer poses or passes than these are for trying the commands: they cannot keep the limits
  ((demo_samples >= 3000 && demo_epochs >= 150)) && judge=(--judge)
  for kind in "${demo_kinds[@]}"; do
    local ending=-$kind
    rows+=("hand${ending#-principal}=surface_$kind" "hand-offset${ending#-principal}=offset_$kind")
  done
  say "the hand"
  demo_report "${rows[@]}"
  say "the arm"
  cat "$demo_out/arm/table.txt"
  say "done after $((SECONDS - start)) s: open $(demo_pages)"
}

# what there is to be opened; pages of the viewer are left out of a build without them
demo_pages() {
  local page pages=()
  for page in "$demo_out"/{hand,arm}.html "$demo_out/report.html" "$demo_out/arm/report.html"; do
    [[ -e $page ]] && pages+=("$page")
  done
  printf '%s, ' "${pages[@]}" | sed 's/, $//'
}
