// SPDX-License-Identifier: Apache-2.0
// The vertices of a mesh in the order of the file that it was imported from.
#pragma once

#include "quarn/scene/meshes.h"

#include <cstdint>
#include <span>
#include <string>
#include <vector>

namespace quarn {

/// Which vertex of the scene's mesh each written vertex is. Without a map: the scene's own order.
class VertexOrder {
public:
    VertexOrder() = default;
    /// `sceneVertexOf` by vertex of the file; every number below `sceneVertices`. Throws std::runtime_error, naming the
    /// vertex and both numbers, otherwise. A scene vertex may stand for several of the file.
    VertexOrder(std::vector<std::int32_t> sceneVertexOf, std::size_t sceneVertices);

    /// Of the file `character.vertexMapFile`, for the mesh of that name, relative to the current directory; "{mesh}" in
    /// the path is that name. Throws std::runtime_error when the scene has no character or no such file, or it does not
    /// fit. Thread: main.
    static VertexOrder ofFile(const std::string& meshName, std::size_t sceneVertices);

    bool isSceneOrder() const { return sceneVertexOf_.empty(); }
    /// The points in this order; of the scene's own order, `xyz` itself. Valid until the next call.
    std::span<const float> points(std::span<const float> xyz);
    /// The polygons on these vertices; of several that are one in the scene, the first.
    MeshPolygons polygons(const MeshPolygons& scene) const;

private:
    std::vector<std::int32_t> sceneVertexOf_;
    std::vector<float> ordered_;
};

} // namespace quarn
