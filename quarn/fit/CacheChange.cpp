// SPDX-License-Identifier: Apache-2.0
#include "quarn/fit/CacheChange.h"

#include <cmath>

namespace quarn {

bool AxisTurn::isMirror() const {
    int crossings = 0;
    for (std::size_t axis = 0; axis < 3; ++axis)
        for (std::size_t later = axis + 1; later < 3; ++later)
            crossings += from[axis] > from[later] ? 1 : 0;
    return sign[0] * sign[1] * sign[2] * (crossings % 2 == 0 ? 1 : -1) < 0;
}

FitPoint AxisTurn::turned(const FitPoint& point) const {
    FitPoint result{};
    for (std::size_t axis = 0; axis < 3; ++axis)
        result[axis] = sign[axis] * point[static_cast<std::size_t>(from[axis])];
    return result;
}

AxisTurn AxisTurn::then(const AxisTurn& other) const {
    AxisTurn both;
    for (std::size_t axis = 0; axis < 3; ++axis) {
        const auto middle = static_cast<std::size_t>(other.from[axis]);
        both.from[axis] = from[middle];
        both.sign[axis] = other.sign[axis] * sign[middle];
    }
    return both;
}

FitPoint CacheChange::moved(const FitPoint& point) const {
    FitPoint result = axes.turned(point);
    for (std::size_t axis = 0; axis < 3; ++axis)
        result[axis] = scale * result[axis] + offset[axis];
    return result;
}

FitPoint CacheChange::of(std::span<const double> frame, std::size_t vertex) const {
    const std::size_t at = 3 * (order.empty() ? vertex : order[vertex]);
    return moved({frame[at], frame[at + 1], frame[at + 2]});
}

double fitDistance(const FitPoint& a, const FitPoint& b) {
    const double x = a[0] - b[0];
    const double y = a[1] - b[1];
    const double z = a[2] - b[2];
    return std::sqrt(x * x + y * y + z * z);
}

} // namespace quarn
