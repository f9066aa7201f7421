// SPDX-License-Identifier: Apache-2.0
// What both forms of an FBX file come to.
#pragma once

#include "quarn/character/ControlMesh.h"

#include <string_view>
#include <vector>

namespace quarn {

/// A geometry's two arrays.
struct FbxArrays {
    std::vector<double> vertices;                 ///< x, y, z of each control point
    std::vector<std::int32_t> polygonVertexIndex; ///< control points of corners; the last of a polygon is ~index
};

/// Those of all geometries, in the file's order. Throw std::runtime_error, with the reason alone.
std::vector<FbxArrays> readFbxBinary(std::string_view bytes);
std::vector<FbxArrays> readFbxText(std::string_view bytes);

} // namespace quarn
