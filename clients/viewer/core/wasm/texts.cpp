// SPDX-License-Identifier: Apache-2.0
// The words of the rig's messages (quarn/rig/texts.cpp), without the tables of 110 kB that the shortest digits take.
#include "rig/texts.h"

#include <cmath>

namespace rig {

std::string text(double value) {
    constexpr double most = 1e9, digits = 1e6;
    if (!(std::abs(value) < most))
        return std::isnan(value) ? "nan" : "a large number";
    const auto millionths = static_cast<long long>(std::round(std::abs(value) * digits));
    const std::string whole = std::to_string(millionths / 1'000'000), rest = std::to_string(millionths % 1'000'000);
    return (value < 0.0 ? "-" : "") + whole + '.' + std::string(6 - rest.size(), '0') + rest;
}

std::string element(const char* name, std::size_t index) {
    return std::string(name) + '[' + std::to_string(index) + ']';
}

} // namespace rig
