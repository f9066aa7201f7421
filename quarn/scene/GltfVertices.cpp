// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/GltfVertices.h"

#include <unordered_map>

namespace quarn {
namespace {

// the vertex of every corner, with copies for all texture coordinates of a vertex but its first
class Seams {
public:
    Seams(const MeshPolygons& polygons, GltfVertices& made)
        : polygons_(polygons)
        , made_(made)
        , firstUv_(polygons.vertexCount, none) {
        made.uvs.resize(2 * polygons.vertexCount, 0.0F);
    }

    std::vector<std::uint32_t> corners() {
        std::vector<std::uint32_t> corners;
        corners.reserve(polygons_.corners.size());
        for (std::size_t corner = 0; corner < polygons_.corners.size(); ++corner)
            corners.push_back(vertexOf(polygons_.corners[corner], polygons_.uvCorners[corner]));
        return corners;
    }

private:
    std::uint32_t vertexOf(std::uint32_t vertex, std::uint32_t uv) {
        if (firstUv_[vertex] == none) {
            firstUv_[vertex] = uv;
            put(vertex, uv);
        }
        if (firstUv_[vertex] == uv)
            return vertex;
        const auto next = static_cast<std::uint32_t>(made_.count());
        const auto [place, isNew] = copyOf_.try_emplace(std::uint64_t{vertex} << 32U | uv, next);
        if (isNew) {
            made_.copies.push_back(vertex);
            made_.uvs.resize(made_.uvs.size() + 2);
            put(next, uv);
        }
        return place->second;
    }

    void put(std::uint32_t vertex, std::uint32_t uv) {
        made_.uvs[2 * std::size_t{vertex}] = polygons_.uvs[2 * std::size_t{uv}];
        made_.uvs[2 * std::size_t{vertex} + 1] = 1.0F - polygons_.uvs[2 * std::size_t{uv} + 1];
    }

    static constexpr std::uint32_t none = 0xFFFFFFFF;
    const MeshPolygons& polygons_;
    GltfVertices& made_;
    std::vector<std::uint32_t> firstUv_;
    std::unordered_map<std::uint64_t, std::uint32_t> copyOf_; ///< by vertex and texture coordinate
};

std::vector<std::uint32_t> fans(const MeshPolygons& polygons, const std::vector<std::uint32_t>& corners) {
    std::vector<std::uint32_t> triangles;
    triangles.reserve(3 * polygons.sizes.size());
    const std::uint32_t* corner = corners.data();
    for (const std::uint32_t size : polygons.sizes) {
        for (std::uint32_t i = 2; i < size; ++i)
            triangles.insert(triangles.end(), {corner[0], corner[i - 1], corner[i]});
        corner += size;
    }
    return triangles;
}

} // namespace

GltfVertices::GltfVertices(const MeshPolygons& polygons)
    : meshVertices(polygons.vertexCount) {
    triangles = fans(polygons, polygons.uvs.empty() ? polygons.corners : Seams(polygons, *this).corners());
}

} // namespace quarn
