// SPDX-License-Identifier: Apache-2.0
// From the outputs of a network to one delta per driven vertex.
#pragma once

#include "frame/Points.h"
#include "frame/PrincipalBasis.h"
#include "frame/SlotMap.h"

#include <cstdint>
#include <vector>

namespace neuralWarp {

/// deltas[k] = the three outputs of slot m of driven vertex k.
///   deltas   resized to driven.count
///   outputs  at least [3 * (highest slot + 1)]: not checked
void extractComputedDeltas(Points& deltas, const std::vector<float>& outputs, const DrivenVertices& driven);

/// deltas[k] = the sum of the shapes in slot m of driven vertex k (PrincipalBasis::sum).
///   deltas        resized to driven.count
///   coefficients  at least [basis.shapeCount()]: not checked
///   basis         has every slot that is read: not checked
///   blocks        those of the basis that hold them; unused where every vertex has the slot of its own number
///   slotDeltas    a working array, in the same case
void extractPrincipalDeltas(Points& deltas, const std::vector<float>& coefficients, const PrincipalBasis& basis,
                            const DrivenVertices& driven, const std::vector<std::uint32_t>& blocks, Points& slotDeltas);

} // namespace neuralWarp
