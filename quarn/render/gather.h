// SPDX-License-Identifier: Apache-2.0
// What the pixels of a panel see, before it is given colours.
#pragma once

#include "quarn/render/Framing.h"
#include "quarn/render/Surface.h"

#include <vector>

namespace quarn {

/// Means over the rays of a pixel that met the surface, in camera space.
struct PixelSight {
    float cover = 0.0F; ///< the part of the rays that met the surface; nothing else has a meaning where it is 0
    Vec3 position;
    Vec3 normal;           ///< towards the viewer; of any length
    Vec3 albedo;           ///< linear
    float keyLight = 0.0F; ///< cosine of the angle to the key light, where that is above the horizon
    float keyOpen = 0.0F;  ///< 0 in the shadow of the key light, 1 in its full light
    float skyOpen = 0.0F;  ///< the part of the sky that is not hidden by what is near

    /// 1 where another pixel lies on the same smooth piece of surface, down to 0 across a crease or a step.
    float kinship(const PixelSight& other) const;
};

/// A panel, row by row from the top.
struct PanelSight {
    int width = 0;
    int height = 0;
    std::vector<PixelSight> pixels;

    const PixelSight& at(int x, int y) const {
        return pixels[static_cast<std::size_t>(y) * static_cast<std::size_t>(width) + static_cast<std::size_t>(x)];
    }
};

/// Traces a panel, of one that shows heat the colours alone and no light, on all threads that oneTBB has; the result
/// does not depend on their number. Throws std::runtime_error when the memory is not enough, and Interrupted.
PanelSight gather(const Surface& surface, const Camera& camera, int width, int height);

/// Takes the grain out of keyOpen and skyOpen: each pixel gets the mean of its neighbours on the same smooth piece of
/// surface.
void smoothLight(PanelSight& sight);

} // namespace quarn
