// SPDX-License-Identifier: Apache-2.0
// neuralwarp.Deformer
#include "python/arrays.h"
#include "python/core.h"
#include "python/interrupts.h"
#include "python/meshes.h"

#include "nw_deform/Deformer.h"

#include <cstddef>
#include <memory>
#include <span>
#include <string>

namespace neuralWarp::python {

namespace py = pybind11;

namespace {

py::ssize_t lengthOf(std::size_t count) {
    return static_cast<py::ssize_t>(count);
}

std::unique_ptr<Deformer> make(const std::shared_ptr<Model>& model, const py::object& faces, const py::object& rest) {
    const FloatArray points = floatsOf(rest, "rest", {lengthOf(model->metadata().fullCount), 3});
    const auto count = static_cast<std::size_t>(points.shape(0));
    const quill::MeshTopology topology = topologyOf(faces, count);
    std::unique_ptr<Deformer> deformer;
    withoutGil([&](const IsCancelled& isCancelled) {
        quill::WorkWatch watch;
        watch.isCancelled = isCancelled;
        deformer = std::make_unique<Deformer>(model, topology, pointsOf(points), watch);
    });
    return deformer;
}

/// Weights [N], or none at all.
class Weights {
public:
    Weights(py::handle value, const Deformer& deformer) {
        if (!value.is_none())
            array_ = floatsOf(value, "weights", {lengthOf(deformer.vertexCount())});
    }
    const float* data() const { return array_.size() != 0 ? array_.data() : nullptr; }
    const FloatArray& array() const { return array_; }

private:
    FloatArray array_;
};

FloatArray evaluate(Deformer& deformer, const py::object& points, const py::object& controls, const py::object& out,
                    double envelope, const py::object& weights) {
    const py::ssize_t count = lengthOf(deformer.vertexCount());
    const FloatArray in = floatsOf(points, "points", {count, 3});
    const FloatArray values = floatsOf(controls, "controls", {lengthOf(deformer.model()->controlCount())});
    const Weights each(weights, deformer);
    FloatArray result = resultIn(out, "out", {count, 3});
    if (!out.is_none())
        checkApart({{result, "out", true},
                    {in, "points", false},
                    {values, "controls", false},
                    {each.array(), "weights", false}});
    const Pose pose{
        in.data(), {values.data(), static_cast<std::size_t>(values.size())}, static_cast<float>(envelope), each.data()};
    float* const to = result.mutable_data();
    withoutGil([&](const IsCancelled& isCancelled) { deformer.evaluate(pose, to, isCancelled); });
    return result;
}

FloatArray evaluateBatch(Deformer& deformer, const py::object& points, const py::object& controls,
                         const py::object& out, double envelope, const py::object& weights) {
    const std::size_t stride = 3 * deformer.vertexCount();
    const std::size_t controlCount = deformer.model()->controlCount();
    const FloatArray in = floatsOf(points, "points", {anyLength, lengthOf(deformer.vertexCount()), 3});
    const py::ssize_t frames = in.shape(0);
    const FloatArray values = floatsOf(controls, "controls", {frames, lengthOf(controlCount)});
    const Weights each(weights, deformer);
    FloatArray result = resultIn(out, "out", {frames, lengthOf(deformer.vertexCount()), 3});
    if (!out.is_none())
        checkApart({{result, "out", true},
                    {in, "points", false},
                    {values, "controls", false},
                    {each.array(), "weights", false}});
    float* const to = result.mutable_data();
    withoutGil([&](const IsCancelled& isCancelled) {
        for (std::size_t frame = 0; frame < static_cast<std::size_t>(frames); ++frame) {
            try {
                deformer.evaluate({in.data() + frame * stride,
                                   {values.data() + frame * controlCount, controlCount},
                                   static_cast<float>(envelope),
                                   each.data()},
                                  to + frame * stride, isCancelled);
            } catch (const std::invalid_argument& error) {
                throw std::invalid_argument("frame " + std::to_string(frame) + ": " + error.what());
            }
            if (isCancelled())
                throw quill::Cancelled();
        }
    });
    return result;
}

} // namespace

void addDeformers(py::module_& module) {
    py::class_<Deformer>(module, "Deformer", R"(A mesh that a model deforms.

Deformer(model, faces, rest)

model: Model, trained on a mesh of as many vertices
faces: whole numbers [F, k], the corners of polygons of k corners; or a tuple of the numbers of corners [F] and of all
    corners
rest: float32 [N, 3], the points of the rest shape, object space
Raises ValueError that names the argument, what was expected and what was got.

One thread at a time: a second one gets a RuntimeError. Different deformers are independent, also of one model.)")
        .def(py::init(&make), py::arg("model").none(false), py::arg("faces"), py::arg("rest"))
        .def_property_readonly(
            "model", [](const Deformer& deformer) { return std::const_pointer_cast<Model>(deformer.model()); },
            "The model that it was made with.")
        .def_property_readonly("vertex_count", &Deformer::vertexCount, "N, the vertices of the mesh.")
        .def("evaluate", &evaluate, py::arg("points"), py::arg("controls"), py::arg("out") = py::none(),
             py::arg("envelope") = 1.0, py::arg("weights") = py::none(),
             R"(evaluate(points, controls, out=None, envelope=1.0, weights=None) -> out, or a new array

Computes a frame: the positions, object space, that the plug-in gives for the same input, rounded to float32.

points: float32 [N, 3], as the rig makes them, object space
controls: float32 [control_count], in the units of the rig
out: float32 [N, 3], C-contiguous, that overlaps no other argument; None for a new array
envelope: part of the way to the positions of the model
weights: float32 [N], the same for each vertex; None for 1
Arrays that are float32 and C-contiguous are read and written where they are, others are copied once. The GIL is
released. Ctrl-C ends long smoothing; out is void then, as after any exception.
Raises ValueError for an argument of another shape or type and for the first number that is not finite, RuntimeError
when another thread is using the deformer.)")
        .def("evaluate_batch", &evaluateBatch, py::arg("points"), py::arg("controls"), py::arg("out") = py::none(),
             py::arg("envelope") = 1.0, py::arg("weights") = py::none(),
             R"(evaluate_batch(points, controls, out=None, envelope=1.0, weights=None) -> out, or a new array

evaluate() of frame after frame.

points: float32 [B, N, 3]
controls: float32 [B, control_count]
out: float32 [B, N, 3], or None
envelope, weights: of all frames
Raises what evaluate() raises, with the number of the frame.)")
        .def("__repr__", [](const Deformer& deformer) {
            return "<neuralwarp.Deformer of " + std::to_string(deformer.vertexCount()) + " vertices by '" +
                   deformer.model()->directory().string() + "'>";
        });
}

} // namespace neuralWarp::python
