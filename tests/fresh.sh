#!/usr/bin/env bash
# tests/fresh.sh [COMMAND [ARGS]]: runs ./run COMMAND (default: test) on a Debian 12 machine that has nothing but its
# smallest base system, made for the occasion by debootstrap and removed afterwards. Needs root. Its mirror, proxies,
# certificates and npm registry are those of this machine. FRESH_KEEP=1 keeps the system to look at.
set -euo pipefail
cd "$(dirname "$0")/.."
. scripts/common.sh

((EUID == 0)) || fail "needs root, for debootstrap and chroot"

system=$(mktemp -d /tmp/neuralwarp-fresh.XXXXXX)
clone=/project/neuralWarp

# shellcheck disable=SC2317 # called by the trap below
clean_up() {
  local mount status=$?
  # whatever is still mounted below goes first, deepest first: nothing of this machine may be removed through it
  while read -r mount; do umount -l "$mount" || true; done < <(
    cut -d ' ' -f 2 /proc/mounts | grep "^$system/" | sort -r
  )
  if grep -q " $system/" /proc/mounts; then
    printf 'fresh.sh: cannot unmount everything below %s: remove it by hand\n' "$system" >&2
  elif [[ ${FRESH_KEEP:-} ]]; then
    say "kept $system"
  else
    rm -rf --one-file-system "$system"
  fi
  exit "$status"
}
trap clean_up EXIT
trap 'exit 130' INT TERM

# The first Debian archive that this machine's apt reads (not the security archive, which has no base system).
mirror_of_this_machine() {
  # shellcheck disable=SC2016 # the dollars are apt's
  apt-get indextargets --format '$(CODENAME) $(REPO_URI)' 'Created-By: Packages' |
    awk '$1 == "bookworm" { print $2; exit }'
}

make_system() {
  local mirror
  have debootstrap || {
    say "installing debootstrap"
    apt_get update || fail "apt-get update failed, and debootstrap is missing ($(apt_error))"
    apt_get install -y --no-install-recommends debootstrap ||
      fail "apt-get could not install debootstrap ($(apt_error))"
  }
  mirror=$(mirror_of_this_machine)
  [[ $mirror ]] || fail "this machine's apt knows no Debian 12 archive to make the system from"
  say "making a bare Debian 12 in $system"
  debootstrap --variant=minbase bookworm "$system" "$mirror" >"$system.log" 2>&1 || {
    tail -n 5 "$system.log" >&2
    fail "debootstrap failed (its last lines are above)"
  }
  rm "$system.log"
}

# Proxies, name servers and certificates: how this machine reaches the network, and nothing else of it.
hand_over_network() {
  local file
  cp -L /etc/resolv.conf /etc/hosts "$system/etc/"
  for file in /etc/apt/apt.conf /etc/apt/apt.conf.d/*; do
    if [[ -f $file ]] && grep -qiE '^[^#/]*acquire' "$file"; then cp "$file" "$system/etc/apt/apt.conf.d/"; fi
  done
  if [[ -d /etc/apt/auth.conf.d ]]; then cp -r /etc/apt/auth.conf.d "$system/etc/apt/"; fi
  mkdir -p "$system/usr/local/share/ca-certificates"
  find /usr/local/share/ca-certificates -name '*.crt' -exec cp {} "$system/usr/local/share/ca-certificates/" \;
  if [[ ${NODE_EXTRA_CA_CERTS:-} && -e $NODE_EXTRA_CA_CERTS ]]; then
    cp "$NODE_EXTRA_CA_CERTS" "$system/etc/extra-ca.crt"
  fi
}

# The tracked files as a clone of their own, and the shared cases beside it, where the tests look for them.
copy_clone() {
  mkdir -p "$system$clone" "$system/project/home"
  git -c safe.directory="$PWD" clone -q --no-hardlinks "$PWD" "$system$clone" || fail "git could not clone this tree"
  if [[ -n $(git -c safe.directory="$PWD" status --porcelain) ]]; then
    say "note: what is not committed is not part of this run"
  fi
  if [[ -d ../shared/cases ]]; then
    mkdir -p "$system${clone%/*}/shared"
    cp -r ../shared/cases "$system${clone%/*}/shared/"
  fi
}

# PoCL asks /sys what processor there is, and ends the process where it gets no answer.
mount_kernel_folders() {
  mount -t proc proc "$system/proc"
  mount -t sysfs -o ro sysfs "$system/sys"
  mount --rbind /dev "$system/dev"
  mount --make-rslave "$system/dev"
  mount -t tmpfs tmpfs "$system/tmp"
}

# An environment of its own: only how to reach the network comes from outside.
run_inside() {
  local name environment=(HOME=/project/home PATH=/usr/sbin:/usr/bin:/sbin:/bin LANG=C.UTF-8 CI=true)
  for name in http_proxy https_proxy no_proxy HTTP_PROXY HTTPS_PROXY NO_PROXY NW_JOBS; do
    if [[ ${!name:-} ]]; then environment+=("$name=${!name}"); fi
  done
  if have npm; then environment+=("NPM_CONFIG_REGISTRY=$(npm config get registry)"); fi
  if [[ -e $system/etc/extra-ca.crt ]]; then environment+=(NODE_EXTRA_CA_CERTS=/etc/extra-ca.crt); fi
  # shellcheck disable=SC2016 # the dollars are the inner shell's
  env -i "${environment[@]}" chroot "$system" /bin/bash -c 'cd "$1" && shift && exec "$@"' - "$clone" "$@" </dev/null
}

# in a function that ends the script: bash reads a script as it goes, and this one may change while it runs
main() {
  local program=./run status=0 start
  (($#)) || set -- test
  if [[ $1 == ci ]]; then
    program=.ci/run
    shift
  fi

  make_system
  hand_over_network
  copy_clone
  mount_kernel_folders
  say "$program $* in $system"
  start=$SECONDS
  run_inside "$program" "$@" || status=$?
  say "fresh: $program $* ended with status $status after $((SECONDS - start)) s"
  exit "$status"
}

main "$@"
