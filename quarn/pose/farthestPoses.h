// SPDX-License-Identifier: Apache-2.0
// Some of many poses, away from each other.
#pragma once

#include "quarn/pose/PoseSet.h"

#include <functional>
#include <span>
#include <vector>

namespace quarn {

struct ChosenPose {
    std::size_t candidate = 0;
    double distance = 0.0; ///< to the nearest of the known ones and of those that were chosen before
};

/// Chooses `count` of the candidates, all of them where there are fewer: each time the one with the largest product of
/// its worth and its distance, of several the first. It is the farthest-first traversal (Gonzalez 1985, "Clustering to
/// minimize the maximum intercluster distance", algorithm of section 3), weighted: without it the worthiest ones of a
/// batch would be much the same pose. The distance is the root mean square over the values, each in parts of its range.
///
///   limits      of the values, V, not empty
///   known       [n][V], pose by pose: that are there already; may be empty, then the first is the worthiest
///   candidates  [m][V] likewise
///   worth       [m], finite, 0 or above
///   step        called for each known and each chosen pose; may throw
///
/// Takes (n + count) * m * V multiplications.
std::vector<ChosenPose> farthestPoses(const std::vector<ValueLimits>& limits, std::span<const double> known,
                                      std::span<const double> candidates, std::span<const double> worth,
                                      std::size_t count, const std::function<void()>& step);

} // namespace quarn
