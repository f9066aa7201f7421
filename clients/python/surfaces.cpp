// SPDX-License-Identifier: Apache-2.0
// neuralwarp.smooth, neuralwarp.vertex_frames
#include "python/arrays.h"
#include "python/core.h"
#include "python/interrupts.h"
#include "python/meshes.h"

#include "nw_deform/surface.h"

#include <cmath>
#include <cstring>
#include <vector>

namespace neuralWarp::python {

namespace py = pybind11;

namespace {

/// A mesh at rest, and points of it.
struct Surface {
    Surface(const py::object& givenPoints, const py::object& faces, const py::object& givenRest) {
        const FloatArray restArray = floatsOf(givenRest, "rest", {anyLength, 3});
        points = pointsOf(floatsOf(givenPoints, "points", {restArray.shape(0), 3}));
        rest = pointsOf(restArray);
        topology = topologyOf(faces, rest.size());
        checkFinite("points", points);
        checkFinite("rest", rest);
    }

    static void checkFinite(const std::string& name, const Points& values);

    Points points, rest;
    quill::MeshTopology topology;
};

void Surface::checkFinite(const std::string& name, const Points& values) {
    for (std::size_t i = 0; i < values.size(); ++i)
        for (std::size_t axis = 0; axis < 3; ++axis)
            if (!std::isfinite(values[i][axis]))
                throw py::value_error(name + ": vertex " + std::to_string(i) + " has the value " +
                                      std::to_string(values[i][axis]));
}

FloatArray smooth(const py::object& points, const py::object& faces, const py::object& rest, std::int64_t iterations) {
    if (iterations < 0)
        throw py::value_error("iterations: expected 0 or more, got " + std::to_string(iterations));
    Surface surface(points, faces, rest);
    withoutGil([&](const IsCancelled& isCancelled) {
        smoothOnRest(surface.points, surface.topology, surface.rest, iterations, isCancelled);
    });
    FloatArray result(Shape{static_cast<py::ssize_t>(surface.points.size()), 3});
    if (!surface.points.empty())
        std::memcpy(result.mutable_data(), surface.points.data(), static_cast<std::size_t>(result.nbytes()));
    return result;
}

py::array_t<double> vertexFrames(const py::object& points, const py::object& faces, const py::object& rest) {
    const Surface surface(points, faces, rest);
    std::vector<quill::mat4d> frames;
    withoutGil([&](const IsCancelled& isCancelled) {
        quill::WorkWatch watch;
        watch.isCancelled = isCancelled;
        frames = framesOnRest(surface.points, surface.topology, surface.rest, watch);
    });
    py::array_t<double> result(Shape{static_cast<py::ssize_t>(frames.size()), 4, 4});
    if (!frames.empty())
        std::memcpy(result.mutable_data(), frames.data(), static_cast<std::size_t>(result.nbytes()));
    return result;
}

} // namespace

void addSurfaces(py::module_& module) {
    module.def("smooth", &smooth, py::arg("points"), py::arg("faces"), py::arg("rest"), py::arg("iterations"),
               R"(smooth(points, faces, rest, iterations) -> float32 [N, 3]

Points as deltas are meant on them: averaged with their neighbours again and again, each weighted by the inverse of its
distance at rest.

points: float32 [N, 3], object space
faces, rest: as Deformer takes them
iterations: passes, 0 or more
Raises ValueError that names the argument, what was expected and what was got.)");
    module.def("vertex_frames", &vertexFrames, py::arg("points"), py::arg("faces"), py::arg("rest"),
               R"(vertex_frames(points, faces, rest) -> float64 [N, 4, 4]

The local frame of each vertex at points, by the neighbours that are chosen at rest: rows are X, Y, Z (the normal) and
the position, so that a row vector times it comes out of the frame. The basis is left-handed: X x Y = -Z.

points: float32 [N, 3], object space
faces, rest: as Deformer takes them
Raises ValueError that names the argument, what was expected and what was got.)");
}

} // namespace neuralWarp::python
