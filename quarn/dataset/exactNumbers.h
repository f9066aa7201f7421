// SPDX-License-Identifier: Apache-2.0
// Numbers of JSON in the fewest digits that make the same number.
#pragma once

#include "quarn/console/json.h"

#include <array>
#include <charconv>

namespace quarn {

template <class Number>
void writeNumber(JsonWriter& writer, Number value) {
    std::array<char, 32> text = {};
    const auto [end, error] = std::to_chars(text.data(), text.data() + text.size(), value);
    writer.RawValue(text.data(), static_cast<std::size_t>(end - text.data()), rapidjson::kNumberType);
}

} // namespace quarn
