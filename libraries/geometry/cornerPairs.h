// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/val3.h"

#include <cstdint>
#include <span>
#include <vector>

namespace quill {

// Two other corners of a polygon that stand for one of its corners, as affected vertex indices.
struct CornerPair {
    std::uint32_t a;
    std::uint32_t b;
};

// The next and the previous corner of the polygon corner at list position c. corners: at least 3 affected indices.
CornerPair adjacentPair(std::span<const std::uint32_t> corners, std::size_t c);

// The same for every corner of the polygon: pairs[c], resized.
void adjacentPairs(std::span<const std::uint32_t> corners, std::vector<CornerPair>& pairs);

// The pair of other corners, in winding order from c, that spans the largest area with corner c, where the next and
// previous corner count double; the first of equals. positions: one point per affected vertex. Looks at all pairs.
CornerPair widestPair(std::span<const std::uint32_t> corners, std::size_t c, const std::vector<val3<float>>& positions);

} // namespace quill
