# shellcheck shell=bash
# ./run package: sourced by ./run, whose functions it uses. cmake/NwArchives.cmake says what is packed as archive and
# Debian package; pack_python.py makes a wheel and an add-on of what is installed.

command_package() {
  local folder=build/release/packages installed=build/release/installed python
  need_packages "${package_packages[@]}" "${wheel_packages[@]}"
  configure release
  build_targets release quarn neuralWarp quarnRig quill clients/python/all clients/viewer/all # what is installed
  say "packing"
  rm -rf "$folder"
  cpack --config build/release/CPackConfig.cmake >build/package.log 2>&1 || {
    cat build/package.log >&2
    return 1
  }
  rm -rf "$installed"
  python=$(scripts/find_python.sh 2>/dev/null) || python=python3 # as clients/python chooses it
  cmake --install build/release --prefix "$installed" >>build/package.log
  "$python" scripts/pack_python.py "$installed" "$folder"
  rm -rf "$installed"
  find "$folder" -maxdepth 1 -type f -printf '%s %p\n' | sort -k 2 | while read -r size file; do
    say "$file ($((size / 1000000)) MB)"
  done
}
