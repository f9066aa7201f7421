// SPDX-License-Identifier: Apache-2.0
// Whether what a network gave is enough for the vertices that it drives.
#pragma once

#include "frame/FrameModel.h"

#include <cstddef>

namespace neuralWarp {

/// Why there are no positions.
enum class FrameFault {
    none,
    noOutputs,          ///< the network gave no value at all
    tooFewCoefficients, ///< fewer than there are principal shapes
    tooFewDeltas,       ///< outputs, or the basis of shapes, do not reach the highest slot that is read
    otherPointCount,    ///< the points that come in are not as many as are deformed
    tooFewRestPoints,   ///< Surface mode: the rest shape has fewer points or frames than that
};

struct FrameCheck {
    FrameFault fault = FrameFault::none;
    std::size_t has = 0, needed = 0; ///< coefficients, deltas or points, where their numbers are the fault
};

/// `outputCount` number of values that the network gave. Says nothing of points. [any]
FrameCheck checkOutputs(const FrameModel& model, std::size_t outputCount);

/// The same for deltas that are rebuilt for every slot of the basis, and not only for those that are read. False too
/// when the basis does not reach a slot that is read. [any]
bool areEnoughForAllSlots(const FrameModel& model, std::size_t outputCount);

} // namespace neuralWarp
