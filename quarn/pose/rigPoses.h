// SPDX-License-Identifier: Apache-2.0
// Poses and the rig that they are of.
#pragma once

#include "quarn/console/Console.h"
#include "quarn/pose/PoseSet.h"
#include "quarn/scene/PoseControls.h"
#include "quarn/scene/Warp.h"

#include <vector>

namespace quarn {

constexpr std::size_t mostPoses = 1'000'000; ///< that are made

/// Of each control, in their order.
std::vector<ValueLimits> limitsOf(const std::vector<PoseControl>& controls);

/// Throws std::runtime_error for more poses of so many values, 1 or more, than are made.
void requireRoomForPoses(std::size_t poses, std::size_t values);

/// Of the sampled poses that are on the rig, how many were drawn, each for itself: the first ones. Thread: main.
std::size_t drawnPoses(const std::vector<PoseControl>& controls);

/// Puts the poses, of which the first `drawn` were drawn, on the controls, one a frame, in place of all that quarn pose
/// has put on the rig before, and sets the frames that the deformer exports. Says what still moves. Throws
/// std::runtime_error, naming the plug. Thread: main.
void putSampledPoses(const Warp& warp, const PoseSet& poses, std::size_t drawn,
                     const std::vector<PoseControl>& controls, int firstFrame, const Console& console);

} // namespace quarn
