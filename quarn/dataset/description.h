// SPDX-License-Identifier: Apache-2.0
// dataset.json: what a trainer has to know of a data set beside its numbers.
#pragma once

#include "quarn/dataset/DatasetWriter.h"
#include "quarn/dataset/FrameSampler.h"
#include "quarn/fit/targetFit.h"
#include "quarn/scene/frames.h"

#include <filesystem>
#include <optional>
#include <string>

namespace quarn {

struct DatasetFacts {
    std::string scene;   ///< name of its file
    double diagonal = 0; ///< of the rest mesh's bounding box, in units of the scene
    DatasetShape shape;
    std::string restSum;          ///< meshSum() of the rest mesh
    std::optional<TargetFit> fit; ///< none where the target was not compared with the skin
    std::optional<FrameRange>
        drawn; ///< the first and the last frame whose pose was drawn; none where none is known to be
};

/// The text of dataset.json; docs/dataset.md lists what is in it. `controls` the complete controls.npy, whose ranges it
/// states. Throws std::runtime_error. Thread: main.
std::string datasetDescription(const DatasetFacts& facts, const Warp& warp, const WarpGeometry& geometry,
                               const FrameSampler& sampler, const std::filesystem::path& controls);

} // namespace quarn
