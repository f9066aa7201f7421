// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <span>
#include <type_traits>
#include <vector>

namespace quill {

/// The polygon structure of a mesh. Filled by whoever reads the mesh; the code that walks it trusts nothing in it.
struct MeshTopology {
    /// [polygonCount + 1] polygon p's first corner in polygonVertices; the last entry is the total number of corners.
    std::vector<std::uint32_t> polygonOffsets;
    /// Vertex indices (of the full mesh) of all corners, polygon after polygon, each in its winding order.
    std::vector<std::uint32_t> polygonVertices;
    std::size_t polygonCount = 0;
    /// The mesh's vertex count as its owner reports it; the walk below does not use it.
    int vertexCount = 0;
    /// Set once the record is filled.
    bool valid = false;
};

/// Calls visit(corners) or visit(corners, p) for each polygon p in order, corners being a span of full vertex indices,
/// never empty.
/// Ill-formed records are safe and cost no more than their size: polygons beyond the stored offsets, polygons whose
/// offsets do not ascend, that reach back into a polygon before them or that begin past the stored corners are skipped;
/// a polygon that ends past the stored corners is cut there. The vertex indices themselves are not checked.
template <typename Visit>
void forEachPolygon(const MeshTopology& topology, const Visit& visit) {
    const auto& offsets = topology.polygonOffsets;
    const std::size_t polygons = std::min(topology.polygonCount, offsets.empty() ? 0 : offsets.size() - 1);
    std::size_t walked = 0;
    for (std::size_t p = 0; p < polygons; ++p) {
        const std::size_t begin = offsets[p];
        const std::size_t end = std::min<std::size_t>(offsets[p + 1], topology.polygonVertices.size());
        if (begin < walked || begin >= end)
            continue;
        const std::span<const std::uint32_t> corners(topology.polygonVertices.data() + begin, end - begin);
        if constexpr (std::is_invocable_v<Visit, std::span<const std::uint32_t>, std::size_t>)
            visit(corners, p);
        else
            visit(corners);
        walked = end;
    }
}

} // namespace quill
