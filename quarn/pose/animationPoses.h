// SPDX-License-Identifier: Apache-2.0
// Poses out of the scene's own animation.
#pragma once

#include "quarn/pose/PoseSet.h"
#include "quarn/scene/PoseControls.h"
#include "quarn/scene/frames.h"

#include <functional>

namespace quarn {

/// Throws std::runtime_error, naming the plug, when one has poses of an earlier sampling: then its animation is gone.
/// Thread: main.
void requireOwnAnimation(const std::vector<PoseControl>& controls);

/// From the first to the last key of the curves. Throws std::runtime_error when there are none. Thread: main.
FrameRange extentOf(const std::vector<HObject>& curves);

/// What became of the frames.
struct AnimationPoses {
    std::size_t dropped = 0;  ///< frames whose pose was near one of the set
    std::size_t outside = 0;  ///< frames with a value outside of its limits
    std::string firstOutside; ///< the plug of the first of those
};

/// Adds the pose of each frame to the set, whose values are those of `controls`; the scene stays as it is. `step` is
/// called after each frame, and may throw. Throws std::runtime_error, naming plug and frame, when a plug cannot be
/// evaluated or gives no finite number. Thread: main.
AnimationPoses addAnimationPoses(PoseSet& poses, const std::vector<PoseControl>& controls, const FrameRange& frames,
                                 const std::function<void(std::size_t)>& step);

} // namespace quarn
