// SPDX-License-Identifier: Apache-2.0
// The lights of every picture. They stand with the camera, so that all views are lit alike. Linear, camera space.
#pragma once

#include "quarn/render/Vec3.h"

namespace quarn::lights {

/// A large lamp above the viewer's left shoulder.
inline const Vec3 towardsKey = normalized({-0.50F, 0.62F, 0.75F});
constexpr float keyCone = 0.985F; ///< cosine of half the angle that the lamp fills: soft shadows
constexpr Vec3 key{2.25F, 2.10F, 1.90F};

/// A sky that is brighter above than below.
constexpr Vec3 skyAbove{0.98F, 1.04F, 1.14F};
constexpr Vec3 skyBelow{0.46F, 0.40F, 0.37F};
constexpr float skyReach = 0.35F; ///< what is farther away hides none of it; in distances to the viewer

/// A faint light on edges that turn away.
constexpr Vec3 rim{0.16F, 0.17F, 0.19F};
constexpr float sheen = 0.10F; ///< of the highlight of the key light

constexpr Vec3 clay{0.68F, 0.435F, 0.32F};

} // namespace quarn::lights
