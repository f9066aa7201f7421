// SPDX-License-Identifier: Apache-2.0
// Poses that differ from each other.
#pragma once

#include "quarn/scene/ValueLimits.h"

#include <cstddef>
#include <map>
#include <span>
#include <vector>

namespace quarn {

/// Collects poses, each a number for every value, and refuses those that are near one that it has: the largest
/// difference over the values, each divided by most - least, is below the tolerance. A value whose limits are equal
/// counts as if they were 1 apart. With a tolerance of 0 nothing is near. Thread: one at a time.
///
/// Adding looks at the poses only whose projection onto one line lies within the tolerance of the new one's, in
/// O(log n) and the number of those.
class PoseSet {
public:
    /// `tolerance` finite, 0 or above; `limits` not empty.
    PoseSet(std::vector<ValueLimits> limits, double tolerance);

    /// `pose` finite numbers, one for each of limits(). False, and nothing is added, when it is near another.
    bool add(std::span<const double> pose);

    std::size_t count() const { return values_.size() / limits_.size(); }
    const std::vector<ValueLimits>& limits() const { return limits_; }
    std::span<const double> pose(std::size_t number) const;
    /// One value in all poses, in the order of adding.
    std::vector<double> track(std::size_t value) const;

private:
    double range(std::size_t value) const;
    double projection(std::span<const double> pose) const;
    bool near(std::span<const double> one, std::span<const double> other) const;
    bool hasNear(std::span<const double> pose, double place) const;

    std::vector<ValueLimits> limits_;
    double tolerance_;
    std::vector<double> reach_;                  ///< of each value: what the tolerance is in its unit
    std::vector<double> weights_;                ///< of the values in the projection; above 0, their sum is 1
    std::vector<double> values_;                 ///< pose by pose
    std::multimap<double, std::size_t> byPlace_; ///< poses by their projection
};

} // namespace quarn
