#!/usr/bin/env bash
# writers.sh ROOT: files are written by libraries/storage alone, which knows what must not be replaced. Lists every line
# of another product folder that makes, opens for writing or renames a file. Exit status 1 when there is one.
set -euo pipefail
cd "$1"
allowed='^libraries/storage/|"/dev/null"' # what goes nowhere
means='std::ofstream|std::fstream|\bfopen|\bO_(CREAT|TRUNC|WRONLY|RDWR)\b|\bmkstemp|\bcreat\('
means+='|\brename\(|\brenameat|(fs|filesystem)::(rename|copy)'

# a folder that is not there any more would have nothing to find: grep says so, and ends with more than 1
status=0
lines=$(grep -rnE --include='*.cpp' --include='*.h' "$means" libraries host plugin quarn clients) || status=$?
((status <= 1)) || exit 1
found=$(grep -vE "$allowed" <<<"$lines") || [[ -z $found ]]
[[ -z $found ]] || printf '%s\n' "$found"
# and the pattern finds what is meant
for file in libraries/storage/{TemporaryFile,Folder,FolderLock,NpyRows}.cpp; do
  grep -qE "$means" "$file" || { printf '%s has nothing to find\n' "$file"; exit 1; }
done
[[ -z $found ]]
