// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quarn/scene/meshes.h"

#include <span>
#include <vector>

namespace quarn {

/// A vector of length 1 for each vertex: the mean of the normals of its polygons, by their area. (0, 1, 0) where none
/// has an area. `xyz` 3 * polygons.vertexCount finite numbers; polygons wind against the clock. Thread: any.
std::vector<float> vertexNormals(std::span<const float> xyz, const MeshPolygons& polygons);

} // namespace quarn
