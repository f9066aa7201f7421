// SPDX-License-Identifier: Apache-2.0
// How far points that were made on a device may be from those of the CPU, and why.
#pragma once

#include <cfloat>

namespace parity {

/// Of coordinates. `relative` and `mean` are parts of the scene's size: the largest coordinate of what goes in and
/// comes out, times 1 + the largest |weight * envelope|, by which the last step stretches what came before.
struct Limits {
    double absolute; ///< the least that is always allowed
    double relative; ///< the largest distance
    double mean;     ///< the average over all coordinates
};

/// Half a unit in the last place of a float, which one rounding costs.
constexpr double half = FLT_EPSILON / 2;

/// A device may flush what is below the normal floats.
constexpr double flushed = FLT_MIN;

/// Offsets and target morphs. The CPU keeps the input and the last step of the blend in double precision; the device
/// rounds the input, the difference, the product and the sum. The smoothed points and the deltas are sums of the same
/// floats in the same order. On PoCL one half is seen. The host has quotients rounded correctly where the device can;
/// one that cannot may be further away by 2.5 units in the last place for each smoothing pass, and is not allowed for.
constexpr Limits offset{flushed, 2 * half, half / 2};

/// Surface frames. The rest frames' inverses and the transport are doubles on the CPU. The device rounds each element
/// of a matrix, and three products and three sums for each of two transforms; each axis comes from a cross product, a
/// root and a division. On PoCL 2.4 halves are seen; a device need not round a root and a division correctly.
constexpr Limits surface{flushed, 8 * half, half};

/// The device leaves the model out where this much of it is to be seen, and less. The distance is that part of the way
/// from the model's point to the target's, which is no more than the size.
constexpr Limits hidden{flushed, offset.relative + 1e-6, offset.mean + 1e-6};

} // namespace parity
