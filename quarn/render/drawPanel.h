// SPDX-License-Identifier: Apache-2.0
// One panel of a picture.
#pragma once

#include "quarn/render/Framing.h"
#include "quarn/render/Panel.h"
#include "quarn/render/Picture.h"
#include "quarn/render/layout.h"

namespace quarn {

/// `range` the distance that has the last colour, in object space, above 0; `millimetres` the same in the world.
struct HeatScale {
    double range = 1.0;
    double millimetres = 1.0;
};

/// Draws one panel at `left`. Throws std::runtime_error when the memory is not enough, and Interrupted.
void drawPanel(Picture& picture, const Layout& layout, int left, const Camera& camera, const Panel& panel,
               const PanelFrame& frame, const HeatScale& scale);

} // namespace quarn
