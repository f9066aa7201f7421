// SPDX-License-Identifier: Apache-2.0
#include "quarn/render/Surface.h"

#include <span>

namespace quarn {
namespace {

// twice the area, along the normal, also of a polygon that is not plane (Newell's method, about the first corner)
Vec3 areaVector(std::span<const std::uint32_t> corners, const std::vector<Vec3>& points) {
    const Vec3 first = points[corners[0]];
    Vec3 sum;
    for (std::size_t corner = 2; corner < corners.size(); ++corner)
        sum += cross(points[corners[corner - 1]] - first, points[corners[corner]] - first);
    return sum;
}

// `first` the surface's point that is the mesh's first vertex
void addPolygon(Surface& surface, std::uint32_t first, std::span<const std::uint32_t> corners,
                const std::vector<Vec3>& points) {
    for (std::size_t corner = 2; corner < corners.size(); ++corner)
        surface.triangles.push_back({first + corners[0], first + corners[corner - 1], first + corners[corner]});
    const Vec3 area = areaVector(corners, points);
    for (const std::uint32_t vertex : corners)
        surface.normals[first + vertex] += area;
}

} // namespace

void addMesh(Surface& surface, const MeshPolygons& polygons, const std::vector<Vec3>& points) {
    const std::size_t first = surface.points.size();
    surface.points.insert(surface.points.end(), points.begin(), points.end());
    surface.normals.resize(surface.points.size());
    std::span<const std::uint32_t> corners = polygons.corners;
    for (const std::uint32_t size : polygons.sizes) {
        addPolygon(surface, static_cast<std::uint32_t>(first), corners.first(size), points);
        corners = corners.subspan(size);
    }
    for (std::size_t point = first; point < surface.points.size(); ++point)
        surface.normals[point] = normalized(surface.normals[point]);
}

} // namespace quarn
