// SPDX-License-Identifier: Apache-2.0
// All that goes into a page, and the blocks that it becomes.
#pragma once

#include "quarn/scene/meshes.h"
#include "quarn/view/PageBlocks.h"
#include "quarn/view/PageErrors.h"
#include "quarn/view/PageFrames.h"
#include "quarn/view/PageModel.h"
#include "quarn/view/packing.h"
#include "quarn/view/textures.h"

#include <optional>
#include <vector>

namespace quarn {

/// What is kept of the target.
enum class TargetKind { points, errors, none };

struct PageTarget {
    TargetKind kind = TargetKind::none;
    PackedPoints points;                     ///< of TargetKind::points
    std::vector<std::uint8_t> before, after; ///< of TargetKind::errors [frames][vertices]
    double range = 0.0;                      ///< the same, mm
    std::optional<PageErrors> skin, neural;  ///< none without a target
};

/// The frames that a page checks itself by, and the sums of their points.
struct PageChecks {
    std::vector<std::uint32_t> frames; ///< from 0
    std::vector<std::uint64_t> sums;
};

struct PageContent {
    MeshPolygons polygons; ///< of the rest mesh, with the texture coordinates of what is shown
    std::vector<float> rest;
    PageModel model;
    std::vector<float> weights;      ///< of the deformer; empty: all 1
    std::vector<double> base;        ///< points that come into the chain
    std::optional<InputChain> chain; ///< none: the points of each frame come in
    std::optional<RigChain> rig;     ///< only with a chain
    PageFrames frames;
    PageTarget target;
    PageTextures textures;
    PageChecks checks;
    double mmPerUnit = 1000.0;
};

/// The blocks, in the order of the page. Reads what never changes of joints from the scene. Thread: main.
PageBlocks blocksOf(const PageContent& content);

} // namespace quarn
