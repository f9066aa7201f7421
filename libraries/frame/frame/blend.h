// SPDX-License-Identifier: Apache-2.0
// The last step of a frame: from where the points are towards where they should be.
#pragma once

#include "frame/Points.h"
#include "frame/SlotMap.h"
#include "quill/parallelFor.h"

#include <cstddef>

namespace neuralWarp {

/// What points are blended towards. Nothing is owned.
struct Blend {
    /// The arrays have an element for each of the deformed vertices.
    bool fits(std::size_t count) const {
        return (!model || model->size() == count) && (!target || target->size() == count);
    }

    DrivenVertices driven;          ///< by the model
    const Points* model = nullptr;  ///< positions by the model; null: none is applied
    const Points* target = nullptr; ///< null: no target morph
    float targetWeight = 0.0F;      ///< of the way to the target
    float envelope = 1.0F;
};

/// Moves each position p by f * (c - p), where c is the model's position of a driven vertex and p itself (in single
/// precision) of any other, then brought towards the target, and f = envelope * weight.
///   positions  [count] object space, of any type with members x, y and z in double precision; others stay as they are
///   weights    [count], or null: all 1
///   blend      must fit `count`
template <class Point>
void blendPositions(Point* positions, std::size_t count, const float* weights, const Blend& blend) {
    const auto moveTo = [](Point& p, const quill::val3<float>& c, double f) {
        p.x += (static_cast<double>(c.x) - p.x) * f;
        p.y += (static_cast<double>(c.y) - p.y) * f;
        p.z += (static_cast<double>(c.z) - p.z) * f;
    };
    if (blend.model && !blend.target && !blend.driven.slots && !weights) { // what most frames are
        const quill::val3<float>* const model = blend.model->data();
        const auto f = static_cast<double>(blend.envelope);
        quill::parallelForRange(count, [=](int begin, int end) {
            for (int i = begin; i < end; ++i)
                moveTo(positions[i], model[i], f);
        });
        return;
    }
    quill::parallelFor(count, [&](std::size_t i) {
        Point& p = positions[i];
        quill::val3<float> c{static_cast<float>(p.x), static_cast<float>(p.y), static_cast<float>(p.z)};
        if (blend.model && blend.driven.contains(i))
            c = (*blend.model)[i];
        if (blend.target)
            c = c + ((*blend.target)[i] - c) * blend.targetWeight;
        moveTo(p, c, static_cast<double>(weights ? weights[i] * blend.envelope : blend.envelope));
    });
}

} // namespace neuralWarp
