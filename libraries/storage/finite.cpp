// SPDX-License-Identifier: Apache-2.0
#include "storage/finite.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdint>

namespace storage {
namespace {

// Infinity and NaN are what has all bits of the exponent: one more in its lowest place, and it carries into the sign.
// Without a way out of the loop the compiler takes several values at once; a loop that looks for the first one takes
// them singly, five times as long.
bool areFinite(const float* values, std::size_t count) {
    constexpr std::uint32_t exponent = 0x7F800000, lowest = 0x00800000, sign = 0x80000000;
    std::uint32_t carries = 0;
    for (std::size_t i = 0; i < count; ++i)
        carries |= (std::bit_cast<std::uint32_t>(values[i]) & exponent) + lowest;
    return (carries & sign) == 0;
}

} // namespace

std::optional<std::size_t> firstNotFinite(std::span<const float> values) {
    constexpr std::size_t blockSize = 4096; // stays in the nearest cache
    for (std::size_t begin = 0; begin < values.size(); begin += blockSize) {
        const std::size_t end = std::min(values.size(), begin + blockSize);
        if (areFinite(&values[begin], end - begin))
            continue;
        while (std::isfinite(values[begin]))
            ++begin;
        return begin;
    }
    return {};
}

} // namespace storage
