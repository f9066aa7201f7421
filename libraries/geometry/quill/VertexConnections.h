// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/IndexMapper.h"
#include "quill/MeshTopology.h"
#include "quill/SharedArray.h"
#include "quill/val3.h"

#include <cstddef>
#include <cstdint>
#include <vector>

namespace quill {

/// The vertex adjacency of a mesh in compressed rows, in affected index space, with the smoothing that runs on it.
/// Const members may run at the same time on different arrays; build() may not run beside anything.
class VertexConnections {
public:
    /// Replaces both tables by the polygon edges of the topology whose two ends are affected.
    ///   topology     not trusted; see forEachPolygon for what is skipped. A corner that is not below the map's full
    ///                count is not affected.
    ///   map          full to affected indices; its reverse table is built here when it was not yet
    ///   extraRings   how many more rings of neighbours each list reaches; each ring costs the sum of the lists
    ///   includeSelf  whether the further rings may add a vertex to its own list
    /// Runs on the calling thread in O(corners) for lists of bounded length. Throws std::length_error when a table
    /// would not fit 32-bit indices (2^31 - 1 corners or vertices, 2^32 - 1 connections), std::bad_alloc; the tables
    /// are then as before.
    void build(const MeshTopology& topology, const IndexMapper& map, std::size_t extraRings, bool includeSelf);

    /// The neighbour lists of all vertices, one after another, each ascending and without duplicates.
    const std::vector<std::uint32_t>& connections() const { return connections_; }
    /// [affectCount + 1] the neighbours of vertex i are connections()[indexer[i] .. indexer[i + 1]); empty before
    /// build.
    const std::vector<std::uint32_t>& connectionsIndexer() const { return connectionsIndexer_; }
    /// Number of vertices the tables were built for; every neighbour is below it.
    std::size_t vertexCount() const { return connectionsIndexer_.empty() ? 0 : connectionsIndexer_.size() - 1; }

    /// Fills one smoothing weight per connection, 1 / (max(distance, 0.001) + offset)^exponent, scaled so that each
    /// vertex's weights average 1.
    ///   weights    out, resized to connections().size(); parallel to it
    ///   positions  [vertexCount()] object space; when shorter, every weight is 1
    ///   exponent   below 1e-5 in magnitude every weight is exactly 1
    ///   offset     added to the distance, in scene units
    void calculateConnectionWeights(std::vector<float>& weights, const std::vector<val3<float>>& positions,
                                    double exponent, double offset) const;

    /// Smooths positions by repeated averaging of neighbours: per pass, p = p + step * (average(neighbours) - p). A
    /// vertex without neighbours, or whose mask is not zero, keeps its position in every pass.
    ///   positions    in and out; entries from vertexCount() on are kept as they are
    ///   scratch      out, resized to positions.size(), holds the pass before the last; allocates only when it grows
    ///   iterations   number of passes; 0 does nothing
    ///   step         fraction of the way to the average; below 1e-6 (or NaN) does nothing, within 1e-5 of 1 goes the
    ///                whole way
    ///   mask         null, or [positions.size()], not zero where a vertex is pinned
    ///   weights      null, or [connections().size()], factor of each neighbour; the divisor is the neighbour count
    ///   includeSelf  whether the vertex itself is averaged in, with weight 1
    /// The result is the same for every number of threads. Arrays that are too short for what is said above: nothing is
    /// done. If scratch is positions itself, a scratch array of its own is allocated.
    void mushArray(std::vector<val3<float>>& positions, std::vector<val3<float>>& scratch, std::size_t iterations,
                   float step, const std::vector<std::uint8_t>* mask, const std::vector<float>* weights,
                   bool includeSelf) const;

private:
    SharedArray<std::uint32_t> connections_;
    SharedArray<std::uint32_t> connectionsIndexer_;
};

} // namespace quill
