// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/vertexNormals.h"

#include <array>
#include <cmath>

namespace quarn {
namespace {

using Vector = std::array<double, 3>;

Vector operator-(const Vector& a, const Vector& b) {
    return {a[0] - b[0], a[1] - b[1], a[2] - b[2]};
}

Vector cross(const Vector& a, const Vector& b) {
    return {a[1] * b[2] - a[2] * b[1], a[2] * b[0] - a[0] * b[2], a[0] * b[1] - a[1] * b[0]};
}

Vector pointOf(std::span<const float> xyz, std::uint32_t vertex) {
    const std::span<const float> point = xyz.subspan(3 * std::size_t{vertex}, 3);
    return {static_cast<double>(point[0]), static_cast<double>(point[1]), static_cast<double>(point[2])};
}

// twice the area, along the normal, also of a polygon that is not plane (Newell's method, about the first corner)
Vector areaVector(std::span<const float> xyz, std::span<const std::uint32_t> corners) {
    const Vector first = pointOf(xyz, corners[0]);
    Vector sum{};
    for (std::size_t corner = 2; corner < corners.size(); ++corner) {
        const Vector part = cross(pointOf(xyz, corners[corner - 1]) - first, pointOf(xyz, corners[corner]) - first);
        for (std::size_t axis = 0; axis < 3; ++axis)
            sum.at(axis) += part.at(axis);
    }
    return sum;
}

} // namespace

std::vector<float> vertexNormals(std::span<const float> xyz, const MeshPolygons& polygons) {
    std::vector<Vector> sums(polygons.vertexCount, Vector{});
    std::span<const std::uint32_t> corners = polygons.corners;
    for (const std::uint32_t size : polygons.sizes) {
        const Vector area = areaVector(xyz, corners.first(size));
        for (const std::uint32_t vertex : corners.first(size))
            for (std::size_t axis = 0; axis < 3; ++axis)
                sums[vertex].at(axis) += area.at(axis);
        corners = corners.subspan(size);
    }
    std::vector<float> normals;
    normals.reserve(3 * sums.size());
    for (const Vector& sum : sums) {
        const double length = std::hypot(sum[0], sum[1], sum[2]);
        const Vector normal =
            length > 0.0 ? Vector{sum[0] / length, sum[1] / length, sum[2] / length} : Vector{0, 1, 0};
        for (const double value : normal)
            normals.push_back(static_cast<float>(value));
    }
    return normals;
}

} // namespace quarn
