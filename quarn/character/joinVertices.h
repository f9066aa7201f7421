// SPDX-License-Identifier: Apache-2.0
// Undoing the splits that file formats make along seams, so that the adjacency of a mesh is that of its surface.
#pragma once

#include "quarn/character/Character.h"

namespace quarn {

/// Makes one of all vertices that have the same position, the same influences and the same deltas in every morph
/// target, bit for bit (0 and -0 are the same): what moves alike stays together. The joined vertices are in the order
/// of their first appearance, and `joinedOf` is set. Corners of a polygon that follow each other and become one count
/// once, with the texture coordinate of the first; polygons of fewer than three corners go. Returns how many polygons
/// went.
///
/// On entry `points`, `influences` [points.size()] and `morphTargets` hold the file's vertices, and every index is in
/// range.
std::size_t joinVertices(CharacterMesh& mesh);

} // namespace quarn
