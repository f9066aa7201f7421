// SPDX-License-Identifier: Apache-2.0
// The last step of a frame: from where the points are towards where they should be.
#pragma once

#include "frame/Points.h"
#include "frame/SlotMap.h"

#include <cstddef>
#include <cstdint>

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

/// Positions of a mesh, and where they are written: a frame reads each once, and writes it once. x, y and z of every
/// vertex of the whole mesh, in object space. Nothing is owned.
template <class Coordinate>
struct MovedPointsOf {
    const Coordinate* from;
    Coordinate* to;                          ///< the same array as `from`, or one beside it
    std::size_t count = 0;                   ///< of the deformed vertices
    const std::uint32_t* vertices = nullptr; ///< [count] the vertex of the mesh that each is, none twice; null: all
};
using MovedPoints = MovedPointsOf<double>;

/// Writes each deformed position p as p + f * (c - p), where c is the model's position of a driven vertex and p itself
/// (in single precision) of any other, then brought towards the target, and f = envelope * weight. Of the other
/// vertices of the mesh nothing is written. Calculated in double precision: of floats, the result is that of the same
/// positions in double, rounded.
///   weights    [points.count], or null: all 1
///   blend      must fit `points.count`
void blendPositions(const MovedPoints& points, const float* weights, const Blend& blend);
void blendPositions(const MovedPointsOf<float>& points, const float* weights, const Blend& blend);

} // namespace neuralWarp
