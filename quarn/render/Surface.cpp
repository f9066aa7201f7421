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

void addPolygon(Surface& surface, std::span<const std::uint32_t> corners) {
    for (std::size_t corner = 2; corner < corners.size(); ++corner)
        surface.triangles.push_back({corners[0], corners[corner - 1], corners[corner]});
    const Vec3 area = areaVector(corners, surface.points);
    for (const std::uint32_t vertex : corners)
        surface.normals[vertex] += area;
}

} // namespace

Surface makeSurface(const MeshPolygons& polygons, std::vector<Vec3> points) {
    Surface surface;
    surface.points = std::move(points);
    surface.normals.resize(surface.points.size());
    surface.triangles.reserve(polygons.corners.size());
    const std::span<const std::uint32_t> corners = polygons.corners;
    std::size_t begin = 0;
    for (const std::uint32_t size : polygons.sizes) {
        addPolygon(surface, corners.subspan(begin, size));
        begin += size;
    }
    for (Vec3& normal : surface.normals)
        normal = normalized(normal);
    return surface;
}

} // namespace quarn
