// SPDX-License-Identifier: Apache-2.0
// The weight of a shape that is made of the weights of others.
#pragma once

#include "openquarn/HStatus.h"

#include <cstdint>
#include <span>
#include <vector>

namespace rig {

/// The weight of one shape.
struct ShapeWeight {
    std::uint32_t shape = 0;
    double value = 0.0;
};

/// How a weight is combined, as a scene has it: not trusted.
struct Combination {
    const std::vector<double>& factors; ///< [n] the shapes whose weights are multiplied; a shape may be there twice
    const std::vector<double>& ramps;   ///< [3 * n] begin, peak and end of each factor; or empty: weights as they are
};

/// 0 up to `begin`, 1 at `peak`, 0 from `end` on, straight in between. A side of no width is none: where the peak is
/// the end, the other side goes on beyond it; where it is the begin, below it. begin <= peak <= end, begin < end. [any]
double rampAt(double weight, double begin, double peak, double end);

/// The product of the factors' weights, each taken through its ramp where there are ramps. `weights` those that are
/// given, ascending by shape. Fails, naming list, position and value: a factor that is no whole number or has no
/// weight, a ramp that is not finite or out of order, a number of ramps that does not fit. [any]
HStatus combineWeight(const Combination& combination, std::span<const ShapeWeight> weights, double& product);

} // namespace rig
