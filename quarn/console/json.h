// SPDX-License-Identifier: Apache-2.0
// Writing JSON for programs that read what quarn prints.
#pragma once

#include <rapidjson/prettywriter.h>
#include <rapidjson/stringbuffer.h>

#include <cstdint>
#include <string>

namespace quarn {

using JsonWriter = rapidjson::PrettyWriter<rapidjson::StringBuffer>;

inline void writeText(JsonWriter& writer, const std::string& text) {
    writer.String(text.data(), static_cast<rapidjson::SizeType>(text.size()));
}

inline void writeText(JsonWriter& writer, const char* key, const std::string& text) {
    writer.Key(key);
    writeText(writer, text);
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
