// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "openquarn/HPlug.h"

#include <vector>

namespace quarn {

/// What a character looks like: of each mesh and grid of the scene, in order of creation, what the last of its
/// deformers gives out, or it itself. Meshes that only serve, as targets or rest meshes do, are left out. Throws
/// std::runtime_error, naming the plug, for one that cannot be read. Thread: main.
std::vector<HPlug> shownMeshes();

} // namespace quarn
