// SPDX-License-Identifier: Apache-2.0
// A deformer behind the skins of a character, with the nodes that bring it the controls.
#pragma once

#include "quarn/import/characterScene.h"
#include "quarn/import/posedJoints.h"
#include "quarn/import/posedSliders.h"

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
    HObject axes; ///< null where no joint is posed
    HObject controls;
};

/// Makes the nodes, first thing in a scene, so that they have the names by which other commands know them. Throws
/// std::runtime_error, naming the node. Thread: main.
WarpNodes makeWarpNodes(const WarpSettings& settings, bool hasJoints);

/// Whether the mesh is a geometry of the deformer: a skin moves it, or a slider that is posed.
bool isDeformed(const CharacterScene& scene, std::size_t mesh, const PosedSliders& sliders);

/// Connects them: every mesh that isDeformed() becomes a geometry of the deformer, by rising index. Controls are those
/// of the joints, and then the sliders, mesh by mesh. Throws std::runtime_error, naming the node. Thread: main.
void connectWarp(const WarpNodes& nodes, const WarpSettings& settings, const std::vector<PosedJoint>& joints,
                 const PosedSliders& sliders, const CharacterScene& scene);

} // namespace quarn
