// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <bit>
#include <cstdint>

namespace neuralWarp {

/// The number that a finite half is (IEEE 754-2019, binary16, section 3.4). Exact, and without a subnormal float on the
/// way: the same where a host has these taken for 0.
inline float decodeHalf(std::uint16_t half) {
    constexpr std::uint32_t fractionBits = 10, biasDifference = 127 - 15;
    constexpr std::uint32_t shift = 23 - fractionBits;
    const std::uint32_t magnitude = half & 0x7FFFU, sign = (half & 0x8000U) << 16U;
    const auto normal = (magnitude << shift) + (biasDifference << 23U);
    const auto subnormal = std::bit_cast<std::uint32_t>(static_cast<float>(magnitude) * 0x1p-24F);
    return std::bit_cast<float>((magnitude >> fractionBits != 0 ? normal : subnormal) | sign);
}

} // namespace neuralWarp
