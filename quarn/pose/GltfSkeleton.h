// SPDX-License-Identifier: Apache-2.0
// A skeleton with its meshes and an animation, put together for a .glb.
#pragma once

#include "quarn/pose/Motion.h"
#include "quarn/pose/skinnedGltf.h"

#include <iosfwd>

namespace quarn {

struct GltfSkeleton {
    struct Node {
        SceneJoint joint;
        JointPose rest;
    };
    /// A track of the animation, which has all its keys at the same times.
    struct Channel {
        std::size_t node = 0;  ///< index in `joints`
        const char* path = ""; ///< "translation", "rotation" or "scale"
        std::size_t keys = 0;  ///< accessor
    };
    double metersPerUnit = 1.0;
    GltfNumbers numbers;             ///< of everything below
    std::vector<Node> joints;        ///< parents before their children
    std::size_t times = 0;           ///< accessor of the seconds of the keys
    std::vector<Channel> channels;   ///< of joints
    std::vector<SkinnedGltf> meshes; ///< with a track of weights for each that has targets
};

/// Writes the file: a node a joint, then one above each root that has a space, then the meshes, then, where the unit is
/// not the metre, one above the roots and the meshes without skin that makes metres. There is a track at least.
void writeSkeleton(std::ostream& out, const GltfSkeleton& skeleton);

} // namespace quarn
