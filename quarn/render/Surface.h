// SPDX-License-Identifier: Apache-2.0
// Meshes as the tracer wants them: triangles with smooth normals.
#pragma once

#include "quarn/render/Vec3.h"
#include "quarn/scene/meshes.h"

#include <array>
#include <cstdint>
#include <vector>

namespace quarn {

struct Surface {
    std::vector<Vec3> points;  ///< camera space
    std::vector<Vec3> normals; ///< of each point, unit length; 0 where no polygon has an area
    std::vector<std::array<std::uint32_t, 3>> triangles;
    std::vector<float> heat; ///< of each point: 0 to 1 within the range of colours, or `unmeasured`; empty for clay
};

/// Of meshes in a heat panel that have no distance.
constexpr float unmeasured = -1.0F;

/// Adds a mesh. Polygons become fans of triangles around their first corner; those of two corners have nothing to show.
/// A point's normal is the mean of those of its polygons, by their area. `points` [polygons.vertexCount], finite.
void addMesh(Surface& surface, const MeshPolygons& polygons, const std::vector<Vec3>& points);

} // namespace quarn
