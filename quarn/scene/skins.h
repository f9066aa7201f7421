// SPDX-License-Identifier: Apache-2.0
// Which joints of a scene move which vertices.
#pragma once

#include "openquarn/HPlug.h"
#include "quarn/scene/joints.h"
#include "rig/SkinWeights.h"

namespace quarn {

/// A geometry of a skinCluster.
struct SceneSkin {
    std::string node;     ///< the skinCluster
    std::string mesh;     ///< name of the mesh node that the geometry comes from, or of the node that gives it out
    bool isMoved = false; ///< something deforms it before the skin does
    HPlug input;          ///< the mesh as it comes into the skin, in the space of the world
    rig::SkinWeights weights;
    /// What moves the vertices, by position in weights.joints; see below for one that is no joint.
    struct Influence {
        std::optional<std::size_t> joint; ///< index among the scene's joints; none when it is another matrix
        HMatrix inverseBind;              ///< bindPreMatrix
    };
    std::vector<Influence> influences; ///< [weights.joints.size()]
};

/// The geometries of all skinClusters that are bound and have a mesh. Throws std::runtime_error, naming the plug, for
/// lists that are damaged. Thread: main.
std::vector<SceneSkin> sceneSkins(const std::vector<SceneJoint>& joints);

/// For each of `jointCount` joints how many vertices of all skins it moves itself, with a weight that is not 0.
std::vector<std::size_t> movedVertices(const std::vector<SceneSkin>& skins, std::size_t jointCount);

} // namespace quarn
