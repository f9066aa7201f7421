// SPDX-License-Identifier: Apache-2.0
#include "rig/combinedWeight.h"

#include "rig/listChecks.h"
#include "rig/texts.h"

#include <algorithm>
#include <string>

namespace rig {
namespace {

HStatus check(const Combination& combination) {
    const std::size_t expected = 3 * combination.factors.size();
    if (!combination.ramps.empty() && combination.ramps.size() != expected)
        return wrong("ramps has " + std::to_string(combination.ramps.size()) + " values; the " +
                     std::to_string(combination.factors.size()) + " factors need " + std::to_string(expected) +
                     " or none");
    const HStatus status = checkIndices("factors", combination.factors);
    return status.error() ? status : checkFinite("ramps", combination.ramps);
}

HStatus findWeight(std::span<const ShapeWeight> weights, const std::vector<double>& factors, std::size_t i,
                   double& found) {
    const auto shape = static_cast<std::uint32_t>(factors[i]);
    const auto place = std::lower_bound(weights.begin(), weights.end(), shape,
                                        [](const ShapeWeight& a, std::uint32_t b) { return a.shape < b; });
    if (place == weights.end() || place->shape != shape)
        return wrong(element("factors", i) + " is " + std::to_string(shape) + ", but there is no " +
                     element("weight", shape));
    found = place->value;
    return HStatus::kSuccess;
}

HStatus takeThroughRamp(const std::vector<double>& ramps, std::size_t i, double& weight) {
    const double begin = ramps[3 * i], peak = ramps[3 * i + 1], end = ramps[3 * i + 2];
    if (!(begin <= peak && peak <= end && begin < end))
        return wrong("the ramp of " + element("factors", i) + " is " + text(begin) + " " + text(peak) + " " +
                     text(end) + ", not begin, peak and end in this order");
    weight = rampAt(weight, begin, peak, end);
    return HStatus::kSuccess;
}

} // namespace

double rampAt(double weight, double begin, double peak, double end) {
    const bool rises = begin < peak && (weight < peak || peak == end);
    const double height = rises ? (weight - begin) / (peak - begin) : (end - weight) / (end - peak);
    return std::max(height, 0.0);
}

HStatus combineWeight(const Combination& combination, std::span<const ShapeWeight> weights, double& product) {
    HStatus status = check(combination);
    double made = 1.0;
    for (std::size_t i = 0; i < combination.factors.size() && !status.error(); ++i) {
        double weight = 0.0;
        status = findWeight(weights, combination.factors, i, weight);
        if (!status.error() && !combination.ramps.empty())
            status = takeThroughRamp(combination.ramps, i, weight);
        made *= weight;
    }
    if (!status.error())
        product = made;
    return status;
}

} // namespace rig
