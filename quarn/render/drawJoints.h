// SPDX-License-Identifier: Apache-2.0
// A skeleton over a picture, as it is posed now.
#pragma once

#include "openquarn/HPoint.h"
#include "quarn/render/Framing.h"
#include "quarn/render/Picture.h"
#include "quarn/render/layout.h"

#include <vector>

namespace quarn {

struct ShownJoint {
    HPoint place;    ///< object space, which is that of the world
    int parent = -1; ///< index of the joint above; -1: none
};

/// All joints of the scene at its time, parents first. Throws std::runtime_error, naming a plug that cannot be read.
/// Thread: main.
std::vector<ShownJoint> shownJoints();

/// Draws a dot for each joint, and a stick from each to the one above that is thick there, over the panel that begins
/// at column `left`. What is behind the viewer is left out.
void drawJoints(Picture& picture, const Layout& layout, int left, const Camera& camera,
                const std::vector<ShownJoint>& joints);

} // namespace quarn
