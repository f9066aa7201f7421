// SPDX-License-Identifier: Apache-2.0
// quarn pose with poses that are drawn, or taken from the scene's animation.
#pragma once

#include "quarn/console/Console.h"
#include "quarn/scene/Warp.h"

#include <cstdint>
#include <optional>
#include <string>

namespace quarn {

/// What is not set comes from the collector, and goes there.
struct SampleOptions {
    std::optional<int> samples; ///< from limits
    std::optional<double> activationRate;
    std::optional<int> start; ///< frame of the first pose
    std::uint64_t seed = 1;
    double tolerance = 1e-3;
    double limitRate = 0.0; ///< of drawn poses, as in DrawSettings
    bool fromLimits = true;
    bool fromAnimation = false;
    std::string frames; ///< of the animation, as frameRange() reads it; empty for the extent of its keys
};

struct SampleReport {
    std::string collector;
    std::size_t values = 0;
    std::size_t poses = 0;
    std::size_t fromLimits = 0; ///< the default pose included
    std::size_t fromAnimation = 0;
    std::size_t drawnAgain = 0;       ///< draws that gave a pose near another
    std::size_t framesLeftOut = 0;    ///< frames of the animation that did
    std::optional<std::size_t> asked; ///< the number of poses that were to be drawn, where it was not reached
    int firstFrame = 1;
    int lastFrame = 1;
};

/// Puts poses on the plugs that the deformer's collector collects, one a frame, and sets the frames to export. The
/// first pose is the default one. Throws std::runtime_error for anything that cannot be sampled, and Interrupted.
/// Thread: main.
SampleReport samplePoses(const Warp& warp, const SampleOptions& options, const Console& console);

} // namespace quarn
