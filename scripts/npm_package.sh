# Pinned npm packages, checked by their hash and kept in the cache folder. Sourced after common.sh.

# is_intact FILE INTEGRITY: whether FILE has this hash, a SHA-512 in base 64.
is_intact() {
  local expected actual
  expected=$(base64 -d <<<"$2" | od -An -v -tx1 | tr -d ' \n')
  actual=$(sha512sum <"$1" | cut -d ' ' -f 1)
  [[ $actual == "$expected" ]]
}

# file_of PACKAGE VERSION: the archive's name, as npm gives it
file_of() {
  local file=${1#@}-$2.tgz
  printf '%s' "${file//\//-}"
}

# say_what_to_load NAME MB PACKAGE VERSION: for whoever asks before; nothing where the cache folder has the archive
say_what_to_load() {
  [[ -e $(cache_folder)/$(file_of "$3" "$4") ]] || printf '%s (%s MB)\n' "$1" "$2"
}

# npm_package PACKAGE VERSION INTEGRITY SCRATCH WAY-OUT: leaves the verified archive in the cache folder and sets
# `archive` to its path. SCRATCH is a folder beside it. WAY-OUT ends the sentence about what to do when it fails.
npm_package() {
  local package=$1 version=$2 integrity=$3 scratch=$4 way_out=$5 file
  file=$(file_of "$package" "$version")
  archive=$(dirname "$scratch")/$file
  if [[ -e $archive ]] && ! is_intact "$archive" "$integrity"; then
    say "the cached $archive is damaged: fetching it again"
    rm -f "$archive"
  fi
  [[ ! -e $archive ]] || return 0
  need_packages npm
  say "fetching $package $version"
  (cd "$scratch" && npm pack --loglevel=error "$package@$version" </dev/null >npm.log 2>&1) ||
    fail "npm could not fetch $package@$version ($(grep -m 1 -i 'err' "$scratch/npm.log" || tail -n 1 "$scratch/npm.log")); check the network and npm's registry$way_out"
  is_intact "$scratch/$file" "$integrity" ||
    fail "$file does not have the pinned hash: check npm's registry$way_out"
  # the last step is a rename, so a broken download leaves nothing
  mv "$scratch/$file" "$archive"
}
