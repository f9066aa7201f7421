// SPDX-License-Identifier: Apache-2.0
// Whether the frames of a cache can be the targets of a skin, and what is the matter with them where they cannot.
#pragma once

#include "quarn/fit/findings.h"
#include "quarn/fit/following.h"

namespace quarn {

enum class Cause { shift, place, order };

struct TargetFit {
    double diagonal = 0.0;
    FitDistance asItIs;
    /// Each brings the mean distance below a third of what it was before it, and no other comes near. In the order in
    /// which they were found.
    std::vector<Cause> causes;
    CacheChange change;                           ///< all of them
    FitDistance mended;                           ///< with the change; `asItIs` without one
    std::ptrdiff_t leastShift = 0, mostShift = 0; ///< between which shifts are alike
    std::optional<std::size_t> restFrame;         ///< of the cache, that tells the order of its vertices
    CacheMotion motion;                           ///< with the change
    /// Too little for a cause, but more than nothing: a shift that brings the mean to `nearerMean`; 0 for none.
    std::ptrdiff_t nearerShift = 0;
    double nearerMean = 0.0;
    bool isTooSlow = false; ///< a frame early or late would not show, since a step of the skin is short beside the mean
};

/// Looks at up to twelve frames of the skin, and for them at as many of the cache as `input.reach` asks for. Throws
/// what the reading functions of `input` throw. Memory: twelve frames in single precision.
TargetFit fitTarget(const FitInput& input);

/// Beyond one of the limits; beyond that of frames at rest.
bool isBeyondLimits(const FitDistance& distance, double diagonal);
bool isBeyondAtRest(const FitDistance& distance, double diagonal);

} // namespace quarn
