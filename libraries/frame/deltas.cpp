// SPDX-License-Identifier: Apache-2.0
#include "frame/deltas.h"

#include "quill/parallelFor.h"

namespace neuralWarp {

void extractComputedDeltas(Points& deltas, const std::vector<float>& outputs, const DrivenVertices& driven) {
    deltas.resize(driven.count);
    quill::parallelFor(
        driven.count,
        [&](std::size_t k) {
            const float* output = outputs.data() + 3 * driven.slot(k);
            deltas[k] = {output[0], output[1], output[2]};
        },
        quill::copyGrain);
}

void extractPrincipalDeltas(Points& deltas, const std::vector<float>& coefficients, const PrincipalBasis& basis,
                            const DrivenVertices& driven, const std::vector<std::uint32_t>& blocks,
                            Points& slotDeltas) {
    // one shape of a block takes longer than a vertex is copied
    const std::size_t grain = quill::copyGrain / (basis.shapeCount() + 1);
    if (!driven.slots) {
        // a model may have more slots than are driven, and no block writes beyond the basis
        deltas.resize(basis.slotCount());
        quill::parallelForRange((driven.count + PrincipalBasis::lanes - 1) / PrincipalBasis::lanes,
                                [&](int begin, int end) {
                                    basis.sum(deltas.data(), coefficients.data(), static_cast<std::size_t>(begin),
                                              static_cast<std::size_t>(end));
                                },
                                grain);
        deltas.resize(driven.count);
        return;
    }
    slotDeltas.resize(basis.slotCount());
    quill::parallelFor(
        blocks.size(),
        [&](std::size_t i) {
            basis.sum(slotDeltas.data(), coefficients.data(), blocks[i], std::size_t{blocks[i]} + 1);
        },
        grain);
    deltas.resize(driven.count);
    quill::parallelFor(
        driven.count, [&](std::size_t k) { deltas[k] = slotDeltas[driven.slot(k)]; }, quill::copyGrain);
}

} // namespace neuralWarp
