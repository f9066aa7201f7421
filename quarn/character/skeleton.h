// SPDX-License-Identifier: Apache-2.0
// The joints of a character out of the importer's nodes.
#pragma once

#include "quarn/character/SourceHints.h"

#include <assimp/scene.h>

#include <string>
#include <unordered_map>
#include <vector>

namespace quarn {

/// A matrix of the importer, which is for column vectors. Throws std::runtime_error, naming `owner`, when it has a
/// value that is not finite or a perspective.
HMatrix rowVectorMatrix(const aiMatrix4x4& matrix, const std::string& owner);

/// A node that shows meshes, where it stands, and the nearest joint at or above it.
struct ShownNode {
    const aiNode* node = nullptr;
    HMatrix worldTransform;
    int parentJoint = -1;
};

struct Skeleton {
    std::unordered_map<std::string, std::uint32_t> jointOf; ///< from the importer's names; those of bones are here
    std::vector<ShownNode> shown;
};

/// Makes joints of the nodes that are bones and of every node above them, from the topmost on that is a bone, is not
/// at the origin or is animated. Warnings are added to the character. Throws std::runtime_error when a bone is no node
/// or the hierarchy is deeper than 1000.
Skeleton readSkeleton(const aiScene& scene, const SourceHints& hints, Character& character);

} // namespace quarn
