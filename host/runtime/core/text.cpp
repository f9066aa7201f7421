// SPDX-License-Identifier: Apache-2.0
#include "core/text.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <cstdio>

namespace OpenQuarn {
namespace {

bool isLetter(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_';
}
bool isDigit(char c) {
    return c >= '0' && c <= '9';
}

} // namespace

std::string hexText(HTypeId id) {
    std::array<char, 16> text{};
    std::snprintf(text.data(), text.size(), "0x%08x", id.id());
    return text.data();
}

std::string printedNumber(double value) {
    constexpr double longestWhole =
        1e15; // whole numbers up to there are shown with all their digits: 100000, not 1e+05
    std::array<char, 32> digits{};
    char* const end = digits.data() + digits.size();
    const bool isWhole = std::fabs(value) < longestWhole && value == std::trunc(value);
    const auto result = isWhole ? std::to_chars(digits.data(), end, value, std::chars_format::fixed)
                                : std::to_chars(digits.data(), end, value);
    return {digits.data(), result.ptr};
}

bool isIdentifier(const std::string& text) {
    return !text.empty() && isLetter(text[0]) &&
           std::all_of(text.begin(), text.end(), [](char c) { return isLetter(c) || isDigit(c); });
}

} // namespace OpenQuarn
