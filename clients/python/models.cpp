// SPDX-License-Identifier: Apache-2.0
// neuralwarp.Model
#include "python/arrays.h"
#include "python/core.h"

#include "nw_deform/Model.h"

#include <pybind11/stl.h>
#include <pybind11/stl/filesystem.h>

#include <filesystem>
#include <memory>
#include <span>

namespace neuralWarp::python {

namespace py = pybind11;

namespace {

using SharedModel = std::shared_ptr<Model>;

// holders are of what is not const; every method is
SharedModel load(const std::filesystem::path& directory) {
    const py::gil_scoped_release released;
    return std::const_pointer_cast<Model>(Model::load(directory));
}

py::str textOf(const std::string& bytes) {
    return py::reinterpret_steal<py::str>(
        PyUnicode_DecodeUTF8(bytes.data(), static_cast<py::ssize_t>(bytes.size()), "surrogateescape"));
}

py::object metadataOf(const Model& model) {
    return py::module_::import("json").attr("loads")(textOf(model.metadataText()));
}

py::list controlNamesOf(const Model& model) {
    py::list names;
    if (model.certificate())
        for (const std::string& name : model.certificate()->controlNames)
            names.append(textOf(name));
    return names;
}

template <class Array>
Array readOnly(Array array) {
    array.attr("setflags")(py::arg("write") = false);
    return array;
}

py::object rangesOf(const Model& model) {
    if (!model.certificate())
        return py::none();
    const ControlRanges& ranges = model.certificate()->ranges;
    FloatArray array(Shape{static_cast<py::ssize_t>(ranges.count()), 2});
    float* value = array.mutable_data();
    for (std::size_t i = 0; i < ranges.count(); ++i) {
        *value++ = ranges.minimum(i);
        *value++ = ranges.maximum(i);
    }
    return readOnly(array);
}

py::dict figuresOf(const ErrorFigures& figures) {
    py::dict row;
    row["mean"] = figures.mean;
    row["p99"] = figures.p99;
    row["p9999"] = figures.p9999;
    row["max"] = figures.max;
    return row;
}

py::list errorsOf(const Model& model) {
    py::list rows;
    if (!model.certificate())
        return rows;
    for (const CertifiedErrors& errors : model.certificate()->errors) {
        py::dict row;
        row["frames"] = errors.frames;
        row["heldOut"] = textOf(errors.heldOut);
        row["poses"] = textOf(errors.poses);
        row["network"] = figuresOf(errors.network);
        if (errors.skin)
            row["skin"] = figuresOf(*errors.skin);
        if (errors.zeroDeltas)
            row["zeroDeltas"] = figuresOf(*errors.zeroDeltas);
        if (errors.basis)
            row["basis"] = figuresOf(*errors.basis);
        rows.append(row);
    }
    return rows;
}

py::array_t<std::uint32_t> verticesOf(const SharedModel& model) {
    const quill::IndexMapper& map = model->vertices();
    const auto count = static_cast<py::ssize_t>(map.affectCount());
    if (map.isIdentity()) {
        py::array_t<std::uint32_t> array(count);
        std::uint32_t* const vertices = array.mutable_data();
        for (std::size_t k = 0; k < map.affectCount(); ++k)
            vertices[k] = map.toFull(k);
        return readOnly(array);
    }
    // a view, which keeps the model
    return readOnly(py::array_t<std::uint32_t>(count, map.affectedToFull().data(), py::cast(model)));
}

FloatArray controlsFor(const Model& model, py::handle controls) {
    return floatsOf(controls, "controls", {static_cast<py::ssize_t>(model.controlCount())});
}

std::span<const float> spanOf(const FloatArray& array) {
    return {array.data(), static_cast<std::size_t>(array.size())};
}

} // namespace

void addModels(py::module_& module) {
    py::class_<Model, SharedModel>(module, "Model", R"(A trained model, without a mesh.

Immutable: any thread, several at once.)")
        .def_static("load", &load, py::arg("directory"), R"(load(directory) -> Model

Reads a model directory (NAME.nwrp), all of it, and runs its network once.

directory: str or os.PathLike
Raises FileNotFoundError when the directory, its metadata.json or its model.onnx is not there, ValueError when one of
its files is of no use; both name the file and the reason.)")
        .def_property_readonly(
            "directory", [](const Model& model) { return py::str(model.directory().string()); },
            "Where it was loaded from: an absolute path.")
        .def_property_readonly("metadata", &metadataOf, "What metadata.json holds: a new dict each time.")
        .def_property_readonly("control_count", &Model::controlCount, "Values that the network takes.")
        .def_property_readonly("control_names", &controlNamesOf,
                               "Their names in order; empty for a model without a certificate.")
        .def_property_readonly(
            "ranges", &rangesOf,
            "float32 [controls, 2], read-only: least and largest value of each over the training; None without "
            "a certificate.")
        .def_property_readonly(
            "errors", &errorsOf,
            "Distances on frames that were held out, one dict for each set of them, in mm: frames, heldOut, poses, and "
            "mean, p99, p9999 and max of network, and of skin, zeroDeltas and basis where they are known.")
        .def_property_readonly(
            "certificate_problem", [](const Model& model) { return textOf(model.certificateProblem()); },
            "What it does not know of itself, and why, a sentence; empty where nothing is missing.")
        .def_property_readonly(
            "vertex_count", [](const Model& model) { return model.metadata().fullCount; },
            "Vertices of the whole mesh that it was trained on.")
        .def_property_readonly("vertices", &verticesOf,
                               "uint32, read-only: the vertices that it drives, in slot order.")
        .def_property_readonly(
            "delta_mode", [](const Model& model) { return model.settings().isSurface() ? "Surface" : "Offset"; },
            "How deltas are meant: 'Surface', carried by the frames of the smoothed surface, or 'Offset'.")
        .def_property_readonly(
            "smoothing_iterations", [](const Model& model) { return model.metadata().smoothingIterations; },
            "Passes of smoothing over the points of each frame.")
        .def(
            "distance",
            [](const Model& model, const py::object& controls) {
                return model.distance(spanOf(controlsFor(model, controls)));
            },
            py::arg("controls"), R"(distance(controls) -> float

How far controls are outside the ranges of the training: 0 inside, 0.25 where the one furthest out is beyond by a
quarter of its range.

controls: [control_count]
Raises ValueError for another shape, and for a model without a certificate.)")
        .def(
            "expected_error",
            [](const Model& model, const py::object& controls) {
                return model.expectedError(spanOf(controlsFor(model, controls)));
            },
            py::arg("controls"), R"(expected_error(controls) -> float or None

The mean distance of the frame's vertices from where they should be, in mm, as frames that were held out let expect it;
None where that is not known.

controls: [control_count]
Raises ValueError for another shape.)")
        .def("__repr__", [](const Model& model) {
            return "<neuralwarp.Model '" + model.directory().string() + "', " + std::to_string(model.controlCount()) +
                   " controls, " + std::to_string(model.metadata().fullCount) + " vertices>";
        });
}

} // namespace neuralWarp::python
