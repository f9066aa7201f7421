// SPDX-License-Identifier: Apache-2.0
// JSON as scene files use it: numbers that come back bit by bit, and texts of any bytes.
#pragma once

#include "storage/Json.h"

#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include <optional>
#include <string>
#include <string_view>

namespace OpenQuarn {

/// Writes JSON without spaces. Line breaks between values are the caller's.
///
/// A number is written with the fewest digits that give it back. What JSON has no number for is a text: "inf", "-inf",
/// "nan", and "nan:fff8000000000001" for a NaN with other bits than the usual ones. A text that is not valid UTF-8 is
/// {"hex": "ff00…"}, two digits a byte.
class JsonWriter : public rapidjson::Writer<rapidjson::StringBuffer> {
public:
    using Base = rapidjson::Writer<rapidjson::StringBuffer>;
    using Base::Base;

    bool Double(double value); ///< hides the base's, for Accept()
    void floatNumber(float value);
    void key(std::string_view name) { Key(name.data(), static_cast<rapidjson::SizeType>(name.size())); }
    void text(std::string_view value);
    /// A text that is JSON already.
    void raw(std::string_view json) { RawValue(json.data(), json.size(), rapidjson::kNullType); }

private:
    void plainText(std::string_view value) { String(value.data(), static_cast<rapidjson::SizeType>(value.size())); }
};

/// Values as JsonWriter writes them; nothing for a value of another kind.
std::optional<double> numberOf(const storage::JsonValue& value);
std::optional<std::string> textOf(const storage::JsonValue& value);

/// The value as JSON, as JsonWriter writes it.
std::string jsonOf(const storage::JsonValue& value);

using storage::viewOf;

} // namespace OpenQuarn
