// SPDX-License-Identifier: Apache-2.0
#include "nw_model/ControlRanges.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <stdexcept>
#include <string>
#include <utility>

namespace neuralWarp {
namespace {

constexpr double smallestPart = 0.1; // of the root mean square of all widths: see unit()
constexpr double rounding = 1e-5;    // of a unit: what matrices of single precision differ by in the last places

void check(const std::vector<float>& minima, const std::vector<float>& maxima) {
    if (minima.size() != maxima.size())
        throw std::invalid_argument("there are " + std::to_string(minima.size()) + " minima and " +
                                    std::to_string(maxima.size()) + " maxima");
    for (std::size_t i = 0; i < minima.size(); ++i)
        if (!std::isfinite(minima[i]) || !std::isfinite(maxima[i]) || minima[i] > maxima[i])
            throw std::invalid_argument("control " + std::to_string(i) + " ranges from " + std::to_string(minima[i]) +
                                        " to " + std::to_string(maxima[i]));
}

} // namespace

ControlRanges::ControlRanges(std::vector<float> minima, std::vector<float> maxima)
    : minima_(std::move(minima))
    , maxima_(std::move(maxima)) {
    check(minima_, maxima_);
    double squares = 0.0;
    for (std::size_t i = 0; i < count(); ++i) {
        units_.push_back(double{maxima_[i]} - double{minima_[i]});
        squares += units_[i] * units_[i];
    }
    const double least = smallestPart * std::sqrt(squares / static_cast<double>(std::max<std::size_t>(count(), 1)));
    for (double& unit : units_)
        unit = least > 0.0 ? std::max(unit, least) : 1.0; // all still: lengths as they are
}

double ControlRanges::excess(std::size_t control, float value) const {
    if (std::isnan(value))
        return std::numeric_limits<double>::infinity();
    const double below = double{value} - double{minima_[control]};
    const double above = double{value} - double{maxima_[control]};
    const double beyond = below < 0.0 ? below : above > 0.0 ? above : 0.0;
    return std::abs(beyond) <= rounding * units_[control] ? 0.0 : beyond;
}

double ControlRanges::distance(std::span<const float> controls) const {
    double largest = 0.0;
    for (std::size_t i = 0; i < std::min(count(), controls.size()); ++i)
        largest = std::max(largest, std::abs(excess(i, controls[i])) / units_[i]);
    return largest;
}

} // namespace neuralWarp
