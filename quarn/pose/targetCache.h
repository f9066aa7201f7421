// SPDX-License-Identifier: Apache-2.0
// Point caches as targets of a deformer: what training deltas are measured to, and what it can morph to.
#pragma once

#include "quarn/scene/Warp.h"

#include <optional>
#include <string>

namespace quarn {

/// The mesh whose polygons the target has: what is connected into the geometry's originalGeometry, or else what it
/// deforms. Thread: main.
HPlug restMesh(const WarpGeometry& geometry);

/// How a cache was connected.
struct CacheReport {
    std::string node;      ///< the pointCache
    bool replaced = false; ///< an earlier one of the geometry
    double startFrame = 1.0;
};

/// Has the pointCache play a mesh's file, named as the scene is to name it, from that frame on.
void playCache(const HObject& cache, const HPlug& mesh, const std::string& file, double startFrame);

/// Connects, in the place of what is connected. Both: std::runtime_error, naming the plug. Thread: main.
void connectInto(const HPlug& source, const HPlug& destination);

/// Makes the target of the geometry a node MESH_target that plays the cache from `startFrame` on, or from the first
/// frame that the deformer exports. `cacheFile` as the scene is to name it. A pointCache that is the target and nothing
/// else is set to the new cache; any other target is disconnected. Throws std::runtime_error, naming the plug.
/// Thread: main.
CacheReport connectTarget(const Warp& warp, const WarpGeometry& geometry, const std::string& cacheFile,
                          std::optional<double> startFrame);

} // namespace quarn
