// SPDX-License-Identifier: Apache-2.0
// From the outputs of a network to one delta per driven vertex.
#pragma once

#include "deformer/neuralWarpData.h"

#include <cstddef>
#include <cstdint>
#include <vector>

namespace neuralWarp {

/// Which vertices a model drives, in order, and from which slots: vertex `(*vertices)[k]` from slot
/// `(*slots)[(*vertices)[k]]`, or vertex and slot k when these are null.
struct DrivenVertices {
    /// Those of a geometry's state, which must outlive this.
    explicit DrivenVertices(const neuralWarpData& data)
        : count(data.useAffectMap ? data.affectedVertices.size() : data.componentMap.affectCount())
        , vertices(data.useAffectMap ? &data.affectedVertices : nullptr)
        , slots(data.useAffectMap ? &data.affectMap : nullptr) {}

    std::size_t vertex(std::size_t k) const { return vertices ? (*vertices)[k] : k; }
    std::size_t slot(std::size_t k) const { return slots ? (*slots)[vertex(k)] : vertex(k); }

    std::size_t count = 0;
    const std::vector<std::uint32_t>* vertices = nullptr;
    const std::vector<std::uint32_t>* slots = nullptr;
};

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
