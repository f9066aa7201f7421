// SPDX-License-Identifier: Apache-2.0
// A deformer behind the skins of a character, with the nodes that bring it the controls.
#pragma once

#include "quarn/import/characterScene.h"
#include "quarn/import/posedJoints.h"

#include <optional>
#include <string>

namespace quarn {

/// What the user has said; what has no value keeps the node's default.
struct WarpSettings {
    std::string controls = "double-axis"; ///< or ortho, quaternion, euler
    std::string modelRoot = "models";     ///< as the scene has it
    std::string deltaMode = "surface";    ///< or offset
    std::optional<int> smoothing;
    std::optional<int> samples;
    std::optional<double> activationRate;
    std::optional<int> lastFrame; ///< to be exported; the first is 1
};

struct WarpNodes {
    HObject warp;
    HObject poses;
    HObject axes;
    HObject controls;
};

/// Makes the nodes, first thing in a scene, so that they have the names by which other commands know them. Throws
/// std::runtime_error, naming the node. Thread: main.
WarpNodes makeWarpNodes(const WarpSettings& settings);

/// Connects them: every mesh that a skin moves becomes a geometry of the deformer, by rising index. Throws
/// std::runtime_error, naming the node. Thread: main.
void connectWarp(const WarpNodes& nodes, const WarpSettings& settings, const std::vector<PosedJoint>& joints,
                 const CharacterScene& scene);

} // namespace quarn
