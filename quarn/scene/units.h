// SPDX-License-Identifier: Apache-2.0
// What lengths and times of the scene are in the world.
#pragma once

#include <optional>

namespace quarn {

/// Of the scene's node of type "character", which `quarn import` makes; 1 in a scene without one. Thread: main.
double metersPerUnit();

/// Frames of the scene in a second, above 0, of the same node; none in a scene without one. Thread: main.
std::optional<double> framesPerSecond();

} // namespace quarn
