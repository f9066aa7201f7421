// SPDX-License-Identifier: Apache-2.0
// Records of the ZIP format: their first four bytes, and their sizes without what is of variable length.
#pragma once

#include <cstddef>
#include <cstdint>

namespace storage::zip {

constexpr std::uint32_t localMark = 0x04034B50, centralMark = 0x02014B50, endMark = 0x06054B50;
constexpr std::uint32_t largeEndMark = 0x06064B50, locatorMark = 0x07064B50;
constexpr std::size_t localSize = 30, centralSize = 46, endSize = 22, largeEndSize = 56, locatorSize = 20;

constexpr std::uint16_t largeSizesId = 1;       ///< of the extra field with sizes of 64 bits
constexpr std::uint32_t allOnes = 0xFFFFFFFF;   ///< a size that stands in that field
constexpr std::uint16_t largeSizesVersion = 45; ///< of the format, 4.5, that knows it

} // namespace storage::zip
