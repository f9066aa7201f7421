// SPDX-License-Identifier: Apache-2.0
// From the outputs of a network to one delta per driven vertex.
#pragma once

#include "frame/Points.h"
#include "frame/SlotMap.h"

#include <cstddef>
#include <vector>

namespace neuralWarp {

/// deltas[k] = the three outputs of slot m of driven vertex k.
///   deltas   resized to driven.count
///   outputs  at least [3 * (highest slot + 1)]: not checked
void extractComputedDeltas(Points& deltas, const std::vector<float>& outputs, const DrivenVertices& driven);

/// deltas[k] = the sum over all shapes j of coefficients[j] * basis[m][j], in single precision and increasing j.
///   deltas        resized to driven.count
///   coefficients  at least [shapeCount]: not checked
///   basis         at least [highest slot + 1][shapeCount][3]: not checked
void extractPrincipalDeltas(Points& deltas, const std::vector<float>& coefficients, std::size_t shapeCount,
                            const std::vector<float>& basis, const DrivenVertices& driven);

} // namespace neuralWarp
