// SPDX-License-Identifier: Apache-2.0
#include "deformer/blend.h"

#include "quill/parallelFor.h"

namespace neuralWarp {
namespace {

quill::val3<float> narrowed(const HPoint& p) {
    return {static_cast<float>(p.x), static_cast<float>(p.y), static_cast<float>(p.z)};
}

HPoint widened(const quill::val3<float>& v) {
    return {static_cast<double>(v.x), static_cast<double>(v.y), static_cast<double>(v.z)};
}

} // namespace

void blendPositions(HPointArray& positions, const float* weights, const Blend& blend) {
    quill::parallelFor(positions.length(), [&](std::size_t i) {
        const HPoint p = positions[i];
        const bool isDriven = blend.model && blend.data->isVertexAffected(i);
        quill::val3<float> current = isDriven ? (*blend.model)[i] : narrowed(p);
        if (blend.target)
            current = current + ((*blend.target)[i] - current) * blend.targetWeight;
        const float f = weights ? weights[i] * blend.envelope : blend.envelope;
        positions[i] = p + (widened(current) - p) * static_cast<double>(f);
    });
}

} // namespace neuralWarp
