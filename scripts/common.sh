# Shared by ./run and the scripts beside this file: messages, packages, caches. Sourced by bash, never run.

say() { printf '== %s\n' "$*"; }

# One line on standard error, then the end of the command.
fail() {
  printf '%s: %s\n' "${0##*/}" "$*" >&2
  exit 1
}

# A command line that cannot be understood: one line on standard error, status 2.
usage_error() {
  printf '%s: %s\n' "${0##*/}" "$*" >&2
  exit 2
}

have() { command -v "$1" >/dev/null 2>&1; }

job_count() { printf '%s' "${NW_JOBS:-$(nproc)}"; }

# Every Debian package that the project uses, and how its presence is seen: a command on the PATH, or a header
# (on Debian the package database answers for headers, elsewhere the header itself is looked for).
declare -A probe_of=(
  [g++]=g++
  [cmake]=cmake
  [ninja-build]=ninja
  [ccache]=ccache
  [libtbb-dev]=tbb/parallel_for.h
  [rapidjson-dev]=rapidjson/document.h
  [libcli11-dev]=CLI/CLI.hpp
  [libgtest-dev]=gtest/gtest.h
  [libgmock-dev]=gmock/gmock.h
  [libeigen3-dev]=eigen3/Eigen/Core
  [libassimp-dev]=assimp/Importer.hpp
  [libmeshoptimizer-dev]=/usr/include/meshoptimizer.h
  [libpugixml-dev]=/usr/include/pugixml.hpp
  [zlib1g-dev]=/usr/include/zlib.h # for compressed NumPy arrays; and Assimp's own configuration links it
  [libxxhash-dev]=/usr/include/xxhash.h
  [libembree-dev]=embree3/rtcore.h
  [libstb-dev]=stb/stb_image_write.h
  [ocl-icd-opencl-dev]=CL/cl.h
  [pocl-opencl-icd]=/etc/OpenCL/vendors/pocl.icd
  [npm]=npm
  [nodejs]=node
  [clang-14]=clang++-14
  [lld-14]=wasm-ld-14
  [wasi-libc]=/usr/include/wasm32-wasi/stdio.h
  [libc++-14-dev-wasm32]=/usr/include/wasm32-wasi/c++/v1/vector
  [libclang-rt-14-dev-wasm32]=/usr/lib/llvm-14/lib/clang/*/lib/wasi/libclang_rt.builtins-wasm32.a
  [libclang-rt-14-dev]=/usr/lib/llvm-14/lib/clang/*/include/sanitizer/asan_interface.h
  [llvm-14]=llvm-symbolizer-14
  [clang-format-14]=clang-format-14
  [clang-tidy-14]=clang-tidy-14
  [pybind11-dev]=/usr/include/pybind11/pybind11.h
  [python3-dev]=/usr/include/python3*/Python.h
  [python3-torch]=/usr/lib/python3/dist-packages/torch/__init__.py
  [python3-onnx]=/usr/lib/python3/dist-packages/onnx/__init__.py
  [python3-numpy]=/usr/lib/python3/dist-packages/numpy/__init__.py
  [python3-scipy]=/usr/lib/python3/dist-packages/scipy/__init__.py
  [python3-tqdm]=/usr/lib/python3/dist-packages/tqdm/__init__.py
  [python3-matplotlib]=/usr/lib/python3/dist-packages/matplotlib/__init__.py
  [python3-xxhash]=/usr/lib/python3/dist-packages/xxhash/__init__.py
  [python3-pil]=/usr/lib/python3/dist-packages/PIL/__init__.py
  [libopenblas0-pthread]=/usr/lib/*/openblas-pthread/libblas.so.3 # ten times as fast as the reference one
  [blender]=blender
  [chromium]=chromium
  [slurm-wlm]=/usr/sbin/slurmctld
  [munge]=/usr/sbin/munged
  [python3-setuptools]=/usr/lib/python3/dist-packages/setuptools/__init__.py
  [python3-wheel]=/usr/lib/python3/dist-packages/wheel/__init__.py
  [python3-venv]=/usr/lib/python3*/ensurepip/__init__.py
  [mypy]=mypy
  [flake8]=flake8
  [gcovr]=gcovr
  [gdb]=gdb
  [dpkg-dev]=dpkg-source
  [file]=file # by which CPack sees what is a program
  [patchelf]=patchelf # by which libraries of a wheel find each other
  [git]=git
)

# The same by what they are for; scripts that source this file install them.
# shellcheck disable=SC2034
build_packages=(g++ cmake ninja-build ccache libtbb-dev rapidjson-dev libcli11-dev libgtest-dev libgmock-dev libeigen3-dev
  libassimp-dev libmeshoptimizer-dev libpugixml-dev zlib1g-dev libxxhash-dev libembree-dev libstb-dev
  ocl-icd-opencl-dev pocl-opencl-icd pybind11-dev python3-dev)
python_packages=(python3-torch python3-onnx python3-numpy python3-scipy python3-tqdm python3-matplotlib
  python3-xxhash python3-pil libopenblas0-pthread)
# by which clang compiles for a browser
viewer_packages=(clang-14 lld-14 wasi-libc libc++-14-dev-wasm32 libclang-rt-14-dev-wasm32)
# what a wheel is made with, and installed in a place of its own
wheel_packages=(python3-setuptools python3-wheel python3-venv)
package_packages=(dpkg-dev file patchelf)
# tools that tests go to and come back from; what misses them is skipped, except in continuous integration
client_packages=(blender chromium python3-numpy python3-pil nodejs slurm-wlm munge)
check_packages=(git clang-format-14 clang-tidy-14 mypy flake8)
clang_packages=(clang-14 libclang-rt-14-dev llvm-14)

is_debian_12() { (. /etc/os-release 2>/dev/null && [[ ${ID:-} == debian && ${VERSION_ID:-} == 12 ]]); }

is_installed() {
  local package=$1 probe=${probe_of[$1]}
  case $probe in
    /*) compgen -G "$probe" >/dev/null ;;
    */*)
      if have dpkg-query && is_debian_12; then
        [[ $(dpkg-query -W -f '${db:Status-Status}' "$package" 2>/dev/null) == installed ]]
      else
        [[ -e /usr/include/$probe || -e /usr/local/include/$probe ]]
      fi
      ;;
    *) have "$probe" ;;
  esac
}

as_root() {
  if ((EUID == 0)); then "$@"; else sudo "$@"; fi
}

# Sets `missing` to those of the named packages that are not there.
find_missing() {
  local package
  missing=()
  for package in "$@"; do
    is_installed "$package" || missing+=("$package")
  done
}

# Installs those of the named packages that are missing; touches nothing when none is.
need_packages() {
  local missing
  find_missing "$@"
  ((${#missing[@]})) || return 0
  is_debian_12 || fail "not Debian 12, so install by hand what is missing: ${missing[*]}"
  ((EUID == 0)) || have sudo || fail "neither root nor sudo; as root, run: apt-get install ${missing[*]}"

  # npm is only as good as the certificates it can check a server by, and Debian's npm merely recommends them.
  [[ " ${missing[*]} " == *' npm '* && ! -e /etc/ssl/certs/ca-certificates.crt ]] && missing+=(ca-certificates)

  say "installing ${missing[*]} (log: build/apt.log)"
  apt_get update || fail "apt-get update failed ($(apt_error)); packages that are missing: ${missing[*]}"
  without_services apt_get install -y --no-install-recommends "${missing[@]}" ||
    fail "apt-get could not install ${missing[*]} ($(apt_error))"
  disable_services "${missing[@]}"
}

# The services of packages that tests start by themselves, on their own folders.
declare -A services_of=([slurm-wlm]="slurmctld slurmd" [munge]=munge)

# without_services COMMAND...: while it runs, no package starts a service: this is what Debian's policy-rc.d decides. One
# that says no already stays; another is put aside meanwhile.
without_services() (
  policy=/usr/sbin/policy-rc.d aside=/usr/sbin/policy-rc.d.neuralwarp status=0
  if [[ -x $policy ]]; then "$policy" munge start >/dev/null 2>&1 || status=$?; fi
  if ((status != 101)); then
    trap 'as_root rm -f "$policy"; if [[ -e $aside ]]; then as_root mv "$aside" "$policy"; fi' EXIT
    if [[ -e $policy ]]; then as_root mv "$policy" "$aside"; fi
    printf '#!/bin/sh\nexit 101\n' | as_root tee "$policy" >/dev/null
    as_root chmod 755 "$policy"
  fi
  "$@"
)

# disable_services PACKAGES...: nor does the machine start them when it starts. Only those of packages that were
# installed just now: what was there before is as its owner wants it.
disable_services() {
  local package service
  for package in "$@"; do
    for service in ${services_of[$package]:-}; do
      as_root env DPKG_MAINTSCRIPT_PACKAGE="$package" deb-systemd-helper disable "$service.service" >>build/apt.log 2>&1
      as_root update-rc.d "$service" disable >>build/apt.log 2>&1
    done
  done
}

apt_get() {
  mkdir -p build
  as_root env DEBIAN_FRONTEND=noninteractive apt-get -q -o Dpkg::Use-Pty=0 "$@" </dev/null >build/apt.log 2>&1
}

apt_error() { grep -m 1 '^E:' build/apt.log || tail -n 1 build/apt.log; }

# git that also reads a clone which belongs to another user, as a checkout in a container often does
git_here() { git -c safe.directory="$PWD" "$@" 2>/dev/null; }

# The project's C++ files: what git tracks or could; everything outside the build tree where there is no git.
cpp_files() {
  if have git && git_here rev-parse --git-dir >/dev/null; then
    git_here ls-files --cached --others --exclude-standard -- '*.cpp' '*.h' | while read -r file; do
      if [[ -e $file ]]; then printf '%s\n' "$file"; fi
    done
  else
    find . -path ./build -prune -o -name .git -prune -o \( -name '*.cpp' -o -name '*.h' \) -printf '%P\n'
  fi | sort
}

# A folder of the user's, kept between clones, for what is slow to get. Nothing in it is trusted without a check.
cache_folder() {
  local base=${XDG_CACHE_HOME:-${HOME:+$HOME/.cache}}
  local folder=${base:-$PWD/build/deps/cache}/neuralwarp
  mkdir -p "$folder" || fail "cannot make the cache folder $folder; set XDG_CACHE_HOME to a folder that can be written"
  printf '%s' "$folder"
}

# Makes a folder appear at once or not at all: whoever else is filling the same one may win, and that is as good.
publish_folder() {
  local from=$1 to=$2
  rm -rf "$to"
  mkdir -p "$(dirname "$to")"
  mv -T "$from" "$to" 2>/dev/null || [[ -d $to ]]
}
