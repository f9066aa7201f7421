// SPDX-License-Identifier: Apache-2.0
// Whether a cache does what the skin does, wherever it lies.
#pragma once

#include "quarn/fit/SkinFrames.h"

namespace quarn {

enum class Following {
    yes,
    no,
    untold ///< the skin moves too little beside the correction, or in too few frames
};

struct CacheMotion {
    std::size_t posedFrames = 0; ///< that were looked at, and in which the skin is not at rest
    double size = 0.0;           ///< mean distance of two of them
    /// Mean distance of two neighbouring frames; none where no two of those looked at are neighbours.
    std::optional<double> ofAStep;
    Following following = Following::untold;
};

/// A cache that belongs to the skin moves as it does, and something beside that has little to do with it.
CacheMotion motionOf(const SkinFrames& skin, const CacheChange& change);

} // namespace quarn
