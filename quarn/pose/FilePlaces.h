// SPDX-License-Identifier: Apache-2.0
// Where the frames of a scene lie in a file of poses.
#pragma once

#include "quarn/scene/frames.h"

namespace quarn {

/// Frames keep their numbers, moved by `offset`. In files that count seconds frame 1 lies at second 0.
struct FilePlaces {
    int offset = 0;
    double perSecond = 24.0; ///< above 0

    int frame(int sceneFrame) const { return sceneFrame + offset; }
    double seconds(int sceneFrame) const { return (frame(sceneFrame) - 1) / perSecond; }
};

} // namespace quarn
