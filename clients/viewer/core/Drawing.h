// SPDX-License-Identifier: Apache-2.0
// What is drawn of a mesh.
#pragma once

#include "Settings.h"
#include "frame/Points.h"
#include "quill/MeshTopology.h"
#include "viewer/Blocks.h"

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace viewer {

/// The polygons of the blocks mesh.sizes and mesh.corners. Throws std::runtime_error for blocks that do not fit.
quill::MeshTopology readTopology(const Blocks& blocks, const Settings& settings);

/// Triangles, and what they are drawn with: of draw vertices, into which the vertices are split where the texture has a
/// seam. One thread at a time.
class Drawing {
public:
    /// Reads draw.vertices and draw.corners. Throws std::runtime_error for blocks that do not fit.
    Drawing(const Blocks& blocks, const Settings& settings, const quill::MeshTopology& topology);

    std::size_t vertexCount() const { return vertices_.empty() ? meshVertexCount_ : vertices_.size(); }
    /// Whether every vertex is drawn as it is.
    bool isWhole() const { return vertices_.empty(); }
    /// [3 * triangles] polygons in their order, each a fan about its first corner.
    std::span<const std::uint32_t> triangles() const { return triangles_; }

    /// Values of the mesh's vertices, `width` each, at the draw vertices.
    void spread(std::span<const float> values, std::size_t width, std::vector<float>& drawn) const;
    /// Unit normals at the draw vertices: the mean of the triangles about the vertex by their areas, across seams; zero
    /// where there is none.
    ///   points  [3 * vertices]
    void measureNormals(std::span<const float> points, std::vector<float>& normals);

private:
    std::size_t meshVertex(std::uint32_t drawn) const { return vertices_.empty() ? drawn : vertices_[drawn]; }

    std::size_t meshVertexCount_;
    std::vector<std::uint32_t> vertices_; // of the mesh; empty: each its own
    std::vector<std::uint32_t> triangles_;
    neuralWarp::Points vertexNormals_;
};

} // namespace viewer
