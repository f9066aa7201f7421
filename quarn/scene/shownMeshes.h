// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "openquarn/HPlug.h"

#include <vector>

namespace quarn {

/// What a character looks like: of each mesh, and then of each grid of the scene, in order of creation, what the last
/// of its deformers gives out, or it itself where it has none. Those that only serve another node, as targets and rest
/// meshes do, are left out. Nothing is evaluated. Thread: main.
std::vector<HPlug> shownMeshes();

} // namespace quarn
