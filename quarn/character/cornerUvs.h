// SPDX-License-Identifier: Apache-2.0
// Texture coordinates of a mesh: the first set of the file, by corner, so that joining vertices loses none.
#pragma once

#include "quarn/character/Character.h"

#include <assimp/mesh.h>

namespace quarn {

/// Appends those of a part to `mesh.uvs`, one for each of its vertices; (0, 0) where the part has none. What is not
/// finite becomes 0. Returns how many were not. `part` of the importer, whose points `mesh` has already.
std::size_t appendUvs(const aiMesh& part, CharacterMesh& mesh);

/// Before vertices are joined: gives every corner the texture coordinate of its vertex, one of `mesh.uvs`. Nothing
/// where `mesh.uvs` is empty.
void takeCornerUvs(CharacterMesh& mesh);

/// Makes one of all texture coordinates that are the same, and leaves out those of no corner; in the order of the
/// corners.
void joinUvs(CharacterMesh& mesh);

} // namespace quarn
