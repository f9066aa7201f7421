// SPDX-License-Identifier: Apache-2.0
#include "cornerPairs.h"

namespace quill {

CornerPair adjacentPair(std::span<const std::uint32_t> corners, std::size_t c) {
    const std::size_t m = corners.size();
    return {corners[(c + 1) % m], corners[(c + m - 1) % m]};
}

void adjacentPairs(std::span<const std::uint32_t> corners, std::vector<CornerPair>& pairs) {
    pairs.resize(corners.size());
    for (std::size_t c = 0; c < corners.size(); ++c)
        pairs[c] = adjacentPair(corners, c);
}

CornerPair widestPair(std::span<const std::uint32_t> corners, std::size_t c,
                      const std::vector<val3<float>>& positions) {
    const std::size_t m = corners.size();
    if (m == 3)
        return adjacentPair(corners, c);
    const auto corner = [&](std::size_t j) { return corners[j < m ? j : j - m]; };
    const val3<float> here = positions[corners[c]];
    CornerPair best{};
    float bestScore = -1.0F;
    for (std::size_t j = c + 1; j < c + m; ++j) {
        const val3<float> toFirst = positions[corner(j)] - here;
        for (std::size_t k = j + 1; k < c + m; ++k) {
            float score = length(cross(toFirst, positions[corner(k)] - here));
            if (j == c + 1 && k == c + m - 1)
                score *= 2.0F;
            if (score > bestScore) {
                best = {corner(j), corner(k)};
                bestScore = score;
            }
        }
    }
    return bestScore < 0.0F ? adjacentPair(corners, c) : best;
}

} // namespace quill
