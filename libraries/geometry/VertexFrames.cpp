// SPDX-License-Identifier: Apache-2.0
#include "quill/VertexFrames.h"

#include "cornerPairs.h"
#include "edgeNeighbours.h"
#include "frameBlock.h"
#include "quill/parallelFor.h"
#include "widestPairs.h"

#include <algorithm>
#include <array>
#include <utility>

namespace quill {
namespace {

// Calls visit(corners, polygon) with the affected corners of each polygon that has more than two, in winding order.
template <typename Visit>
void forEachAffectedPolygon(const MeshTopology& topology, const IndexMapper& map, const Visit& visit) {
    std::vector<std::uint32_t> affected;
    forEachPolygon(topology, [&](std::span<const std::uint32_t> corners, std::size_t polygon) {
        affected.clear();
        for (const std::uint32_t corner : corners)
            if (const std::uint32_t index = map.toAffected(corner); index != missingIndex)
                affected.push_back(index);
        if (affected.size() > 2)
            visit(std::span<const std::uint32_t>(affected), polygon);
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

    // Calls visit(vertices, places, n) in parallel with blocks of n <= FrameBlock::capacity listed vertices below the
    // count, and their places in the list.
    template <typename Visit>
    void parallelForEachPlacedBlock(const Visit& visit) const {
        parallelForRange(subset_ ? subset_->size() : count_, [&](int begin, int end) {
            std::array<std::size_t, FrameBlock::capacity> vertices, places;
            std::size_t n = 0;
            for (auto j = static_cast<std::size_t>(begin); j < static_cast<std::size_t>(end); ++j) {
                const std::size_t vertex = subset_ ? (*subset_)[j] : j;
                if (vertex >= count_)
                    continue;
                vertices[n] = vertex;
                places[n++] = j;
                if (n == vertices.size())
                    visit(vertices.data(), places.data(), std::exchange(n, 0));
            }
            if (n > 0)
                visit(vertices.data(), places.data(), n);
        });
    }

    // Calls visit(vertices, n) with the same blocks.
    template <typename Visit>
    void parallelForEachBlock(const Visit& visit) const {
        parallelForEachPlacedBlock(
            [&](const std::size_t* vertices, const std::size_t*, std::size_t n) { visit(vertices, n); });
    }

    // Calls visit(i) in parallel for each listed vertex below the count.
    template <typename Visit>
    void parallelForEach(const Visit& visit) const {
        parallelForEachBlock([&](const std::size_t* vertices, std::size_t n) {
            for (std::size_t j = 0; j < n; ++j)
                visit(vertices[j]);
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

// Builds the frames of a block on its normals and stores them, inverted or not.
void storeFrames(FrameBlock& block, const FrameTables& tables, const std::size_t* vertices, std::size_t n, bool invert,
                 mat4d* frames) {
    block.buildAxes(tables, vertices, n);
    for (std::size_t j = 0; j < n; ++j) {
        mat4d& frame = frames[vertices[j]];
        block.write(tables, j, vertices[j], frame);
        if (invert)
            frame.gaussJordanInverse();
    }
}

} // namespace

void VertexFrames::build(const MeshTopology& topology, const IndexMapper& map,
                         const std::vector<val3<float>>* positions, const WorkWatch& watch) {
    const NeighbourLists edges = edgeNeighbours(topology, map);
    const std::size_t n = map.affectCount();
    if (positions && positions->size() < n)
        positions = nullptr;

    // counted at v + 2, filled from v + 1, as in edgeNeighbours
    std::vector<std::uint32_t> cursor(n + 2, 0);
    forEachAffectedPolygon(topology, map, [&](std::span<const std::uint32_t> corners, std::size_t) {
        for (const std::uint32_t v : corners)
            cursor[v + 2] += 2;
    });
    for (std::size_t v = 2; v < cursor.size(); ++v)
        cursor[v] += cursor[v - 1];
    std::vector<std::uint32_t> pairs(cursor.back());
    std::vector<CornerPair> ofPolygon;
    forEachAffectedPolygon(topology, map, [&](std::span<const std::uint32_t> corners, std::size_t polygon) {
        if (positions)
            widestPairs(corners, *positions, ofPolygon, polygon, watch);
        else
            adjacentPairs(corners, ofPolygon);
        for (std::size_t c = 0; c < corners.size(); ++c) {
            std::uint32_t& at = cursor[corners[c] + 1];
            pairs[at++] = ofPolygon[c].a;
            pairs[at++] = ofPolygon[c].b;
        }
    });
    cursor.pop_back();
    for (std::size_t v = 0; v < n; ++v)
        putTangentReferenceFirst({pairs.data() + cursor[v], pairs.data() + cursor[v + 1]}, edges.of(v));

    SharedArray<std::uint32_t> sharedPairs(std::move(pairs));
    framesIndexer_ = std::move(cursor);
    framesPairs_ = std::move(sharedPairs);
}

void VertexFrames::calculateFrames(std::vector<mat4d>& frames, const std::vector<val3<float>>& positions,
                                   const IndexMapper& map, bool invert,
                                   const std::vector<std::uint32_t>* subset) const {
    if (frames.size() < map.affectCount())
        frames.resize(map.affectCount());
    if (positions.size() < vertexCount())
        return;
    const FrameTables tables{framesPairs_.data(), framesIndexer_.data(), vertexCount(), positions.data()};
    VertexList(std::min(map.affectCount(), positions.size()), subset)
        .parallelForEachBlock([&](const std::size_t* vertices, std::size_t n) {
            FrameBlock block;
            block.measureNormals(tables, vertices, n);
            storeFrames(block, tables, vertices, n, invert, frames.data());
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
    const VertexList listed(count, subset);
    const FrameTables tables{framesPairs_.data(), framesIndexer_.data(), vertexCount(), positions.data()};
    const ConnectionTables connectionTables{connectionsIndexer, connections, weights};
    std::vector<val3<float>> normals(count);
    std::vector<val3<float>> snapshot;
    listed.parallelForEach([&](std::size_t i) {
        normals[i] = tables.normalSum(i);
        normals[i].normalize();
    });
    for (std::size_t iteration = 0; iteration < normalIterations; ++iteration) {
        snapshot = normals;
        listed.parallelForEach([&](std::size_t i) { normals[i] = smoothedNormal(i, snapshot, connectionTables); });
    }
    listed.parallelForEachBlock([&](const std::size_t* vertices, std::size_t n) {
        FrameBlock block;
        block.takeNormals(normals.data(), vertices, n);
        storeFrames(block, tables, vertices, n, invert, frames.data());
    });
}

void VertexFrames::transportDeltas(std::vector<val3<float>>& out, const std::vector<val3<float>>& deltas,
                                   const std::vector<val3<float>>& restPoints,
                                   const std::vector<mat4d>& restFramesInverse,
                                   const std::vector<val3<float>>& positions,
                                   const std::vector<std::uint32_t>* subset) const {
    if (positions.size() < vertexCount())
        return;
    const FrameTables tables{framesPairs_.data(), framesIndexer_.data(), vertexCount(), positions.data()};
    const std::size_t count = std::min({out.size(), restPoints.size(), restFramesInverse.size(), positions.size()});
    VertexList(count, subset)
        .parallelForEachPlacedBlock([&](const std::size_t* vertices, const std::size_t* places, std::size_t n) {
            FrameBlock block;
            block.measureNormals(tables, vertices, n);
            block.buildAxes(tables, vertices, n);
            for (std::size_t j = 0; j < n && places[j] < deltas.size(); ++j) {
                const std::size_t i = vertices[j];
                mat4d frame;
                block.write(tables, j, i, frame);
                out[i] = transportDelta(restPoints[i], deltas[places[j]], restFramesInverse[i], frame);
            }
        });
}

void VertexFrames::calculateDisplacements(const std::vector<val3<float>>& positions,
                                          const std::vector<val3<float>>& points, std::vector<val3<float>>& out) const {
    out.assign(points.size(), {});
    if (positions.size() < vertexCount())
        return;
    const FrameTables tables{framesPairs_.data(), framesIndexer_.data(), vertexCount(), positions.data()};
    VertexList(std::min(points.size(), positions.size()), nullptr)
        .parallelForEachBlock([&](const std::size_t* vertices, std::size_t n) {
            FrameBlock block;
            block.measureNormals(tables, vertices, n);
            block.buildAxes(tables, vertices, n);
            for (std::size_t j = 0; j < n; ++j) {
                const std::size_t i = vertices[j];
                mat4d frame;
                block.write(tables, j, i, frame);
                frame.inverse();
                out[i] = transformAsPoint(points[i], frame);
            }
        });
}

} // namespace quill
