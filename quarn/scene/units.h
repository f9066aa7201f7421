// SPDX-License-Identifier: Apache-2.0
// What a length of the scene is in the world.
#pragma once

namespace quarn {

/// Of the scene's node of type "character", which `quarn import` makes; 1 in a scene without one. Thread: main.
double metersPerUnit();

} // namespace quarn
