// SPDX-License-Identifier: Apache-2.0
#include "core/text.h"

#include <algorithm>
#include <array>
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

bool isIdentifier(const std::string& text) {
    return !text.empty() && isLetter(text[0]) &&
           std::all_of(text.begin(), text.end(), [](char c) { return isLetter(c) || isDigit(c); });
}

} // namespace OpenQuarn
