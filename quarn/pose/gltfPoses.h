// SPDX-License-Identifier: Apache-2.0
// Poses as an animation in a .glb: the skeleton at rest, the meshes with their skins, and keys in every frame.
#pragma once

#include "quarn/pose/FilePlaces.h"
#include "quarn/pose/Motion.h"

#include <iosfwd>

namespace quarn {

/// What is in the file, and what is not.
struct GltfPosesAnswer {
    std::size_t meshes = 0;
    std::vector<HPlug> weights;     ///< what moves the weights of targets that are in the file
    std::vector<std::string> notes; ///< sentences without a full stop
};

/// One node a joint, with its name, at rest; one mesh for each that joints, weights of morph targets or both move; one
/// animation "poses" with linear keys of all frames for whatever leaves the rest pose, of the first joint's rotation in
/// any case, and of all weights. The first frame must not lie before second 0. Lengths are the scene's; where its unit
/// is not the metre, a node `scene_unit` above all makes metres of them. Throws std::runtime_error for a scene without
/// joints and such meshes, a joint below something that is no joint, and numbers that are too many for a file. Thread:
/// main.
GltfPosesAnswer writeGltfPoses(std::ostream& out, const Motion& motion, const FilePlaces& places);

} // namespace quarn
