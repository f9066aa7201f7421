// SPDX-License-Identifier: Apache-2.0
// The one form that both sides of the comparison of tables have.
#pragma once

#include <array>
#include <cstdio>
#include <map>
#include <string>

namespace attributeTable {

/// All digits of the value as an attribute stores it.
inline std::string numberText(double value, bool isFloat) {
    std::array<char, 32> text{};
    std::snprintf(text.data(), text.size(), "%.17g", isFloat ? static_cast<double>(static_cast<float>(value)) : value);
    return text.data();
}

/// `limits` texts of numbers by "min", "max", "softMin" and "softMax".
inline std::string limitsText(const std::map<std::string, std::string>& limits) {
    std::string text;
    for (const auto& [name, value] : limits)
        text += (text.empty() ? "" : ", ") + name + " " + value;
    return text;
}

} // namespace attributeTable
