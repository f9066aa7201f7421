// SPDX-License-Identifier: Apache-2.0
// How far apart two meshes are, as colours.
#pragma once

#include "quarn/render/Vec3.h"

#include <span>
#include <vector>

namespace quarn {

/// The distance of each vertex from its counterpart. `xyz` and `reference` x, y, z of as many vertices, in one unit.
std::vector<double> distances(std::span<const double> xyz, std::span<const double> reference);

/// sRGB, for 0 to 1; what is outside of it, and is not a number, has the colour of the nearer end.
Vec3 heatColour(float heat);

/// sRGB, of what has no distance: none of the scale.
constexpr Vec3 unmeasuredColour{0.74F, 0.79F, 0.86F};

} // namespace quarn
