// SPDX-License-Identifier: Apache-2.0
// Writing JSON for programs that read what quarn prints.
#pragma once

#include <rapidjson/prettywriter.h>
#include <rapidjson/stringbuffer.h>

#include <cstdint>
#include <string>
#include <vector>

namespace quarn {

using JsonWriter = rapidjson::PrettyWriter<rapidjson::StringBuffer>;

inline void writeText(JsonWriter& writer, const std::string& text) {
    writer.String(text.data(), static_cast<rapidjson::SizeType>(text.size()));
}

inline void writeText(JsonWriter& writer, const char* key, const std::string& text) {
    writer.Key(key);
    writeText(writer, text);
}

/// null where the text is empty.
inline void writeTextOrNull(JsonWriter& writer, const char* key, const std::string& text) {
    writer.Key(key);
    if (text.empty())
        writer.Null();
    else
        writeText(writer, text);
}

/// A list of texts, or of paths.
template <class Text>
void writeTexts(JsonWriter& writer, const char* key, const std::vector<Text>& texts) {
    writer.Key(key);
    writer.StartArray();
    for (const Text& text : texts)
        writeText(writer, std::string(text));
    writer.EndArray();
}

inline void writeBool(JsonWriter& writer, const char* key, bool value) {
    writer.Key(key);
    writer.Bool(value);
}

inline void writeCount(JsonWriter& writer, const char* key, std::uint64_t count) {
    writer.Key(key);
    writer.Uint64(count);
}

} // namespace quarn
