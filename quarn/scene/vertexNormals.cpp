// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/vertexNormals.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdint>
#include <numbers>
#include <numeric>

namespace quarn {
namespace {

using Vector = std::array<double, 3>;

Vector operator-(const Vector& a, const Vector& b) {
    return {a[0] - b[0], a[1] - b[1], a[2] - b[2]};
}

Vector cross(const Vector& a, const Vector& b) {
    return {a[1] * b[2] - a[2] * b[1], a[2] * b[0] - a[0] * b[2], a[0] * b[1] - a[1] * b[0]};
}

double dot(const Vector& a, const Vector& b) {
    return a[0] * b[0] + a[1] * b[1] + a[2] * b[2];
}

void add(Vector& sum, const Vector& part) {
    for (std::size_t axis = 0; axis < 3; ++axis)
        sum.at(axis) += part.at(axis);
}

template <class Real>
Vector pointOf(std::span<const Real> xyz, std::uint32_t vertex) {
    const std::span<const Real> point = xyz.subspan(3 * std::size_t{vertex}, 3);
    return {static_cast<double>(point[0]), static_cast<double>(point[1]), static_cast<double>(point[2])};
}

// of each polygon twice the area, along the normal, also of one that is not plane (Newell's method, about the first
// corner)
template <class Real>
std::vector<Vector> areaVectors(std::span<const Real> xyz, const MeshPolygons& polygons) {
    std::vector<Vector> areas;
    areas.reserve(polygons.sizes.size());
    std::span<const std::uint32_t> corners = polygons.corners;
    for (const std::uint32_t size : polygons.sizes) {
        const Vector first = pointOf(xyz, corners[0]);
        Vector& sum = areas.emplace_back(Vector{});
        for (std::size_t corner = 2; corner < size; ++corner)
            add(sum, cross(pointOf(xyz, corners[corner - 1]) - first, pointOf(xyz, corners[corner]) - first));
        corners = corners.subspan(size);
    }
    return areas;
}

// a polygon's side of an edge, by the corners where it begins and ends
struct Side {
    std::uint64_t edge = 0; // both vertices, the smaller one first
    std::size_t begin = 0;
    std::size_t end = 0;
    std::size_t polygon = 0;
};

// sides of the same edge beside one another
std::vector<Side> sortedSides(const MeshPolygons& polygons) {
    std::vector<Side> sides;
    sides.reserve(polygons.corners.size());
    std::size_t first = 0;
    for (std::size_t polygon = 0; polygon < polygons.sizes.size(); ++polygon) {
        const std::size_t size = polygons.sizes[polygon];
        for (std::size_t corner = 0; corner < size && size > 2; ++corner) {
            const std::size_t begin = first + corner;
            const std::size_t end = first + (corner + 1) % size;
            const auto [less, more] = std::minmax(polygons.corners[begin], polygons.corners[end]);
            sides.push_back({(std::uint64_t{less} << 32) | more, begin, end, polygon});
        }
        first += size;
    }
    std::sort(sides.begin(), sides.end(),
              [](const Side& a, const Side& b) { return a.edge != b.edge ? a.edge < b.edge : a.begin < b.begin; });
    return sides;
}

// sets of corners that have one normal; each set is known by its first corner
class CornerSets {
public:
    explicit CornerSets(std::size_t corners)
        : parents_(corners) {
        std::iota(parents_.begin(), parents_.end(), std::size_t{0});
    }
    std::size_t find(std::size_t corner) {
        while (parents_[corner] != corner)
            corner = parents_[corner] = parents_[parents_[corner]];
        return corner;
    }
    void join(std::size_t a, std::size_t b) {
        const auto [first, last] = std::minmax({find(a), find(b)});
        parents_[last] = first;
    }

private:
    std::vector<std::size_t> parents_;
};

void joinSmoothEdges(CornerSets& sets, const MeshPolygons& polygons, const std::vector<Vector>& areas, double crease) {
    const double cosine = std::cos(crease * std::numbers::pi / 180.0);
    const std::vector<Side> sides = sortedSides(polygons);
    for (std::size_t at = 0, next = 0; at < sides.size(); at = next) {
        while (next < sides.size() && sides[next].edge == sides[at].edge)
            ++next;
        if (next - at != 2)
            continue;
        const Side& a = sides[at];
        const Side& b = sides[at + 1];
        const Vector& areaA = areas[a.polygon];
        const Vector& areaB = areas[b.polygon];
        const bool isOneWay = polygons.corners[a.begin] == polygons.corners[b.end];
        // one without an area bends nothing
        if (!isOneWay || dot(areaA, areaB) < cosine * std::sqrt(dot(areaA, areaA) * dot(areaB, areaB)))
            continue;
        sets.join(a.begin, b.end);
        sets.join(a.end, b.begin);
    }
}

} // namespace

std::vector<float> cornerNormals(std::span<const double> xyz, const MeshPolygons& polygons, double crease) {
    const std::vector<Vector> areas = areaVectors(xyz, polygons);
    CornerSets sets(polygons.corners.size());
    joinSmoothEdges(sets, polygons, areas, crease);
    std::vector<Vector> sums(polygons.corners.size(), Vector{});
    std::size_t corner = 0;
    for (std::size_t polygon = 0; polygon < areas.size(); ++polygon)
        for (std::uint32_t count = 0; count < polygons.sizes[polygon]; ++count)
            add(sums[sets.find(corner++)], areas[polygon]);
    std::vector<float> normals;
    normals.reserve(3 * sums.size());
    for (corner = 0; corner < sums.size(); ++corner) {
        const Vector& sum = sums[sets.find(corner)];
        const double length = std::hypot(sum[0], sum[1], sum[2]);
        for (const double value : sum)
            normals.push_back(length > 0.0 ? static_cast<float>(value / length) : 0.0F);
    }
    return normals;
}

std::vector<float> vertexNormals(std::span<const float> xyz, const MeshPolygons& polygons) {
    const std::vector<Vector> areas = areaVectors(xyz, polygons);
    std::vector<Vector> sums(polygons.vertexCount, Vector{});
    std::span<const std::uint32_t> corners = polygons.corners;
    for (std::size_t polygon = 0; polygon < areas.size(); ++polygon) {
        const std::uint32_t size = polygons.sizes[polygon];
        for (const std::uint32_t vertex : corners.first(size))
            add(sums[vertex], areas[polygon]);
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
