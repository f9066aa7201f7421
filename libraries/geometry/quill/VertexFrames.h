// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/IndexMapper.h"
#include "quill/MeshTopology.h"
#include "quill/SharedArray.h"
#include "quill/WorkWatch.h"
#include "quill/mat4d.h"
#include "quill/val3.h"

#include <cstddef>
#include <cstdint>
#include <vector>

namespace quill {

/// Carries a rest point moved by its delta from the rest surface to the current one: into the local coordinates of the
/// rest frame (narrowed to float there) and out through the current frame. Object space in and out.
inline val3<float> transportDelta(const val3<float>& restPoint, const val3<float>& delta, const mat4d& restFrameInverse,
                                  const mat4d& currentFrame) {
    return transformAsPoint(transformAsPoint(restPoint + delta, restFrameInverse), currentFrame);
}

/// Which neighbours define the local frame of each vertex of a mesh, in affected index space, and the frames measured
/// on given positions. A frame's rows are X, Y, Z (the normal) and the vertex position; the basis is left-handed
/// (X x Y = -Z), object space. A vertex on no polygon of three or more affected corners has the identity at its
/// position. Const members may run at the same time on different arrays; build() may not run beside anything.
class VertexFrames {
public:
    /// Replaces both tables: one corner pair (a, b) per polygon corner at a vertex, whose share of the vertex normal is
    /// cross(P[a] - P[i], P[b] - P[i]). The first entry of a vertex's first pair is its tangent reference, an edge
    /// neighbour whenever one of its pairs begins with one.
    ///   topology   not trusted; see forEachPolygon for what is skipped. A corner that is not below the map's full
    ///   count
    ///              is not affected; a polygon's unaffected corners are left out of it.
    ///   map        full to affected indices; its reverse table is built here when it was not yet
    ///   positions  null, or rest points [map.affectCount()]: each corner then takes the two other corners of the
    ///   polygon
    ///              that span the largest area with it, the next and previous corner counting double. Shorter arrays
    ///              count as null.
    ///   watch      may end the work, and hears of polygons that take long
    /// In O(corners) for polygons of bounded size. A polygon of m corners takes about m^2 log m steps when its corners
    /// are spread out, and m^3 / 2 when they are all on a line; several threads share those of a large one, to the same
    /// result. Throws std::length_error above 2^31 - 1 corners or vertices, std::bad_alloc, and Cancelled; the tables
    /// are then as before.
    void build(const MeshTopology& topology, const IndexMapper& map, const std::vector<val3<float>>* positions,
               const WorkWatch& watch = {});

    /// The corner pairs of all vertices, one after another, two entries per pair.
    const std::vector<std::uint32_t>& framesPairs() const { return framesPairs_; }
    /// [affectCount + 1] vertex i's pairs are the entries framesPairs()[indexer[i] .. indexer[i + 1]); empty before
    /// build.
    const std::vector<std::uint32_t>& framesIndexer() const { return framesIndexer_; }
    /// Number of vertices the tables were built for; every entry of framesPairs() is below it.
    std::size_t vertexCount() const { return framesIndexer_.empty() ? 0 : framesIndexer_.size() - 1; }

    /// Writes the frames of the listed vertices.
    ///   frames     in and out; grown (by identities) to map.affectCount(), never shrunk. Others keep their values.
    ///   positions  points [map.affectCount()] to measure on, object space
    ///   invert     store each frame's inverse (Gauss-Jordan) instead
    ///   subset     null for every vertex, or affected indices, none twice
    /// A vertex that is not below map.affectCount() and positions.size() is left out; if positions are fewer than
    /// vertexCount(), all are. The result is the same for every number of threads.
    void calculateFrames(std::vector<mat4d>& frames, const std::vector<val3<float>>& positions, const IndexMapper& map,
                         bool invert, const std::vector<std::uint32_t>* subset) const;

    /// The same with normals smoothed first: in each of normalIterations passes, the normal of every listed vertex with
    /// connections becomes the normalised sum of itself and its neighbours' normals times their weights.
    ///   connectionsIndexer, connections, weights   as VertexConnections has them; not trusted: entries outside the
    ///                                              arrays, and neighbours without a normal, are left out
    /// Allocates two arrays of normals.
    void calculateFrames(std::vector<mat4d>& frames, const std::vector<val3<float>>& positions,
                         const std::vector<std::uint32_t>& connectionsIndexer,
                         const std::vector<std::uint32_t>& connections, const std::vector<float>& weights,
                         std::size_t normalIterations, const IndexMapper& map, bool invert,
                         const std::vector<std::uint32_t>* subset) const;

    /// The transport of all listed vertices (transportDelta) through the frames measured on positions, which are not
    /// stored: at 128 bytes each, that takes longer than measuring them.
    ///   out                in and out, [affectCount]; vertices that are not listed keep their values
    ///   deltas             one per listed vertex, in the order of the list
    ///   restPoints         [affectCount] unsmoothed, object space
    ///   restFramesInverse  [affectCount] as calculateFrames inverts them
    ///   positions          [affectCount] points to measure the current frames on, object space
    ///   subset             null for every vertex, or affected indices, none twice
    /// Vertices beyond one of the arrays are left out; if positions are fewer than vertexCount(), all are. The result
    /// is the same for every number of threads.
    void transportDeltas(std::vector<val3<float>>& out, const std::vector<val3<float>>& deltas,
                         const std::vector<val3<float>>& restPoints, const std::vector<mat4d>& restFramesInverse,
                         const std::vector<val3<float>>& positions, const std::vector<std::uint32_t>* subset) const;

    /// out[i] = points[i] in the local coordinates of the frame of vertex i on positions.
    ///   positions  [vertexCount()] object space
    ///   points     any number; those from positions.size() on, or all if positions are too few, give zero
    ///   out        resized to points.size()
    void calculateDisplacements(const std::vector<val3<float>>& positions, const std::vector<val3<float>>& points,
                                std::vector<val3<float>>& out) const;

private:
    SharedArray<std::uint32_t> framesPairs_;
    SharedArray<std::uint32_t> framesIndexer_;
};

} // namespace quill
