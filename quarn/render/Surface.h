// SPDX-License-Identifier: Apache-2.0
// Meshes as the tracer wants them: triangles with smooth normals.
#pragma once

#include "quarn/render/Framing.h"
#include "quarn/render/Vec3.h"
#include "quarn/scene/meshes.h"

#include <array>
#include <cstdint>
#include <span>
#include <vector>

namespace quarn {

struct Surface {
    std::vector<Vec3> points; ///< camera space
    std::vector<std::array<std::uint32_t, 3>> triangles;
    std::vector<std::array<Vec3, 3>> normals; ///< of each triangle's corners, unit length; 0 where there is no area
    std::vector<float> heat; ///< of each point: 0 to 1 within the range of colours, or `unmeasured`; empty for clay
};

/// Of meshes in a heat panel that have no distance.
constexpr float unmeasured = -1.0F;

/// Adds a mesh. Polygons become fans of triangles around their first corner; those of two corners have nothing to show.
/// Shading is smooth over edges at which the surface bends by at most 60 degrees. `xyz` 3 * polygons.vertexCount finite
/// numbers, object space.
void addMesh(Surface& surface, const MeshPolygons& polygons, std::span<const double> xyz, const Camera& camera);

} // namespace quarn
