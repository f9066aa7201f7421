// SPDX-License-Identifier: Apache-2.0
// Meshes as quarn reads and makes them.
#pragma once

#include "openquarn/HObject.h"

#include <cstdint>
#include <span>
#include <vector>

class HPlug;

namespace quarn {

/// Polygons of a mesh; points go beside it, since they change from frame to frame.
struct MeshPolygons {
    std::size_t vertexCount = 0;
    std::vector<std::uint32_t> sizes;          ///< corners of each polygon, 2 or more
    std::vector<std::uint32_t> corners;        ///< vertices, polygon by polygon, in winding order; below vertexCount
    std::vector<float> uvs = {};               ///< u and v of each texture coordinate, v up; empty: none
    std::vector<std::uint32_t> uvCorners = {}; ///< for each of `corners`, which of them it has; empty where `uvs` is
};

/// Evaluates a plug that holds a mesh. Throws std::runtime_error, naming the plug, when it fails or holds none.
/// Thread: main.
MeshPolygons polygonsOf(const HPlug& mesh);

/// Evaluates a plug that holds a mesh and writes x, y, z of every vertex, in the scene's unit and object space; `xyz`
/// is resized to 3 times the vertices. Throws as polygonsOf() does. Thread: main.
void readPoints(const HPlug& mesh, std::vector<double>& xyz);
void readPoints(const HPlug& mesh, std::vector<float>& xyz);
/// The same into an array of that size; throws for another size, too.
void readPoints(const HPlug& mesh, std::span<float> xyz);

/// Evaluates a plug that should hold a mesh. 0 when it holds none, or fails. Thread: main.
std::size_t vertexCountOf(const HPlug& mesh);

/// The length of the diagonal of the box around the points; 0 without points. Thread: any.
double boxDiagonal(std::span<const float> xyz);
/// The same of an evaluated mesh, in the scene's unit. Throws as polygonsOf() does. Thread: main.
double diagonalOf(const HPlug& mesh);

/// Mesh data for a plug. `xyz` 3 * polygons.vertexCount numbers. Throws std::runtime_error for what is no mesh.
HObject meshData(std::span<const double> xyz, const MeshPolygons& polygons);

} // namespace quarn
