// SPDX-License-Identifier: Apache-2.0
#include "quarn/report/MeshErrors.h"

#include <algorithm>
#include <cmath>
#include <utility>

namespace quarn {

void DistanceBins::add(double millimetres) {
    const double place = millimetres > 0.0 ? perDecade * (std::log10(millimetres) - firstDecade) : 0.0;
    ++counts_[static_cast<std::size_t>(std::clamp(place, 0.0, static_cast<double>(count - 1)))];
}

double DistanceBins::edge(std::size_t bin) {
    return std::pow(10.0, firstDecade + static_cast<double>(bin) / perDecade);
}

void ErrorJitter::add(std::vector<double> left) {
    for (std::size_t i = 0; i + 2 < before_.size(); i += 3) {
        const auto second = [&](std::size_t axis) {
            return left[i + axis] - 2.0 * last_[i + axis] + before_[i + axis];
        };
        const double length = std::hypot(second(0), second(1), second(2));
        sum_ += length;
        largest_ = std::max(largest_, length);
        ++count_;
    }
    before_ = std::exchange(last_, std::move(left));
}

void MeshErrors::add(int frame, std::span<const float> points, std::span<const float> target) {
    distances_.add(frame, points, target);
    jitter_.add(points);
    const std::size_t count = points.size() / 3;
    sums_.resize(count, 0.0);
    largest_.resize(count, 0.0);
    std::vector<double> left(points.size());
    for (std::size_t i = 0; i < points.size(); ++i)
        left[i] = (static_cast<double>(points[i]) - static_cast<double>(target[i])) * millimetres_;
    MeanAndMax all;
    for (std::size_t vertex = 0; vertex < count; ++vertex) {
        const double length = std::hypot(left[3 * vertex], left[3 * vertex + 1], left[3 * vertex + 2]);
        bins_.add(length);
        sums_[vertex] += length;
        largest_[vertex] = std::max(largest_[vertex], length);
        all.mean += length / static_cast<double>(count);
        all.max = std::max(all.max, length);
    }
    frames_.push_back(all);
    errorJitter_.add(std::move(left));
}

std::vector<MeanAndMax> MeshErrors::vertices() const {
    std::vector<MeanAndMax> all(sums_.size());
    for (std::size_t vertex = 0; vertex < all.size(); ++vertex)
        all[vertex] = {sums_[vertex] / static_cast<double>(frames_.size()), largest_[vertex]};
    return all;
}

} // namespace quarn
