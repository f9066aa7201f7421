// SPDX-License-Identifier: Apache-2.0
// The colours of a panel.
#pragma once

#include "quarn/render/Picture.h"
#include "quarn/render/gather.h"

namespace quarn {

/// sRGB of the plain background, by the part of the picture's height that is above: 0 at the top, 1 at the bottom.
Vec3 backgroundColour(float down);

/// Linear light of a pixel that sees the surface.
Vec3 lightOf(const PixelSight& pixel);

/// Paints a panel into a picture, its left edge at `left`, its top at 0, over the background.
void shade(const PanelSight& sight, Picture& picture, int left);

/// The same in the colours as they are, without light. Where the surface ends, steps back or has a crease, a faint line
/// says so.
void shadeFlat(const PanelSight& sight, Picture& picture, int left);

} // namespace quarn
