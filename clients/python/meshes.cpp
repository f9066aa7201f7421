// SPDX-License-Identifier: Apache-2.0
#include "python/meshes.h"

#include <limits>
#include <string>

namespace neuralWarp::python {

namespace py = pybind11;

namespace {

constexpr std::int64_t mostCorners = std::numeric_limits<std::int32_t>::max();

/// Appends a polygon, whose corners are the next ones.
void addPolygon(quill::MeshTopology& topology, std::int64_t& corners, std::int64_t size) {
    topology.polygonOffsets.push_back(static_cast<std::uint32_t>(corners));
    corners += size;
    ++topology.polygonCount;
}

void addCorners(quill::MeshTopology& topology, const IndexArray& corners, std::size_t vertexCount,
                const std::string& name) {
    const std::int64_t* const first = corners.data();
    topology.polygonVertices.reserve(static_cast<std::size_t>(corners.size()));
    for (py::ssize_t i = 0; i < corners.size(); ++i) {
        if (first[i] < 0 || static_cast<std::uint64_t>(first[i]) >= vertexCount)
            throw py::value_error(name + ": expected vertices from 0 to " + std::to_string(vertexCount) + " - 1, got " +
                                  std::to_string(first[i]) + " at corner " + std::to_string(i));
        topology.polygonVertices.push_back(static_cast<std::uint32_t>(first[i]));
    }
}

void addEqualPolygons(quill::MeshTopology& topology, py::handle faces, std::size_t vertexCount) {
    const IndexArray array = indicesOf(faces, "faces", {anyLength, anyLength});
    if (array.size() > mostCorners)
        throw py::value_error("faces: expected at most 2^31 - 1 corners, got " + std::to_string(array.size()));
    std::int64_t corners = 0;
    for (py::ssize_t i = 0; i < array.shape(0); ++i)
        addPolygon(topology, corners, array.shape(1));
    addCorners(topology, array, vertexCount, "faces");
}

void addPolygons(quill::MeshTopology& topology, const py::tuple& faces, std::size_t vertexCount) {
    if (faces.size() != 2)
        throw py::value_error("faces: expected an array [F, k], or a tuple of counts and corners, got a tuple of " +
                              std::to_string(faces.size()));
    const IndexArray counts = indicesOf(faces[0], "faces[0]", {anyLength});
    const IndexArray array = indicesOf(faces[1], "faces[1]", {anyLength});
    std::int64_t corners = 0;
    for (py::ssize_t i = 0; i < counts.size(); ++i) {
        const std::int64_t size = counts.data()[i];
        if (size < 0 || size > mostCorners || corners + size > mostCorners)
            throw py::value_error("faces[0]: expected numbers of corners, 2^31 - 1 in all, got " +
                                  std::to_string(size) + " for face " + std::to_string(i));
        addPolygon(topology, corners, size);
    }
    if (corners != array.size())
        throw py::value_error("faces[1]: expected the " + std::to_string(corners) + " corners that faces[0] adds up " +
                              "to, got " + std::to_string(array.size()));
    addCorners(topology, array, vertexCount, "faces[1]");
}

} // namespace

quill::MeshTopology topologyOf(py::handle faces, std::size_t vertexCount) {
    if (vertexCount > static_cast<std::size_t>(mostCorners))
        throw py::value_error("rest: expected at most 2^31 - 1 vertices, got " + std::to_string(vertexCount));
    quill::MeshTopology topology;
    if (py::isinstance<py::tuple>(faces))
        addPolygons(topology, py::reinterpret_borrow<py::tuple>(faces), vertexCount);
    else
        addEqualPolygons(topology, faces, vertexCount);
    topology.polygonOffsets.push_back(static_cast<std::uint32_t>(topology.polygonVertices.size()));
    topology.vertexCount = static_cast<int>(vertexCount);
    topology.valid = true;
    return topology;
}

Points pointsOf(const FloatArray& array) {
    Points points(static_cast<std::size_t>(array.shape(0)));
    const float* coordinate = array.data();
    for (quill::val3<float>& point : points) {
        point = {coordinate[0], coordinate[1], coordinate[2]};
        coordinate += 3;
    }
    return points;
}

} // namespace neuralWarp::python
