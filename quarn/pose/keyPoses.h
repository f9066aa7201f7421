// SPDX-License-Identifier: Apache-2.0
// quarn pose with poses made by hand.
#pragma once

#include "quarn/pose/readKeys.h"
#include "quarn/scene/Warp.h"

#include <optional>

namespace quarn {

struct KeysReport {
    std::size_t plugs = 0;
    std::size_t keys = 0;
    std::size_t held = 0; ///< controls without keys, which have their default at any time
    int firstFrame = 1;
    int lastFrame = 1;
};

/// Puts the keys on their plugs, and sets the frames that the deformer exports to their extent; `warp` none in a scene
/// without one. With `holdOthers`, what the collector at the deformer's poseGenerator collects and has no keys is
/// taken from its animation and has its default. Throws std::runtime_error, naming the plug, and as poseControls()
/// does. Thread: main.
KeysReport keyPoses(const std::optional<Warp>& warp, const std::vector<PlugKeys>& plugs, bool holdOthers);

} // namespace quarn
