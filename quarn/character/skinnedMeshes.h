// SPDX-License-Identifier: Apache-2.0
// The meshes of a character, with their skins, out of the importer's.
#pragma once

#include "quarn/character/controlPoints.h"
#include "quarn/character/skeleton.h"

namespace quarn {

/// From the importer's name of a node to the index of the mesh that is shown there.
using MeshIndices = std::unordered_map<std::string, std::uint32_t>;

/// Adds the meshes of the nodes, joined, and warnings to the character, and says which are which. Throws
/// std::runtime_error, naming the mesh, when an index is out of range or a number is not finite.
MeshIndices readMeshes(const aiScene& scene, const Skeleton& skeleton, const SourceHints& hints, ControlPoints& control,
                       Character& character);

} // namespace quarn
