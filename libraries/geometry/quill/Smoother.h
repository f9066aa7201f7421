// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/PaddedPoints.h"
#include "quill/SharedArray.h"
#include "quill/VertexConnections.h"
#include "quill/WorkWatch.h"
#include "quill/val3.h"

#include <cstddef>
#include <cstdint>
#include <vector>

namespace quill {

struct NeighbourQuad;
struct RowQuad;

/// The deformer's smoothing, laid out for many passes: what VertexConnections::mushArray() does with weights, the whole
/// step and no mask, to the same bits. Several passes go over the mesh together, block by block, so that what one has
/// written is still in the cache when the next one reads it; for that vertices are kept in an order in which neighbours
/// are near each other. Const members may run at the same time on different arrays; build() may not run beside
/// anything.
class Smoother {
public:
    Smoother();
    ~Smoother();
    Smoother(Smoother&& other) noexcept;
    Smoother& operator=(Smoother&& other) noexcept;

    /// Replaces the tables.
    ///   weights      [connections.connections().size()], parallel to it
    ///   vertexCount  of the points; those that have no connections stay where they are. At least
    ///                connections.vertexCount()
    /// Throws std::length_error where there are fewer weights or points, std::bad_alloc; the tables are then empty.
    void build(const VertexConnections& connections, const std::vector<float>& weights, std::size_t vertexCount);

    std::size_t vertexCount() const { return vertexCount_; }
    /// Size of the tables, in bytes.
    std::size_t bytes() const;

    /// Working arrays of a run, which the next one takes up again.
    struct Scratch {
        PaddedPoints a, b;
    };

    /// Smooths points.
    ///   points   [vertexCount()] object space; any other number is a caller's error, and nothing is done
    ///   passes   how often
    ///   out      resized to vertexCount()
    ///   watch    asked every few passes: may end the work, which then throws Cancelled
    /// The result is the same for every number of threads and every instruction set.
    void run(const std::vector<val3<float>>& points, std::size_t passes, PaddedPoints& out, Scratch& scratch,
             const WorkWatch& watch = {}) const;

private:
    std::size_t vertexCount_ = 0;
    std::size_t blockSize_ = 1;        // neighbours are in the same block of vertices or the next one on either side
    SharedArray<std::uint32_t> order_; // [vertexCount] the vertex at each place; empty: each at its own
    SharedArray<RowQuad> quads_;       // by place
    SharedArray<NeighbourQuad> neighbours_;
};

} // namespace quill
