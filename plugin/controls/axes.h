// SPDX-License-Identifier: Apache-2.0
// Two axes that say how something is turned, free of the jumps of angles.
#pragma once

#include "openquarn/HVector.h"

namespace neuralWarp {

/// Perpendicular unit vectors.
struct AxisPair {
    HVector x;
    HVector y;
};

/// `x` normalised, and `y` without its part along x, normalised (Gram-Schmidt). For a zero x, a zero y, or a y parallel
/// to x there are no two such vectors: a zero vector stays zero, and what rounding leaves of a parallel one is
/// normalised. [any]
inline AxisPair orthonormalAxes(const HVector& x, const HVector& y) noexcept {
    const HVector unitX = x.normal();
    return {unitX, (y - unitX * (y * unitX)).normal()};
}

} // namespace neuralWarp
