// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <vector>

namespace quarn {

/// The surface of a mesh as an FBX or Collada file has it, and as the modelling tool counts it: a point for each of the
/// tool's vertices, whatever its normals and texture coordinates. In the mesh's space, in the file's unit and axes.
struct ControlMesh {
    std::vector<double> points;              ///< [3 * control points]: x, y, z of each; as the file has them
    std::vector<std::uint32_t> polygonSizes; ///< corners of each polygon; 1 and 2 are points and lines
    std::vector<std::uint32_t> corners;      ///< control points, polygon by polygon; all in range
};

} // namespace quarn
