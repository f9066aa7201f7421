// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/PoseSet.h"

#include <algorithm>
#include <cmath>
#include <numeric>

namespace quarn {
namespace {

// positive weights of sum 1 that are no small multiples of each other, so that few poses share a projection by chance
std::vector<double> projectionWeights(std::size_t count) {
    constexpr double goldenRatio = 0.6180339887498949;
    std::vector<double> weights(count);
    double ignored = 0.0;
    for (std::size_t i = 0; i < count; ++i)
        weights[i] = 0.5 + std::modf(static_cast<double>(i) * goldenRatio, &ignored);
    const double sum = std::accumulate(weights.begin(), weights.end(), 0.0);
    for (double& weight : weights)
        weight /= sum;
    return weights;
}

} // namespace

PoseSet::PoseSet(std::vector<ValueLimits> limits, double tolerance)
    : limits_(std::move(limits))
    , tolerance_(tolerance)
    , weights_(projectionWeights(limits_.size())) {
    reach_.reserve(limits_.size());
    for (std::size_t i = 0; i < limits_.size(); ++i)
        reach_.push_back(tolerance * range(i));
}

double PoseSet::range(std::size_t value) const {
    const double range = limits_[value].most - limits_[value].least;
    return range > 0.0 ? range : 1.0;
}

double PoseSet::projection(std::span<const double> pose) const {
    double sum = 0.0;
    for (std::size_t i = 0; i < pose.size(); ++i)
        sum += weights_[i] * ((pose[i] - limits_[i].least) / range(i));
    return sum;
}

bool PoseSet::near(std::span<const double> one, std::span<const double> other) const {
    for (std::size_t i = 0; i < one.size(); ++i)
        if (std::abs(one[i] - other[i]) >= reach_[i])
            return false;
    return true;
}

// no two near poses are further apart on the line than the tolerance, as the weights are positive and have the sum 1
bool PoseSet::hasNear(std::span<const double> pose, double place) const {
    const double reach = tolerance_ + 1e-12 * (1.0 + std::abs(place)); // and rounding
    const auto end = byPlace_.upper_bound(place + reach);
    return std::any_of(byPlace_.lower_bound(place - reach), end,
                       [&](const auto& known) { return near(pose, this->pose(known.second)); });
}

bool PoseSet::add(std::span<const double> pose) {
    const double place = projection(pose);
    if (tolerance_ > 0.0 && hasNear(pose, place))
        return false;
    byPlace_.emplace(place, count());
    values_.insert(values_.end(), pose.begin(), pose.end());
    return true;
}

std::span<const double> PoseSet::pose(std::size_t number) const {
    return std::span(values_).subspan(number * limits_.size(), limits_.size());
}

std::vector<double> PoseSet::track(std::size_t value) const {
    std::vector<double> numbers(count());
    for (std::size_t number = 0; number < numbers.size(); ++number)
        numbers[number] = values_[number * limits_.size() + value];
    return numbers;
}

} // namespace quarn
