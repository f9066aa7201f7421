// SPDX-License-Identifier: Apache-2.0
// The skin of a deformed geometry beside frames that are its targets, or are to be.
#pragma once

#include "quarn/console/Console.h"
#include "quarn/console/json.h"
#include "quarn/fit/fitWords.h"
#include "quarn/scene/Warp.h"

#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace OpenQuarn {
class Session;
}

namespace quarn {

/// What is compared; frames of the target count from 0.
struct TargetFrames {
    std::size_t count = 0;                         ///< above 0
    std::size_t first = 0;                         ///< the skin is looked at from this one
    std::size_t last = 0;                          ///< to this one, below count
    std::size_t reach = 0;                         ///< how many frames early or late is tried
    FitInput::Read read;                           ///< x, y, z of each vertex of the mesh
    std::function<double(std::size_t frame)> time; ///< of the scene
    std::vector<std::size_t> vertices;             ///< that count, each below those of the mesh; empty: all
    const char* role = "target";                   ///< what they are of the geometry, for the log and warnings
};

/// So many frames early or late can be tried in a second or two: 50 for most meshes, 3 at least.
std::size_t affordableReach(std::size_t vertices);

/// Compares with geometry.input, with the scene at other times meanwhile. None, and a warning with the reason, when the
/// skin or the target cannot be had in one of these frames, or the skin has another number of vertices than `rest`, the
/// mesh at rest. Throws Interrupted. Thread: main.
std::optional<TargetFit> compareWithSkin(OpenQuarn::Session& host, const WarpGeometry& geometry, const HPlug& rest,
                                         const TargetFrames& frames, const Console& console);

/// Throws std::runtime_error with the verdict's refusal, unless `anyway`: then it is a warning, as the other sentences.
void tell(const FitVerdict& verdict, bool anyway, const Console& console);

/// "fit": an object, or null where nothing was compared. Distances are those of the mended target where `isMended`.
void writeFit(JsonWriter& writer, const std::optional<TargetFit>& fit, const FitContext& context, bool isMended);

} // namespace quarn
