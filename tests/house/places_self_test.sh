#!/usr/bin/env bash
# places_self_test.sh ROOT: places.sh is content with the product, and finds each second place that is planted in a copy.
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
root=$(cd "$1" && pwd)
tree=$(mktemp -d)
trap 'rm -rf "$tree"' EXIT

copy() {
  rm -rf "${tree:?}"/*
  (cd "$root" && find libraries host plugin quarn -name '*.cpp' -o -name '*.h' | tar -cf - -T -) | tar -xf - -C "$tree"
}

fail() {
  printf '%s\n' "$*"
  exit 1
}

copy
"$here/places.sh" "$tree" || fail "the product is refused"
while IFS='|' read -r file line; do
  printf '%s\n' "$line" >>"$tree/$file"
  answer=$("$here/places.sh" "$tree") && fail "not found in $file: $line"
  [[ $answer == *"$file:"*"$line"* ]] || fail "not named: $file: $line, but: $answer"
  copy
done <<'END'
quarn/main.cpp|document.Parse(text.c_str());
host/runtime/files/readScene.cpp|document.ParseStream<rapidjson::kParseIterativeFlag>(input);
libraries/storage/Json.cpp|reader.IterativeParseInit();
libraries/storage/NpyWriter.cpp|constexpr std::string_view magic("\x93NUMPY", 6);
libraries/storage/WholeFile.cpp|::rename(name_.c_str(), target.c_str());
plugin/entry/registration.cpp|std::filesystem::rename(from, to);
quarn/main.cpp|constexpr auto digits = "uvwxyz0123456789+/";
END
# and that a place has lost what belongs there
sed -i '/::rename(/d' "$tree/libraries/storage/TemporaryFile.cpp"
"$here/places.sh" "$tree" >/dev/null && fail "a rename that has gone is not missed"
exit 0
