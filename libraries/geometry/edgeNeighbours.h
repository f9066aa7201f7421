// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/IndexMapper.h"
#include "quill/MeshTopology.h"

#include <cstdint>
#include <span>
#include <vector>

namespace quill {

// Neighbour lists of every affected vertex in compressed rows, each list ascending and without duplicates.
struct NeighbourLists {
    std::vector<std::uint32_t> indexer; // [affectCount + 1]
    std::vector<std::uint32_t> neighbours;

    std::span<const std::uint32_t> of(std::size_t vertex) const {
        return {neighbours.data() + indexer[vertex], neighbours.data() + indexer[vertex + 1]};
    }
};

// The lists of the polygon edges whose two ends are both affected. Throws std::length_error above 2^31 - 1 corners or
// affected vertices, beyond which the 32-bit tables could not hold them.
NeighbourLists edgeNeighbours(const MeshTopology& topology, const IndexMapper& map);

// Calls visit(a, b) with the affected indices of both ends of every edge of a polygon, the closing one included. An
// edge with an unaffected end is left out; a vertex that stands twice in a row is its own neighbour.
template <typename Visit>
void forEachAffectedEdge(std::span<const std::uint32_t> corners, const IndexMapper& map, const Visit& visit) {
    std::uint32_t previous = map.toAffected(corners.back());
    for (const std::uint32_t corner : corners) {
        const std::uint32_t current = map.toAffected(corner);
        if (previous != missingIndex && current != missingIndex)
            visit(previous, current);
        previous = current;
    }
}

} // namespace quill
