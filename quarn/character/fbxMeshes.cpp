// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/fbxMeshes.h"

#include "quarn/character/fbxArrays.h"

#include <stdexcept>
#include <string>
#include <utility>

namespace quarn {
namespace {

ControlMesh meshOf(FbxArrays arrays) {
    ControlMesh mesh;
    mesh.points = std::move(arrays.vertices);
    const std::size_t count = mesh.points.size() / 3;
    mesh.corners.reserve(arrays.polygonVertexIndex.size());
    std::uint32_t size = 0;
    for (const std::int32_t index : arrays.polygonVertexIndex) {
        const bool isLast = index < 0;
        const auto point = static_cast<std::uint32_t>(isLast ? ~index : index);
        if (point >= count)
            throw std::runtime_error("a polygon has control point " + std::to_string(point) + " of " +
                                     std::to_string(count));
        mesh.corners.push_back(point);
        ++size;
        if (isLast)
            mesh.polygonSizes.push_back(std::exchange(size, 0));
    }
    if (size > 0)
        throw std::runtime_error("the last polygon does not end");
    return mesh;
}

} // namespace

std::vector<ControlMesh> readFbxMeshes(std::string_view bytes) {
    const bool isBinary = bytes.substr(0, 64).find('\0') != std::string_view::npos;
    std::vector<ControlMesh> meshes;
    for (FbxArrays& arrays : isBinary ? readFbxBinary(bytes) : readFbxText(bytes))
        if (!arrays.polygonVertexIndex.empty()) // else it is a shape of another, or a curve
            meshes.push_back(meshOf(std::move(arrays)));
    return meshes;
}

} // namespace quarn
