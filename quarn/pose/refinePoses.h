// SPDX-License-Identifier: Apache-2.0
// quarn pose --refine: further poses, of which models know too little.
#pragma once

#include "quarn/console/Console.h"
#include "quarn/scene/Warp.h"

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace quarn {

struct RefineOptions {
    std::vector<std::filesystem::path> models; ///< as ModelEnsemble takes them
    std::size_t count = 0;                     ///< poses to add, 1 or more
    std::size_t candidates = 0;                ///< that are looked at; 0 for 20 for each to add, and 1000 at least
    std::optional<double> activationRate;      ///< of candidates; the collector's when not set, and stored there
    std::uint64_t seed = 1;
    double tolerance = 1e-3; ///< finite, 0 or above
};

struct AddedPose {
    int frame = 0;
    double mm = 0.0;          ///< how far the models are apart in it, as ModelEnsemble::disagreement() has it
    double distance = 0.0;    ///< as ChosenPose has it
    std::size_t atLimits = 0; ///< values that stand at a limit
};

struct RefineReport {
    std::string collector;
    std::size_t values = 0;
    std::size_t known = 0; ///< poses that were there
    std::size_t candidates = 0;
    double candidatesMm = 0.0; ///< how far the models are apart over the candidates, in the mean
    std::vector<AddedPose> added;
    int firstFrame = 1, lastFrame = 1; ///< of all poses
};

/// Adds poses behind those that an earlier sampling has put on the rig, which keep their frames and values: of
/// candidates drawn within the limits those in which the models disagree most, away from the poses that are there and
/// from each other (farthestPoses). One half of them is chosen from candidates drawn as samplePoses() draws, the other
/// from some in which each active value stands at one of its limits with a probability of a half. The same scene,
/// models and options give the same poses where the networks give the same numbers. Throws std::runtime_error, also
/// for a scene without sampled poses and where not so many are found; Interrupted. The scene is no use when it throws.
/// Thread: main.
RefineReport refinePoses(const Warp& warp, const RefineOptions& options, const Console& console);

} // namespace quarn
