// SPDX-License-Identifier: Apache-2.0
// The control points of the meshes in an FBX file of version 7: of its objects the geometries, of these "Vertices" and
// "PolygonVertexIndex". Nothing else is looked at, and no size is believed before it is checked.
#pragma once

#include "quarn/character/ControlMesh.h"

#include <string_view>
#include <vector>

namespace quarn {

/// The meshes in the file's order, of the binary form or the one in text. Throws std::runtime_error, with the reason
/// alone, when the bytes are damaged. Thread: any.
std::vector<ControlMesh> readFbxMeshes(std::string_view bytes);

} // namespace quarn
