// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/Surface.h"

#include "quarn/scene/vertexNormals.h"

namespace quarn {
namespace {

constexpr double crease = 60.0; // degrees: below most rims, and above what a bent finger's joints show

} // namespace

void addMesh(Surface& surface, const MeshPolygons& polygons, std::span<const double> xyz, const Camera& camera) {
    const auto firstPoint = static_cast<std::uint32_t>(surface.points.size());
    const std::vector<Vec3> points = camera.toCamera(xyz);
    surface.points.insert(surface.points.end(), points.begin(), points.end());
    const std::vector<float> normals = cornerNormals(xyz, polygons, crease);
    const auto point = [&](std::size_t corner) { return firstPoint + polygons.corners[corner]; };
    const auto normal = [&](std::size_t corner) {
        return camera.directionToCamera({normals[3 * corner], normals[3 * corner + 1], normals[3 * corner + 2]});
    };
    std::size_t first = 0;
    for (const std::uint32_t size : polygons.sizes) {
        for (std::size_t corner = first + 2; corner < first + size; ++corner) {
            surface.triangles.push_back({point(first), point(corner - 1), point(corner)});
            surface.normals.push_back({normal(first), normal(corner - 1), normal(corner)});
        }
        first += size;
    }
}

} // namespace quarn
