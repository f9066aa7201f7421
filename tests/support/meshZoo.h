// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/MeshTopology.h"
#include "quill/val3.h"

#include <cstdint>
#include <string>
#include <vector>

// A mesh to try algorithms on: every vertex has a point, every corner a vertex.
struct ZooMesh {
    std::string name;
    std::vector<std::vector<std::uint32_t>> polygons;
    std::vector<quill::val3<float>> points;
    bool degenerate = false; // has zero-area polygons, coincident points or polygons of less than three corners

    std::size_t vertexCount() const { return points.size(); }
    quill::MeshTopology topology() const;
};

quill::MeshTopology makeTopology(const std::vector<std::vector<std::uint32_t>>& polygons, std::size_t vertexCount);

// columns x rows quads in the xy plane with a ripple in z, boundary all around.
ZooMesh makeGrid(std::size_t columns, std::size_t rows);
// Triangles, closed: an icosahedron, each face divided in four `subdivisions` times, on the unit sphere.
ZooMesh makeIcosphere(std::size_t subdivisions);
// The same mesh with its vertices renumbered at random and its polygons shuffled.
ZooMesh shuffled(const ZooMesh& mesh, std::uint32_t seed);

// Small meshes of every kind that makes trouble: triangles, quads, n-gons, concave, boundary, closed, non-manifold,
// isolated vertices, zero area, coincident points, polygons of one and two corners, no polygon, nothing at all.
const std::vector<ZooMesh>& meshZoo();
