// SPDX-License-Identifier: Apache-2.0
// Point caches as skins: what a deformer gets in the place of what the scene's joints make of a mesh.
#pragma once

#include "quarn/pose/targetCache.h"

namespace quarn {

/// What the scene computes for the geometry, also where a cache stands in for it. Thread: main.
HPlug ownSkin(const WarpGeometry& geometry);

/// Has the deformer take the geometry from a node MESH_skinCache that plays the cache from `startFrame` on; the node
/// that was there before is set to the new cache. What the scene computes stays connected to it (replacedMesh), and
/// rest mesh and targets as they are. `geometry.input` is another plug after it. `cacheFile` as the scene is to name
/// it. Throws std::runtime_error, naming the plug. Thread: main.
CacheReport connectSkin(const Warp& warp, const WarpGeometry& geometry, const std::string& cacheFile,
                        double startFrame);

} // namespace quarn
