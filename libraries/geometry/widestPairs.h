// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "cornerPairs.h"
#include "quill/WorkWatch.h"

#include <cstdint>
#include <span>
#include <vector>

namespace quill {

// widestPair() of every corner of a polygon, to the same choice, in parallel where there are many corners.
//   corners    at least 3 affected indices
//   positions  one point per affected vertex
//   pairs      out, as many as there are corners
//   polygon    its number, for the watch
// Throws Cancelled when the watch says so.
void widestPairs(std::span<const std::uint32_t> corners, const std::vector<val3<float>>& positions,
                 std::vector<CornerPair>& pairs, std::size_t polygon, const WorkWatch& watch);

} // namespace quill
