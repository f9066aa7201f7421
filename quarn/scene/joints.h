// SPDX-License-Identifier: Apache-2.0
// The skeletons of a scene: its joints, and what hangs below what.
#pragma once

#include "openquarn/HMatrix.h"
#include "openquarn/HObject.h"

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

namespace quarn {

struct SceneJoint {
    HObject node;
    std::string name;
    int parent = -1;                 ///< index of the joint whose worldMatrix is its parentMatrix; -1 for a root
    std::optional<std::string> held; ///< of a root: the plug that its parentMatrix comes from, where that is no joint's
    HMatrix space;                   ///< of a root: its parentMatrix now
};

/// All nodes of type "joint", parents before their children, otherwise in order of creation. Throws std::runtime_error,
/// naming a joint, when joints hang below themselves, or a plug cannot be read. Thread: main.
std::vector<SceneJoint> sceneJoints();

/// The joint that the node is; none for any other node.
std::optional<std::size_t> indexOfJoint(const std::vector<SceneJoint>& joints, const HObject& node);

} // namespace quarn
