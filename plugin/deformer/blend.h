// SPDX-License-Identifier: Apache-2.0
// The last step of an evaluation: from where the points are towards where they should be.
#pragma once

#include "deformer/neuralWarpData.h"
#include "openquarn/HPointArray.h"

#include <cstddef>

namespace neuralWarp {

/// What points are blended towards. Nothing is owned.
struct Blend {
    /// The arrays have an element for each of the deformed vertices.
    bool fits(std::size_t count) const {
        return (!model || model->size() == count) && (!target || target->size() == count);
    }

    const neuralWarpData* data = nullptr; ///< says which vertices the model drives
    const Points* model = nullptr;        ///< positions by the model; null: none is applied
    const Points* target = nullptr;       ///< null: no target morph
    float targetWeight = 0.0F;            ///< of the way to the target
    float envelope = 1.0F;
};

/// Moves each position p by f * (c - p), where c is the model's position of a driven vertex and p itself (in single
/// precision) of any other, then brought towards the target, and f = envelope * weight.
///   positions  object space; w stays. `blend` must fit.
///   weights    [positions.length()], or null: all 1
void blendPositions(HPointArray& positions, const float* weights, const Blend& blend);

} // namespace neuralWarp
