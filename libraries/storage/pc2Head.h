// SPDX-License-Identifier: Apache-2.0
// The head of a PC2 file, behind which lie x, y, z of every vertex of every sample as '<f4'.
//
// The format, all little-endian: 12 bytes "POINTCACHE2" with a zero, version 1 (i4), vertices (i4), the frame of the
// first sample (f4), frames from one sample to the next (f4), samples (i4).
#pragma once

#include <cstdint>
#include <string>

namespace storage {

constexpr std::size_t pc2HeadSize = 32;
/// Of vertices and of samples.
constexpr std::uint64_t pc2MostOfAKind = 0x7FFFFFFF;

/// `vertices` and `samples` at most pc2MostOfAKind. [any]
std::string makePc2Head(std::uint64_t vertices, std::uint64_t samples, float firstFrame, float frameStep);

} // namespace storage
