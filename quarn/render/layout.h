// SPDX-License-Identifier: Apache-2.0
// How a picture is put together from panels.
#pragma once

#include "quarn/render/Framing.h"
#include "quarn/render/Picture.h"

#include <string>

namespace quarn {

/// What is drawn around the panels, and the room that it takes.
struct Layout {
    int width = 480; ///< of one panel
    int height = 480;
    bool hasLabels = false;
    bool hasColourBar = false; ///< in any panel
    bool isCloseUp = false;    ///< of a part of what is there: something of what is around it is shown

    /// The room that the surface has to leave free, in every panel, so that all show it in the same place.
    Margins margins() const;
};

/// The label of the panel whose left edge is at `left`, centred at its top.
void drawLabel(Picture& picture, const Layout& layout, int left, const std::string& label);

/// The colour bar at the bottom of that panel, from 0 to `range` millimetres.
void drawColourBar(Picture& picture, const Layout& layout, int left, double range);

} // namespace quarn
