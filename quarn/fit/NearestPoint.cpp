// SPDX-License-Identifier: Apache-2.0
// Source: J. L. Bentley, "Multidimensional binary search trees used for associative searching", 1975.
#include "quarn/fit/NearestPoint.h"

#include <algorithm>
#include <limits>
#include <numeric>

namespace quarn {

struct NearestPoint::Search {
    std::span<const double> point;
    std::size_t best = 0;
    double squared = std::numeric_limits<double>::infinity();
};

NearestPoint::NearestPoint(std::span<const double> xyz)
    : xyz_(xyz)
    , tree_(xyz.size() / 3) {
    std::iota(tree_.begin(), tree_.end(), 0U);
    sort(0, tree_.size(), 0);
}

void NearestPoint::sort(std::size_t begin, std::size_t end, std::size_t axis) {
    if (end - begin < 2)
        return;
    const std::size_t middle = begin + (end - begin) / 2;
    const auto at = [&](std::size_t place) { return tree_.begin() + static_cast<std::ptrdiff_t>(place); };
    std::nth_element(at(begin), at(middle), at(end), [&](std::uint32_t a, std::uint32_t b) {
        return xyz_[3 * std::size_t{a} + axis] < xyz_[3 * std::size_t{b} + axis];
    });
    sort(begin, middle, (axis + 1) % 3);
    sort(middle + 1, end, (axis + 1) % 3);
}

std::size_t NearestPoint::nearest(std::span<const double> point) const {
    Search search{point};
    look(search, 0, tree_.size(), 0);
    return search.best;
}

void NearestPoint::look(Search& search, std::size_t begin, std::size_t end, std::size_t axis) const {
    if (begin == end)
        return;
    const std::size_t middle = begin + (end - begin) / 2;
    const std::size_t vertex = tree_[middle];
    double squared = 0.0;
    for (std::size_t i = 0; i < 3; ++i)
        squared += (xyz_[3 * vertex + i] - search.point[i]) * (xyz_[3 * vertex + i] - search.point[i]);
    if (squared < search.squared || (squared == search.squared && vertex < search.best)) {
        search.best = vertex;
        search.squared = squared;
    }
    const double beyond = search.point[axis] - xyz_[3 * vertex + axis];
    const std::size_t next = (axis + 1) % 3;
    const bool isBelow = beyond < 0.0;
    isBelow ? look(search, begin, middle, next) : look(search, middle + 1, end, next);
    if (beyond * beyond <= search.squared) // the other half may have one as near
        isBelow ? look(search, middle + 1, end, next) : look(search, begin, middle, next);
}

} // namespace quarn
