// SPDX-License-Identifier: Apache-2.0
// The sum of blend shapes.
#pragma once

#include "rig/ShapeDeltas.h"

#include "openquarn/HPointArray.h"
#include "openquarn/HUintArray.h"

#include <span>
#include <vector>

namespace rig {

struct WeightedShape {
    const ShapeDeltas* deltas; ///< not null
    double weight = 0.0;
};

/// One geometry to be deformed.
struct ShapeTask {
    std::span<const WeightedShape> shapes; ///< in the order in which they are added
    std::size_t vertexCount = 0;           ///< of the geometry; no shape's extent() is above it
    const HUintArray& vertices;            ///< [points]: the vertex that each point is, below vertexCount; or empty:
                                           ///< point i is vertex i
    const float* pointWeights;             ///< [points], or null: all are 1
    double envelope = 1.0;
};

/// Moves each point p, in object space, of a vertex v:
///     p' = p + (sum over shapes of weight * delta[v]) * envelope * pointWeight.
/// `sums` is memory to work in, kept for the next time: 24 bytes a vertex. On several threads; every point has the same
/// bits on any number of them. [any]
void addShapes(const ShapeTask& task, std::vector<double>& sums, HPointArray& points);

} // namespace rig
