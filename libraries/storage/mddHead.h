// SPDX-License-Identifier: Apache-2.0
// The head of an MDD file, behind which lie x, y, z of every vertex of every frame as '>f4'.
//
// The format, all big-endian: frames (i4), vertices (i4), the time of each frame in seconds (f4 each).
#pragma once

#include <cstdint>
#include <span>
#include <string>

namespace storage {

constexpr std::size_t mddCountsSize = 8;
/// Of frames and of vertices.
constexpr std::uint64_t mddMostOfAKind = 0x7FFFFFFF;

/// `vertices`, and the times, at most mddMostOfAKind. [any]
std::string makeMddHead(std::uint64_t vertices, std::span<const float> seconds);

} // namespace storage
