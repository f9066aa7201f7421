// SPDX-License-Identifier: Apache-2.0
// Whether what a network gave is enough for the vertices that it drives.
#pragma once

#include "deformer/neuralWarpData.h"

#include <cstddef>

namespace neuralWarp {

enum class Outputs {
    kEnough,
    kNone,               ///< the network gave no value at all
    kTooFewCoefficients, ///< fewer than there are principal shapes
    kTooFewDeltas,       ///< outputs, or the basis of shapes, do not reach the highest slot that is read
};

struct OutputCheck {
    Outputs outcome = Outputs::kEnough;
    std::size_t has = 0, needed = 0; ///< coefficients or deltas, when there are too few of them
};

/// The outputs are coefficients of principal shapes, and not the deltas themselves. [any]
bool usesPrincipalShapes(const neuralWarpData& data);

/// `outputCount` number of values that the network gave. [any]
OutputCheck checkOutputs(const neuralWarpData& data, std::size_t outputCount);

/// The same for deltas that are rebuilt for every slot of the basis, and not only for those that are read. False too
/// when the basis does not reach a slot that is read. [any]
bool areEnoughForAllSlots(const neuralWarpData& data, std::size_t outputCount);

} // namespace neuralWarp
