// SPDX-License-Identifier: Apache-2.0
// A cache is compared with the skin before it becomes a target, and mended where that is wanted.
#pragma once

#include "quarn/console/Console.h"
#include "quarn/pose/SceneFrames.h"
#include "quarn/pose/targetFrames.h"
#include "quarn/scene/targetCheck.h"

namespace OpenQuarn {
class Session;
}

namespace quarn {

/// What is done about a cache that does not fit.
struct AimOptions {
    bool align = false;  ///< mend what it looks like
    bool anyway = false; ///< take it as it is
};

struct TargetAim {
    std::optional<TargetFit> fit; ///< none where nothing could be compared
    FitContext context;
    bool isAligned = false;
    double startFrame = 1.0; ///< of the first frame, an alignment included
};

/// What the frames of a cache are to be of a geometry.
enum class CacheRole { target, skin };

/// Compares `frames`, which are those of `file`, with the geometry's skin, a skin with that which it is to replace
/// (ownSkin()), in the frames that the deformer exports, or in all of the cache where it exports none of them; tells
/// what is the matter. Aligned, `frames` are changed. Throws std::runtime_error for a cache that fits neither way,
/// unless `anyway`. Thread: main.
TargetAim aimCache(OpenQuarn::Session& host, const Warp& warp, const WarpGeometry& geometry, SceneFrames& frames,
                   const TargetFile& file, CacheRole role, const AimOptions& options, const Console& console);

/// How far it is, and what was mended: sentences, each with a new line.
std::string aimText(const TargetAim& aim);

} // namespace quarn
