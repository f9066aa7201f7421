// SPDX-License-Identifier: Apache-2.0
// Linear blend skinning.
#pragma once

#include "rig/SkinWeights.h"

#include "openquarn/HMatrix.h"
#include "openquarn/HPointArray.h"
#include "openquarn/HUintArray.h"

#include <array>
#include <vector>

namespace rig {

/// The affine part of a matrix for row vectors: x', y' and z' of (1, 0, 0), (0, 1, 0), (0, 0, 1) and the translation.
using Affine = std::array<double, 12>;

/// Column 3 of the matrix is not looked at.
Affine affineOf(const HMatrix& matrix);

/// One geometry to be deformed.
struct BlendTask {
    const SkinWeights& skin;
    const std::vector<Affine>& joints; ///< [skin.joints.size()]: bindPreMatrix * matrix of each
    const HUintArray& vertices;        ///< [points]: the vertex that each point is, below skin.vertexCount(); or empty:
                                       ///< point i is vertex i
    const float* pointWeights;         ///< [points], or null: all are 1
    double envelope = 1.0;
};

/// Moves each point p, in object space, of a vertex with influences k = 0, 1 ... in the order they were given:
///     q = sum of weight[k] * (p * joint[k]),   p' = p + (q - p) * envelope * pointWeight,
/// p' = q where that factor is 1. Points of vertices without influences stay. On several threads; every point has the
/// same bits on any number of them. [any]
void blendPoints(const BlendTask& task, HPointArray& points);

} // namespace rig
