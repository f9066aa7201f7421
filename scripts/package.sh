# shellcheck shell=bash
# ./run package: sourced by ./run, whose functions it uses. cmake/NwArchives.cmake says what is packed.

command_package() {
  local folder=build/release/packages
  need_packages "${package_packages[@]}"
  configure release
  build_targets release quarn neuralWarp quarnRig quill # what is installed
  say "packing"
  rm -rf "$folder"
  cpack --config build/release/CPackConfig.cmake >build/package.log 2>&1 || {
    cat build/package.log >&2
    return 1
  }
  find "$folder" -maxdepth 1 -type f -printf '%s %p\n' | sort -k 2 | while read -r size file; do
    say "$file ($((size / 1000000)) MB)"
  done
}
