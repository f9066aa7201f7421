// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/PaddedPoints.h"
#include "quill/SharedArray.h"
#include "quill/VertexFrames.h"
#include "quill/mat4d.h"
#include "quill/val3.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <vector>

namespace quill {

struct TransportBlock;

/// The tables of a surface at rest, laid out for carrying the deltas of some of its vertices to a surface of other
/// positions, frame after frame: what VertexFrames::transportDeltas() does, to the same bits, in a third of the time.
/// Const members may run at the same time on different arrays; build() may not run beside anything.
class SurfaceTransport {
public:
    SurfaceTransport();
    ~SurfaceTransport();
    SurfaceTransport(SurfaceTransport&& other) noexcept;
    SurfaceTransport& operator=(SurfaceTransport&& other) noexcept;

    /// Replaces the tables.
    ///   frames             the pairs of the surface
    ///   restPoints         [frames.vertexCount() or more] unsmoothed, object space
    ///   restFramesInverse  the same, as VertexFrames::calculateFrames() inverts them
    ///   vertexCount        of positions and results. At most the size of the two arrays
    ///   subset             null for all vertices, or those that are carried, none twice; those not below vertexCount
    ///                      are a caller's error
    /// Throws std::length_error where the arrays are shorter, std::bad_alloc; the tables are then empty.
    void build(const VertexFrames& frames, const std::vector<val3<float>>& restPoints,
               const std::vector<mat4d>& restFramesInverse, std::size_t vertexCount,
               const std::vector<std::uint32_t>* subset);

    /// How many vertices are carried.
    std::size_t size() const { return listed_; }
    /// Size of the tables, in bytes.
    std::size_t bytes() const;

    /// out[v] = transportDelta() of each carried vertex v.
    ///   out        in and out, [vertexCount]; other vertices keep their values
    ///   deltas     [size()], in the order of the list
    ///   positions  [vertexCount] points to measure the frames on, object space
    /// Arrays of other sizes are a caller's error, and nothing is done. The result is the same for every number of
    /// threads and every instruction set.
    void run(std::vector<val3<float>>& out, const std::vector<val3<float>>& deltas,
             const PaddedPoints& positions) const;

private:
    std::size_t vertexCount_ = 0, listed_ = 0;
    bool isIdentity_ = true;
    SharedArray<TransportBlock> blocks_;
    SharedArray<std::uint32_t> pairs_;
    SharedArray<float> rest_;
    SharedArray<double> inverses_;
};

} // namespace quill
