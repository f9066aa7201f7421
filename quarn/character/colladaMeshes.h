// SPDX-License-Identifier: Apache-2.0
// The control points of the meshes in a Collada file: of its geometries the positions that `<vertices>` names, and
// which of them the `<p>` of lines, triangles and polygons ask for.
#pragma once

#include "quarn/character/ControlMesh.h"

#include <string_view>
#include <vector>

namespace quarn {

/// The meshes in the file's order, without those that have strips or fans. Throws std::runtime_error, with the reason
/// alone, when the bytes are damaged. Thread: any.
std::vector<ControlMesh> readColladaMeshes(std::string_view bytes);

} // namespace quarn
