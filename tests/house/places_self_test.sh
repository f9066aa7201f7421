#!/usr/bin/env bash
# places_self_test.sh ROOT: places.sh is content with the product, and finds each second place planted in a copy.
. "$(dirname "$0")/self_test.sh"
root=$(cd "$1" && pwd)

copy() {
  rm -rf "${tree:?}"/*
  (cd "$root" && find libraries host plugin quarn clients -name '*.cpp' -o -name '*.h' | tar -cf - -T -) | tar -xf - -C "$tree"
}

copy
ask "$here/places.sh" "$tree"
[[ $status == 0 ]] || wrong "the product to be content with"
while IFS='|' read -r file line; do
  printf '%s\n' "$line" >>"$tree/$file"
  ask "$here/places.sh" "$tree"
  [[ $status == 1 && $said == *"$file:"*"$line"* ]] || wrong "$file to be named for: $line"
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
printf 'struct Character {\n};\n' >>"$tree/quarn/play/playing.h"
ask "$here/places.sh" "$tree"
[[ $status == 1 && $said == *"quarn::Character: quarn/character/Character.h quarn/play/playing.h"* ]] ||
  wrong "a second type of one name to be found"
copy
# and that a place has lost what belongs there
sed -i '/::rename(/d' "$tree/libraries/storage/TemporaryFile.cpp"
ask "$here/places.sh" "$tree"
[[ $status == 1 ]] || wrong "a rename that has gone to be missed"
exit $failed
