// SPDX-License-Identifier: Apache-2.0
// A mesh as glTF has it: triangles, and texture coordinates by vertex, so that a seam needs a vertex more.
#pragma once

#include "quarn/scene/meshes.h"

#include <cstdint>
#include <span>
#include <vector>

namespace quarn {

/// First the mesh's own vertices, in their order; behind them a copy of a vertex for each texture coordinate that it
/// has at other corners than its first.
struct GltfVertices {
    explicit GltfVertices(const MeshPolygons& polygons);

    std::size_t count() const { return meshVertices + copies.size(); }
    /// What belongs to the mesh's vertices, with that of the copies behind it. `values` [meshVertices][width].
    template <class Value>
    std::vector<Value> withCopies(std::span<const Value> values, std::size_t width) const {
        std::vector<Value> all;
        all.reserve(width * count());
        all.assign(values.begin(), values.end());
        for (const std::uint32_t vertex : copies)
            all.insert(all.end(), values.begin() + static_cast<std::ptrdiff_t>(width * vertex),
                       values.begin() + static_cast<std::ptrdiff_t>(width * (std::size_t{vertex} + 1)));
        return all;
    }

    std::size_t meshVertices = 0;
    std::vector<std::uint32_t> copies;    ///< the vertex of the mesh that each is a copy of
    std::vector<float> uvs;               ///< [count()][2], v down as in glTF; empty where the mesh has none
    std::vector<std::uint32_t> triangles; ///< polygons as fans from their first corner: three vertices each
};

} // namespace quarn
