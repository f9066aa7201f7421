// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace quarn {

/// Finds the nearest of many points: a tree that halves them by one axis after another. Thread: any.
class NearestPoint {
public:
    /// `xyz` x, y, z of each point, finite; at least one, and as long as this lives. Fewer than 2^32 points.
    explicit NearestPoint(std::span<const double> xyz);

    /// The nearest to `point`, which has three finite numbers; of several that are as near, the one with the lowest
    /// number.
    std::size_t nearest(std::span<const double> point) const;

private:
    struct Search;
    void sort(std::size_t begin, std::size_t end, std::size_t axis);
    void look(Search& search, std::size_t begin, std::size_t end, std::size_t axis) const;

    std::span<const double> xyz_;
    std::vector<std::uint32_t> tree_; ///< the middle of each range parts it by the axis of its depth
};

} // namespace quarn
