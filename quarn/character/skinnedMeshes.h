// SPDX-License-Identifier: Apache-2.0
// The meshes of a character, with their skins, out of the importer's.
#pragma once

#include "quarn/character/skeleton.h"

namespace quarn {

/// Adds the meshes of the nodes, joined, and warnings to the character. Throws std::runtime_error, naming the mesh,
/// when an index is out of range or a number is not finite.
void readMeshes(const aiScene& scene, const Skeleton& skeleton, const SourceHints& hints, Character& character);

} // namespace quarn
