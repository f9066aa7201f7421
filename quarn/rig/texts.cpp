// SPDX-License-Identifier: Apache-2.0
#include "rig/texts.h"

#include <array>
#include <charconv>

namespace rig {

std::string text(double value) {
    std::array<char, 32> digits{};
    const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), value);
    return {digits.data(), end.ptr};
}

std::string element(const char* name, std::size_t index) {
    return std::string(name) + '[' + std::to_string(index) + ']';
}

} // namespace rig
