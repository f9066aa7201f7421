// SPDX-License-Identifier: Apache-2.0
// Undoing the splits that file formats make along seams, so that the adjacency of a mesh is that of its surface.
#pragma once

#include "quarn/character/Character.h"

namespace quarn {

/// Makes one of all vertices that have the same position and the same influences, bit for bit (0 and -0 are the same):
/// what a skin moves alike stays together. The joined vertices are in the order of their first appearance, and
/// `joinedOf` is set. Corners of a polygon that follow each other and become one count once; polygons of fewer than
/// three corners go. Returns how many polygons went.
///
/// On entry `points` and `influences` [points.size()] hold the file's vertices and every corner is in range.
std::size_t joinVertices(CharacterMesh& mesh);

} // namespace quarn
