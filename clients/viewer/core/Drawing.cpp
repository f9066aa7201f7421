// SPDX-License-Identifier: Apache-2.0
#include "Drawing.h"

#include "checks.h"

#include <algorithm>
#include <string>

namespace viewer {
namespace {

using Vector = quill::val3<float>;

Vector pointAt(std::span<const float> points, std::size_t vertex) {
    return {points[3 * vertex], points[3 * vertex + 1], points[3 * vertex + 2]};
}

std::vector<std::uint32_t> trianglesOf(const quill::MeshTopology& topology, std::span<const std::uint32_t> corners) {
    std::vector<std::uint32_t> triangles;
    for (std::size_t p = 0; p < topology.polygonCount; ++p)
        for (std::size_t i = topology.polygonOffsets[p]; i + 2 < topology.polygonOffsets[p + 1]; ++i)
            triangles.insert(triangles.end(), {corners[topology.polygonOffsets[p]], corners[i + 1], corners[i + 2]});
    return triangles;
}

} // namespace

quill::MeshTopology readTopology(const Blocks& blocks, const Settings& settings) {
    const auto sizes = blocks.array<std::uint32_t>("mesh.sizes");
    const auto corners = arrayOf<std::uint32_t>(blocks, "mesh.corners", total("mesh.sizes", sizes));
    checkBelow("mesh.corners", corners, settings.vertices, "vertices");
    quill::MeshTopology topology;
    topology.polygonOffsets.reserve(sizes.size() + 1);
    topology.polygonOffsets.push_back(0);
    for (const std::uint32_t size : sizes)
        topology.polygonOffsets.push_back(topology.polygonOffsets.back() + size);
    topology.polygonVertices.assign(corners.begin(), corners.end());
    topology.polygonCount = sizes.size();
    topology.vertexCount = static_cast<int>(settings.vertices);
    topology.valid = true;
    return topology;
}

Drawing::Drawing(const Blocks& blocks, const Settings& settings, const quill::MeshTopology& topology)
    : meshVertexCount_(settings.vertices) {
    constexpr const char* name = "draw.vertices";
    if (!blocks.has(name)) {
        triangles_ = trianglesOf(topology, topology.polygonVertices);
        return;
    }
    const auto vertices = blocks.array<std::uint32_t>(name);
    checkBelow(name, vertices, settings.vertices, "vertices");
    const auto corners = arrayOf<std::uint32_t>(blocks, "draw.corners", topology.polygonVertices.size());
    checkBelow("draw.corners", corners, vertices.size(), "draw vertices");
    for (std::size_t i = 0; i < corners.size(); ++i)
        if (vertices[corners[i]] != topology.polygonVertices[i])
            refuse("draw.corners", "corner " + std::to_string(i) + " is drawn at vertex " +
                                       std::to_string(vertices[corners[i]]) + ", and is one of vertex " +
                                       std::to_string(topology.polygonVertices[i]));
    vertices_.assign(vertices.begin(), vertices.end());
    triangles_ = trianglesOf(topology, corners);
}

void Drawing::spread(std::span<const float> values, std::size_t width, std::vector<float>& drawn) const {
    drawn.resize(width * vertexCount());
    for (std::size_t i = 0; i < vertexCount(); ++i)
        std::copy_n(values.data() + width * meshVertex(static_cast<std::uint32_t>(i)), width, drawn.data() + width * i);
}

void Drawing::measureNormals(std::span<const float> points, std::vector<float>& normals) {
    vertexNormals_.assign(meshVertexCount_, Vector());
    for (std::size_t i = 0; i < triangles_.size(); i += 3) {
        const std::size_t corner[] = {meshVertex(triangles_[i]), meshVertex(triangles_[i + 1]),
                                      meshVertex(triangles_[i + 2])};
        const Vector origin = pointAt(points, corner[0]);
        const Vector normal = cross(pointAt(points, corner[1]) - origin, pointAt(points, corner[2]) - origin);
        for (const std::size_t vertex : corner) // its length is twice the area
            vertexNormals_[vertex] += normal;
    }
    for (Vector& normal : vertexNormals_) {
        const float length = normal.length(); // small meshes in metres have areas that normalize() takes for none
        normal = length > 0.0F ? normal / length : Vector();
    }
    spread({&vertexNormals_.front().x, 3 * meshVertexCount_}, 3, normals);
}

} // namespace viewer
