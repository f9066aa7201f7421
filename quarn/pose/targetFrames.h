// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quarn/pose/SceneFrames.h"
#include "quarn/scene/Warp.h"

#include <filesystem>
#include <optional>
#include <string>

namespace quarn {

struct Console;

/// A cache, and how its frames are to be understood.
struct TargetFile {
    std::filesystem::path cache;
    CacheSpace space;
    std::string order = "scene"; ///< of its vertices: "scene", "file" of the character, or "rest": see matchByRest()
    double startFrame = 1.0;     ///< frame of the scene that its first one is; finite
    std::optional<double> restFrame; ///< frame of the scene in which it is at rest, for order "rest"; none: its first
};

/// Opens the cache and gives its frames as the geometry of the scene has its points, as many as that has; says in notes
/// what its own times say otherwise. Throws std::runtime_error, with path or flag and both numbers where it does not
/// fit, as PointCache, readVertexMap() and matchByRest() do. Thread: main.
SceneFrames openTargetFrames(const TargetFile& file, const WarpGeometry& geometry, const Console& console);

} // namespace quarn
