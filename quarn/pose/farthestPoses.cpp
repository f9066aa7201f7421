// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/farthestPoses.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace quarn {
namespace {

/// The candidates, and how far each is from the nearest pose that was met.
class Distances {
public:
    Distances(const std::vector<ValueLimits>& limits, std::span<const double> candidates)
        : candidates_(candidates)
        , squares_(candidates.size() / limits.size(), std::numeric_limits<double>::infinity()) {
        for (const ValueLimits& value : limits)
            perRange_.push_back(value.most > value.least ? 1.0 / (value.most - value.least) : 1.0);
    }

    std::span<const double> pose(std::size_t candidate) const {
        return candidates_.subspan(candidate * perRange_.size(), perRange_.size());
    }

    void meet(std::span<const double> pose) {
        for (std::size_t candidate = 0; candidate < squares_.size(); ++candidate)
            squares_[candidate] = std::min(squares_[candidate], square(this->pose(candidate), pose));
    }

    // infinite while none was met
    double distance(std::size_t candidate) const {
        return std::sqrt(squares_[candidate] / static_cast<double>(perRange_.size()));
    }

private:
    double square(std::span<const double> one, std::span<const double> other) const {
        double sum = 0.0;
        for (std::size_t i = 0; i < one.size(); ++i) {
            const double part = (one[i] - other[i]) * perRange_[i];
            sum += part * part;
        }
        return sum;
    }

    std::span<const double> candidates_;
    std::vector<double> perRange_;
    std::vector<double> squares_;
};

} // namespace

std::vector<ChosenPose> farthestPoses(const std::vector<ValueLimits>& limits, std::span<const double> known,
                                      std::span<const double> candidates, std::span<const double> worth,
                                      std::size_t count, const std::function<void()>& step) {
    Distances distances(limits, candidates);
    for (std::size_t first = 0; first < known.size(); first += limits.size()) {
        distances.meet(known.subspan(first, limits.size()));
        step();
    }
    std::vector<std::size_t> left(worth.size());
    for (std::size_t i = 0; i < left.size(); ++i)
        left[i] = i;
    std::vector<ChosenPose> chosen;
    while (chosen.size() < count && !left.empty()) {
        // before any was met all are equally far
        const auto value = [&](std::size_t i) { return worth[i] * std::min(distances.distance(i), 1e6); };
        const auto best = std::max_element(left.begin(), left.end(),
                                           [&](std::size_t a, std::size_t b) { return value(a) < value(b); });
        chosen.push_back({*best, distances.distance(*best)});
        distances.meet(distances.pose(*best));
        left.erase(best);
        step();
    }
    return chosen;
}

} // namespace quarn
