// SPDX-License-Identifier: Apache-2.0
// The points that the rig makes: blend shapes, then linear blend skinning, by the arithmetic of the rig nodes.
#pragma once

#include "Settings.h"
#include "frame/Points.h"
#include "rig/ShapeDeltas.h"
#include "rig/addShapes.h"
#include "rig/linearBlend.h"
#include "viewer/Blocks.h"

#include "openquarn/HPointArray.h"
#include "openquarn/HUintArray.h"

#include <span>
#include <vector>

namespace viewer {

/// One thread at a time.
class Skin {
public:
    /// Reads skin.points, -counts, -influences, -weights and shapes.*. Throws std::runtime_error for blocks that do not
    /// fit.
    Skin(const Blocks& blocks, const Settings& settings);

    /// Object space, rounded to single precision.
    ///   result    resized to the vertices
    ///   matrices  [settings.matrices] bindPreMatrix * matrix
    ///   weights   [settings.blendShapes]; those of weight 0 are left out
    void pose(neuralWarp::Points& result, const std::vector<rig::Affine>& matrices, std::span<const double> weights);

private:
    HPointArray base_, points_;
    rig::SkinWeights skin_;
    std::vector<rig::ShapeDeltas> shapes_;
    std::vector<rig::WeightedShape> active_;
    std::vector<double> sums_;
    HUintArray all_; // the vertex that each point is: its own
};

} // namespace viewer
