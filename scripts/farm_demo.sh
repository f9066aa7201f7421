# shellcheck shell=bash
# ./run farm-demo: a farm on this machine, by examples/farm/demo.py. Sourced by ./run.

farm_demo_usage() {
  cat <<'TEXT'
usage: ./run farm-demo [--output FOLDER] [--samples N] [--parts N] [--epochs N]

  --output FOLDER   where the results go (default: demo-out/farm); those of an earlier demo there are replaced
  --samples N       poses of the hand, 20 or more (default 400)
  --parts N         that they are cut into, 2 or more (default 6)
  --epochs N        passes of each of two trainings over them (default 60)

A Slurm of two nodes comes up as the user who calls, in a folder of its own, and is gone at the end, at Ctrl-C as well.
Targets, data set and trainings of the hand are made there in parts, by neuralwarp-farm (docs/farm.md); one of them is
killed on purpose. Then they are made without a farm: the two have to be the same, byte for byte.
TEXT
}

farm_demo_options() {
  farm_demo_output=demo-out/farm farm_demo_words=()
  while (($#)); do
    case $1 in
      -h | --help)
        farm_demo_usage
        exit 0
        ;;
      --output | --samples | --parts | --epochs) (($# > 1)) || usage_error "$1 needs a value; ./run farm-demo --help says more" ;;
      *) usage_error "farm-demo does not know '$1'; ./run farm-demo --help says what it knows" ;;
    esac
    case $1 in
      --output) farm_demo_output=$2 ;;
      *) farm_demo_number "$1" "$2" ;;
    esac
    shift 2
  done
  [[ $farm_demo_output && $farm_demo_output != -* ]] || usage_error "--output needs a folder, not '$farm_demo_output'"
  if [[ $farm_demo_output != demo-out/farm && $farm_demo_output != /* ]]; then
    farm_demo_output=${caller:-$PWD}/$farm_demo_output
  fi
}

# farm_demo_number FLAG VALUE: passed on if it is a whole number that can be meant
farm_demo_number() {
  local -A least=([--samples]=20 [--parts]=2 [--epochs]=1)
  [[ $2 =~ ^[1-9][0-9]{0,5}$ && $2 -ge ${least[$1]} ]] ||
    usage_error "$1 takes a whole number from ${least[$1]} to 999999, not '$2'"
  farm_demo_words+=("$1" "$2")
}

# everything that it needs; sets `python` and `quarn`
farm_demo_install() {
  need_packages "${build_packages[@]}" "${python_packages[@]}" slurm-wlm munge
  scripts/fetch_onnxruntime.sh
  scripts/fetch_hand.sh
  python=$(scripts/find_python.sh)
  quarn=$PWD/build/release/quarn/quarn
  configure release
  say "building quarn"
  cmake --build --preset release --parallel "$(job_count)" --target quarn neuralWarp
}

command_farm_demo() {
  local farm_demo_output farm_demo_words python quarn start=$SECONDS
  farm_demo_options "$@"
  farm_demo_install
  say "a night on a farm of two nodes; its results go to $farm_demo_output"
  "$python" examples/farm/demo.py build/deps/hand/left.glb --quarn "$quarn" -o "$farm_demo_output" "${farm_demo_words[@]}"
  say "done after $((SECONDS - start)) s; the farm is down, docs/farm.md says what was done"
}
