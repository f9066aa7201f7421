// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/VertexOrder.h"

#include "quarn/scene/vertexMap.h"

#include <stdexcept>

namespace quarn {

VertexOrder::VertexOrder(std::vector<std::int32_t> sceneVertexOf, std::size_t sceneVertices)
    : sceneVertexOf_(std::move(sceneVertexOf)) {
    if (sceneVertexOf_.empty())
        throw std::runtime_error("the map of vertices is empty");
    for (std::size_t vertex = 0; vertex < sceneVertexOf_.size(); ++vertex)
        if (const std::int32_t scene = sceneVertexOf_[vertex];
            scene < 0 || static_cast<std::size_t>(scene) >= sceneVertices)
            throw std::runtime_error("the map of vertices leads from vertex " + std::to_string(vertex) + " to " +
                                     std::to_string(scene) + ", and the mesh has " + std::to_string(sceneVertices));
}

VertexOrder VertexOrder::ofFile(const std::string& meshName, std::size_t sceneVertices) {
    const std::string path = vertexMapFile(meshName).string();
    std::vector<std::int32_t> map = readVertexMap(meshName);
    try {
        return {std::move(map), sceneVertices};
    } catch (const std::runtime_error& error) {
        throw std::runtime_error(path + " does not fit " + meshName + ": " + error.what());
    }
}

std::span<const float> VertexOrder::points(std::span<const float> xyz) {
    if (isSceneOrder())
        return xyz;
    ordered_.resize(3 * sceneVertexOf_.size());
    for (std::size_t i = 0; i < ordered_.size(); ++i)
        ordered_[i] = xyz[3 * static_cast<std::size_t>(sceneVertexOf_[i / 3]) + i % 3];
    return ordered_;
}

MeshPolygons VertexOrder::polygons(const MeshPolygons& scene) const {
    if (isSceneOrder())
        return scene;
    constexpr std::uint32_t none = 0xFFFFFFFF;
    std::vector<std::uint32_t> first(scene.vertexCount, none);
    for (std::size_t vertex = sceneVertexOf_.size(); vertex-- > 0;)
        first[static_cast<std::size_t>(sceneVertexOf_[vertex])] = static_cast<std::uint32_t>(vertex);
    MeshPolygons polygons = scene;
    polygons.vertexCount = sceneVertexOf_.size();
    for (std::uint32_t& corner : polygons.corners) {
        if (first[corner] == none)
            throw std::runtime_error("vertex " + std::to_string(corner) +
                                     " of the scene is none of the file's, and a polygon needs it: use --order scene");
        corner = first[corner];
    }
    return polygons;
}

} // namespace quarn
