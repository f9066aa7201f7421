// SPDX-License-Identifier: Apache-2.0
#include "edgeNeighbours.h"

#include <algorithm>
#include <limits>
#include <stdexcept>

namespace quill {
namespace {

constexpr std::size_t largestTable = std::numeric_limits<std::int32_t>::max();

void checkSizes(const MeshTopology& topology, const IndexMapper& map) {
    if (topology.polygonVertices.size() > largestTable || map.affectCount() > largestTable)
        throw std::length_error("quill: a mesh of more than 2^31 - 1 corners or affected vertices");
}

// A counting sort of both directions of every edge by their first end (decision 0012); a list may still repeat a
// neighbour.
NeighbourLists collectEdges(const MeshTopology& topology, const IndexMapper& map) {
    NeighbourLists lists;
    // list v is first counted at v + 2, then filled from v + 1, whose running end finally stands where list v ends
    lists.indexer.assign(map.affectCount() + 2, 0);
    auto& cursor = lists.indexer;
    forEachPolygon(topology, [&](std::span<const std::uint32_t> corners) {
        forEachAffectedEdge(corners, map, [&](std::uint32_t a, std::uint32_t b) {
            ++cursor[a + 2];
            ++cursor[b + 2];
        });
    });
    for (std::size_t v = 2; v < cursor.size(); ++v)
        cursor[v] += cursor[v - 1];
    lists.neighbours.resize(cursor.back());
    forEachPolygon(topology, [&](std::span<const std::uint32_t> corners) {
        forEachAffectedEdge(corners, map, [&](std::uint32_t a, std::uint32_t b) {
            lists.neighbours[cursor[a + 1]++] = b;
            lists.neighbours[cursor[b + 1]++] = a;
        });
    });
    lists.indexer.pop_back();
    return lists;
}

// Sorts every list, drops repetitions and closes the gaps.
void sortAndCompact(NeighbourLists& lists) {
    auto begin = lists.neighbours.begin();
    auto out = begin;
    for (std::size_t v = 0; v + 1 < lists.indexer.size(); ++v) {
        const auto end = lists.neighbours.begin() + lists.indexer[v + 1];
        std::sort(begin, end);
        const auto last = std::unique(begin, end);
        out = out == begin ? last : std::move(begin, last, out);
        lists.indexer[v + 1] = static_cast<std::uint32_t>(out - lists.neighbours.begin());
        begin = end;
    }
    lists.neighbours.erase(out, lists.neighbours.end());
    lists.neighbours.shrink_to_fit();
}

} // namespace

NeighbourLists edgeNeighbours(const MeshTopology& topology, const IndexMapper& map) {
    checkSizes(topology, map);
    NeighbourLists lists = collectEdges(topology, map);
    sortAndCompact(lists);
    return lists;
}

} // namespace quill
