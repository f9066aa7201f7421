// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quarn/scene/meshes.h"

#include <span>
#include <vector>

namespace quarn {

/// A vector of length 1 for each vertex: the mean of the normals of its polygons, by their area. (0, 1, 0) where none
/// has an area. `xyz` 3 * polygons.vertexCount finite numbers; polygons wind against the clock. Thread: any.
std::vector<float> vertexNormals(std::span<const float> xyz, const MeshPolygons& polygons);

/// The same for each corner of each polygon, where edges at which the surface bends by more than `crease` degrees, or
/// where it does not go on as one of two sides, are hard: only polygons count that lie around the vertex without such
/// an edge between. (0, 0, 0) where none has an area. `xyz` 3 * polygons.vertexCount finite numbers. Thread: any.
std::vector<float> cornerNormals(std::span<const double> xyz, const MeshPolygons& polygons, double crease);

} // namespace quarn
