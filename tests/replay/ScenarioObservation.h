// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "ScenarioScene.h"
#include "values.h"

namespace replay {

// 0, 3, or 1 for every other failure: which of these it is, is the host's affair.
int observedStatus(const HStatus& status);

// All vertices of the last evaluation. Evaluates nothing.
Json observePositions(const ScenarioScene& scene, unsigned index, JsonAllocator& allocator);

// What a deformed geometry shows of itself: positions, flags, settings in force, outputs of the network, affected
// vertices and published buffers. Evaluates nothing.
void observeGeometry(Output& out, const ScenarioScene& scene, unsigned index, JsonAllocator& allocator);

} // namespace replay
