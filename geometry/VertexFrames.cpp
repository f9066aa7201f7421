// SPDX-License-Identifier: Apache-2.0
#include "quill/VertexFrames.h"

#include "cornerPairs.h"
#include "edgeNeighbours.h"
#include "quill/parallelFor.h"

#include <algorithm>
#include <utility>

namespace quill {
namespace {

// Calls visit(corners) with the affected corners of each polygon that has more than two, in winding order.
template <typename Visit>
void forEachAffectedPolygon(const MeshTopology& topology, const IndexMapper& map, const Visit& visit) {
    std::vector<std::uint32_t> affected;
    forEachPolygon(topology, [&](std::span<const std::uint32_t> corners) {
        affected.clear();
        for (const std::uint32_t corner : corners)
            if (const std::uint32_t index = map.toAffected(corner); index != missingIndex)
                affected.push_back(index);
        if (affected.size() > 2)
            visit(std::span<const std::uint32_t>(affected));
    });
}

// Moves the first pair that begins with an edge neighbour to the front. neighbours: ascending.
void putTangentReferenceFirst(std::span<std::uint32_t> pairs, std::span<const std::uint32_t> neighbours) {
    for (std::size_t p = 0; p < pairs.size(); p += 2) {
        if (!std::binary_search(neighbours.begin(), neighbours.end(), pairs[p]))
            continue;
        std::swap(pairs[p], pairs[0]);
        std::swap(pairs[p + 1], pairs[1]);
        return;
    }
}

// The vertices a calculation runs over: a subset's, or the first count.
class VertexList {
public:
    VertexList(std::size_t count, const std::vector<std::uint32_t>* subset)
        : count_(count)
        , subset_(subset) {}

    // Calls visit(i) in parallel for each listed vertex below the count.
    template <typename Visit>
    void parallelForEach(const Visit& visit) const {
        if (!subset_) {
            parallelFor(count_, visit);
            return;
        }
        parallelFor(subset_->size(), [&](std::size_t j) {
            if (const std::size_t i = (*subset_)[j]; i < count_)
                visit(i);
        });
    }

private:
    std::size_t count_;
    const std::vector<std::uint32_t>* subset_;
};

// Untrusted adjacency as it comes from outside.
struct ConnectionTables {
    const std::vector<std::uint32_t>& indexer;
    const std::vector<std::uint32_t>& connections;
    const std::vector<float>& weights;

    std::size_t begin(std::size_t vertex) const { return vertex + 1 < indexer.size() ? indexer[vertex] : 0; }
    std::size_t end(std::size_t vertex) const {
        const std::size_t stored = std::min(connections.size(), weights.size());
        return vertex + 1 < indexer.size() ? std::min<std::size_t>(indexer[vertex + 1], stored) : 0;
    }
};

val3<float> smoothedNormal(std::size_t vertex, const std::vector<val3<float>>& normals,
                           const ConnectionTables& tables) {
    val3<float> sum = normals[vertex];
    const std::size_t begin = tables.begin(vertex);
    const std::size_t end = tables.end(vertex);
    if (begin >= end)
        return sum;
    for (std::size_t k = begin; k < end; ++k)
        if (tables.connections[k] < normals.size())
            sum += tables.weights[k] * normals[tables.connections[k]];
    sum.normalize();
    return sum;
}

void store(mat4d& out, mat4d frame, bool invert) {
    if (invert)
        frame.gaussJordanInverse();
    out = frame;
}

} // namespace

void VertexFrames::build(const MeshTopology& topology, const IndexMapper& map,
                         const std::vector<val3<float>>* positions) {
    const NeighbourLists edges = edgeNeighbours(topology, map);
    const std::size_t n = map.affectCount();
    if (positions && positions->size() < n)
        positions = nullptr;

    // counted at v + 2, filled from v + 1, as in edgeNeighbours
    std::vector<std::uint32_t> cursor(n + 2, 0);
    forEachAffectedPolygon(topology, map, [&](std::span<const std::uint32_t> corners) {
        for (const std::uint32_t v : corners)
            cursor[v + 2] += 2;
    });
    for (std::size_t v = 2; v < cursor.size(); ++v)
        cursor[v] += cursor[v - 1];
    std::vector<std::uint32_t> pairs(cursor.back());
    forEachAffectedPolygon(topology, map, [&](std::span<const std::uint32_t> corners) {
        for (std::size_t c = 0; c < corners.size(); ++c) {
            const CornerPair pair = positions ? widestPair(corners, c, *positions) : adjacentPair(corners, c);
            std::uint32_t& at = cursor[corners[c] + 1];
            pairs[at++] = pair.a;
            pairs[at++] = pair.b;
        }
    });
    cursor.pop_back();
    for (std::size_t v = 0; v < n; ++v)
        putTangentReferenceFirst({pairs.data() + cursor[v], pairs.data() + cursor[v + 1]}, edges.of(v));

    framesPairs_ = std::move(pairs);
    framesIndexer_ = std::move(cursor);
}

val3<float> VertexFrames::normalOf(std::size_t vertex, const std::vector<val3<float>>& positions) const {
    val3<float> normal;
    if (!hasPairs(vertex))
        return normal;
    const val3<float> here = positions[vertex];
    for (std::uint32_t k = framesIndexer_[vertex]; k < framesIndexer_[vertex + 1]; k += 2)
        normal += cross(positions[framesPairs_[k]] - here, positions[framesPairs_[k + 1]] - here);
    normal.normalize();
    return normal;
}

mat4d VertexFrames::frameOf(std::size_t vertex, const val3<float>& normal,
                            const std::vector<val3<float>>& positions) const {
    const val3<float> origin = positions[vertex];
    if (!hasPairs(vertex))
        return mat4d{{1.0, 0.0, 0.0, 0.0, 0.0, 1.0, 0.0, 0.0, 0.0, 0.0, 1.0, 0.0, origin.x, origin.y, origin.z, 1.0}};
    val3<float> tangent = positions[framesPairs_[framesIndexer_[vertex]]] - origin;
    tangent.normalize();
    val3<float> x = cross(normal, tangent);
    x.normalize();
    const val3<float> y = cross(x, normal);
    return mat4d{
        {x.x, x.y, x.z, 0.0, y.x, y.y, y.z, 0.0, normal.x, normal.y, normal.z, 0.0, origin.x, origin.y, origin.z, 1.0}};
}

void VertexFrames::calculateFrames(std::vector<mat4d>& frames, const std::vector<val3<float>>& positions,
                                   const IndexMapper& map, bool invert,
                                   const std::vector<std::uint32_t>* subset) const {
    if (frames.size() < map.affectCount())
        frames.resize(map.affectCount());
    if (positions.size() < vertexCount())
        return;
    VertexList(std::min(map.affectCount(), positions.size()), subset).parallelForEach([&](std::size_t i) {
        store(frames[i], frameOf(i, normalOf(i, positions), positions), invert);
    });
}

void VertexFrames::calculateFrames(std::vector<mat4d>& frames, const std::vector<val3<float>>& positions,
                                   const std::vector<std::uint32_t>& connectionsIndexer,
                                   const std::vector<std::uint32_t>& connections, const std::vector<float>& weights,
                                   std::size_t normalIterations, const IndexMapper& map, bool invert,
                                   const std::vector<std::uint32_t>* subset) const {
    if (normalIterations == 0) {
        calculateFrames(frames, positions, map, invert, subset);
        return;
    }
    if (frames.size() < map.affectCount())
        frames.resize(map.affectCount());
    if (positions.size() < vertexCount())
        return;
    const std::size_t count = std::min(map.affectCount(), positions.size());
    const VertexList vertices(count, subset);
    const ConnectionTables tables{connectionsIndexer, connections, weights};
    std::vector<val3<float>> normals(count);
    std::vector<val3<float>> snapshot;
    vertices.parallelForEach([&](std::size_t i) { normals[i] = normalOf(i, positions); });
    for (std::size_t iteration = 0; iteration < normalIterations; ++iteration) {
        snapshot = normals;
        vertices.parallelForEach([&](std::size_t i) { normals[i] = smoothedNormal(i, snapshot, tables); });
    }
    vertices.parallelForEach([&](std::size_t i) { store(frames[i], frameOf(i, normals[i], positions), invert); });
}

void VertexFrames::calculateDisplacements(const std::vector<val3<float>>& positions,
                                          const std::vector<val3<float>>& points, std::vector<val3<float>>& out) const {
    out.assign(points.size(), {});
    if (positions.size() < vertexCount())
        return;
    parallelFor(std::min(points.size(), positions.size()), [&](std::size_t i) {
        mat4d frame = frameOf(i, normalOf(i, positions), positions);
        frame.inverse();
        out[i] = transformAsPoint(points[i], frame);
    });
}

} // namespace quill
