// SPDX-License-Identifier: Apache-2.0
// neuralwarp._scene: scenes of the host, with the deformer as it runs there.
#include "openquarn/HFnAttribute.h"
#include "python/scene/Host.h"
#include "python/scene/OpenScene.h"
#include "python/scene/Plugs.h"
#include "python/scene/values.h"
#include "quarn/scene/controlNames.h"
#include "quarn/scene/joints.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/vertexMap.h"

#include <pybind11/pybind11.h>
#include <pybind11/stl.h>
#include <pybind11/stl/filesystem.h>

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <optional>
#include <stdexcept>

namespace python {
namespace {

namespace py = pybind11;
namespace fs = std::filesystem;
using Shared = std::shared_ptr<OpenScene>;

[[noreturn]] void throwNotFound(const fs::path& path) {
    PyErr_SetObject(PyExc_FileNotFoundError, py::make_tuple(ENOENT, "no such scene file", path.string()).ptr());
    throw py::error_already_set();
}

Shared open(const fs::path& path) {
    std::error_code error;
    const fs::path whole = fs::absolute(path, error);
    if (error || !fs::exists(whole, error))
        throwNotFound(path);
    if (!fs::is_regular_file(whole, error))
        throw std::invalid_argument(whole.string() + " is not a file");
    return std::make_shared<OpenScene>(whole);
}

// what the parts of quarn find wrong about a name is a wrong value here
template <class Work>
auto asValueError(const Work& work) {
    try {
        return work();
    } catch (const std::runtime_error& error) {
        throw std::invalid_argument(error.what());
    }
}

OpenQuarn::Session& sessionOf() {
    return Host::instance().session();
}

double timeOf(OpenScene& scene) {
    const Visit visit(scene);
    return sessionOf().time();
}

void setTime(OpenScene& scene, double frame) {
    if (!std::isfinite(frame))
        throw std::invalid_argument("time has to be a finite number of frames, not " + std::to_string(frame));
    const Visit visit(scene);
    sessionOf().setTime(frame);
}

std::vector<std::pair<std::string, std::string>> nodesOf(OpenScene& scene) {
    const Visit visit(scene);
    std::vector<std::pair<std::string, std::string>> nodes;
    for (const HObject& node : sessionOf().nodes())
        nodes.emplace_back(quarn::nodeName(node), quarn::nodeType(node));
    return nodes;
}

py::object get(OpenScene& scene, const std::string& plug) {
    Visit visit(scene);
    return valueOf(visit, plugNamed(plug));
}

void set(OpenScene& scene, const std::string& plug, const py::object& value) {
    const Visit visit(scene);
    setValue(scene, plugNamed(plug), value);
}

FloatArray points(OpenScene& scene, const std::string& plug, const std::optional<py::array>& out) {
    Visit visit(scene);
    return pointsOf(visit, plugNamed(plug), out);
}

py::array_t<std::int32_t> integers(const std::vector<std::uint32_t>& values) {
    py::array_t<std::int32_t> array(static_cast<py::ssize_t>(values.size()));
    std::transform(values.begin(), values.end(), array.mutable_data(),
                   [](std::uint32_t value) { return static_cast<std::int32_t>(value); });
    return array;
}

py::tuple faces(OpenScene& scene, const std::string& name) {
    Visit visit(scene);
    const HPlug plug = plugNamed(name);
    visit.evaluate(plug);
    const quarn::MeshPolygons polygons = asValueError([&] { return quarn::polygonsOf(plug); });
    return py::make_tuple(integers(polygons.sizes), integers(polygons.corners));
}

py::list deformers(OpenScene& scene) {
    const Visit visit(scene);
    py::list list;
    for (const HObject& node : quarn::nodesOfType("neuralWarp")) {
        const quarn::Warp& warp = scene.deformer(quarn::nodeName(node));
        py::list geometries;
        for (const quarn::WarpGeometry& geometry : warp.geometries) {
            py::dict entry;
            entry["index"] = geometry.index;
            entry["name"] = geometry.name;
            entry["input"] = geometry.input.name().asStdString();
            entry["original"] = geometry.original.name().asStdString();
            entry["output"] = geometry.output.name().asStdString();
            geometries.append(entry);
        }
        py::dict entry;
        entry["node"] = warp.name;
        entry["geometries"] = geometries;
        list.append(entry);
    }
    return list;
}

FloatArray controls(OpenScene& scene, const std::string& deformer) {
    Visit visit(scene);
    const HPlug plug = scene.deformer(deformer).plug("controlValues");
    const std::vector<float>* values = nullptr;
    visit.evaluating(plug, [&] { values = &scene.controls(deformer); });
    FloatArray array(static_cast<py::ssize_t>(values->size()));
    std::copy(values->begin(), values->end(), array.mutable_data());
    return array;
}

std::vector<std::string> controlNames(OpenScene& scene, const std::string& deformer) {
    Visit visit(scene);
    const quarn::Warp& warp = scene.deformer(deformer);
    visit.evaluate(warp.plug("controlValues"));
    return quarn::controlNames(warp);
}

std::string rotateOrderOf(const HObject& joint) {
    const HPlug plug = quarn::plugOf(joint, "rotateOrder");
    return HFnEnumAttribute(plug.attribute()).fieldName(static_cast<short>(plug.asInt())).asStdString();
}

py::list joints(OpenScene& scene) {
    const Visit visit(scene);
    py::list list;
    for (const quarn::SceneJoint& joint : quarn::sceneJoints()) {
        py::dict entry;
        entry["name"] = joint.name;
        entry["parent"] = joint.parent;
        entry["rotateOrder"] = rotateOrderOf(joint.node);
        list.append(entry);
    }
    return list;
}

// the mesh that is meant without a name: of the only one, or of the only geometry of the only deformer
std::string onlyMesh(OpenScene& scene) {
    const std::vector<HObject> meshes = quarn::nodesOfType("mesh");
    if (meshes.size() == 1)
        return quarn::nodeName(meshes.front());
    return asValueError([&] { return scene.deformer("").geometry("").name; });
}

std::optional<py::array_t<std::int32_t>> vertexMap(OpenScene& scene, const std::string& mesh) {
    const Visit visit(scene);
    const std::vector<HObject> characters = quarn::nodesOfType("character");
    if (characters.empty() || quarn::textOf(quarn::plugOf(characters.front(), "vertexMapFile")).empty())
        return std::nullopt;
    const std::string name = mesh.empty() ? onlyMesh(scene) : mesh;
    const std::vector<std::int32_t> map = asValueError([&] { return quarn::readVertexMap(name); });
    return py::array_t<std::int32_t>(static_cast<py::ssize_t>(map.size()), map.data());
}

std::vector<double> framesOf(const py::iterable& frames) {
    std::vector<double> list;
    for (const py::handle& frame : frames) {
        list.push_back(frame.cast<double>());
        if (!std::isfinite(list.back()))
            throw std::invalid_argument("frames: " + std::to_string(list.back()) + " is not a finite number");
    }
    return list;
}

// goes back to the time that the current scene has now
class TimeOfBefore {
public:
    TimeOfBefore() = default;
    ~TimeOfBefore() { sessionOf().setTime(time_); }
    TimeOfBefore(const TimeOfBefore&) = delete;
    TimeOfBefore& operator=(const TimeOfBefore&) = delete;

private:
    double time_ = sessionOf().time();
};

FloatArray play(OpenScene& scene, const std::string& name, const py::iterable& frameList,
                const std::optional<py::array>& out) {
    const std::vector<double> frames = framesOf(frameList);
    Visit visit(scene);
    const HPlug plug = plugNamed(name);
    const TimeOfBefore after;
    const auto count = static_cast<py::ssize_t>(frames.size());
    if (count > 0)
        sessionOf().setTime(frames.front());
    const py::ssize_t vertices = pointsOf(visit, plug, std::nullopt).shape(0);
    FloatArray all = out ? writable(*out, {count, vertices, 3}, "out") : FloatArray({count, vertices, py::ssize_t{3}});
    for (py::ssize_t i = 0; i < count; ++i) {
        if (PyErr_CheckSignals() != 0)
            throw py::error_already_set();
        sessionOf().setTime(frames[static_cast<std::size_t>(i)]);
        const auto frame = all[py::int_(i)].cast<FloatArray>();
        pointsOf(visit, plug, frame);
    }
    return all;
}

std::string shown(const OpenScene& scene) {
    return "<neuralwarp.Scene " + scene.path().string() + (scene.isClosed() ? ", closed>" : ">");
}

void closeAll() {
    while (!OpenScene::allOpen().empty())
        OpenScene::allOpen().back()->close();
    const auto lock = Host::lock();
    Host::end();
}

void addPlugs(py::module_& module) {
    py::class_<Plugs>(module, "Plugs", R"(Many numbers of a scene at once, found once (Scene.plugs).

For what is set and read in every frame: a number takes well under a microsecond.)")
        .def_property_readonly("names", &Plugs::names, "The names that they were asked for by.")
        .def("__len__", [](const Plugs& plugs) { return plugs.names().size(); })
        .def("get", &Plugs::get, R"(The numbers, evaluated: float64 [n].

Raises RuntimeError, naming the plug, when one cannot be evaluated.)")
        .def("set", &Plugs::set, py::arg("values"),
             R"(Sets the numbers; those that have the value already stay untouched.

values: [n], any numbers; one beyond the limits of its attribute becomes the limit.
Raises ValueError for another shape and a number that is not finite, when nothing is set, and for a plug that cannot be
set (an output, connected into, locked), when those before it are.)");
}

} // namespace
} // namespace python

PYBIND11_MODULE(_scene, module) {
    using namespace python;
    module.doc() = "Scenes of the host, with the deformer as it runs there.";
    addPlugs(module);
    py::class_<OpenScene, Shared>(module, "Scene", R"(A scene that is open: nodes, plugs, and what they evaluate to.

Several can be open at a time, each with nodes of its own. All threads may use them; the calls of all scenes run one
after the other. Relative paths in a scene count from the scene's folder; the current folder of the process is neither
used nor changed. A plug is named as "node.list[3].child", a slider as "node.sliderName".)")
        .def_static("open", &open, py::arg("path"), R"(Opens a scene file (docs/sceneFiles.md).

Raises FileNotFoundError; ValueError, naming the file and the place, when it is no scene; RuntimeError when the plug-in
with the deformer is not found. What could not be understood is in `warnings`.)")
        .def("close", &OpenScene::close, "Deletes the nodes. Every other call raises RuntimeError from now on.")
        .def("__enter__", [](const Shared& scene) { return scene; })
        .def("__exit__", [](OpenScene& scene, const py::args&) { scene.close(); })
        .def("__repr__", &shown)
        .def_property_readonly(
            "path", [](const OpenScene& scene) { return scene.path().string(); }, "The file, absolute.")
        .def_property_readonly("closed", &OpenScene::isClosed)
        .def_property_readonly("warnings", &OpenScene::warnings, "What the host warned of when it opened the file.")
        .def("messages", &OpenScene::takeMessages,
             "What the host and its plug-ins warned of since the last call, and errors that were not raised.")
        .def_property("time", &timeOf, &setTime, "The current time, in frames.")
        .def("nodes", &nodesOf, "Name and type of every node, in order of creation.")
        .def("get", &get, py::arg("plug"), R"(The value of a plug, evaluated.

int, float or bool for numbers, str for texts, float64 [4, 4] for matrices (row vectors: translation in the last row),
float32 [vertices, 3] for meshes, a list for arrays and compounds; None where there is no value.
Raises ValueError when there is no such plug or it holds nothing of these, RuntimeError when it cannot be evaluated.)")
        .def("set", &set, py::arg("plug"), py::arg("value"), R"(Sets a plug to a value as get() gives it.

A choice may be set by its label. Numbers beyond the limits of the attribute become the limit.
Raises ValueError when there is no such plug, it cannot be set or does not take the value, TypeError for a value of
another kind.)")
        .def(
            "plugs", [](const Shared& scene, std::vector<std::string> names) { return Plugs(scene, std::move(names)); },
            py::arg("names"), R"(Plugs that hold a number each, found once, to be set and read many times.

Raises ValueError, naming the plug, when there is none of the name or it does not hold one number.)")
        .def("points", &points, py::arg("plug"), py::arg("out") = py::none(),
             R"(The points of a plug that holds a mesh, evaluated: float32 [vertices, 3], in the mesh's space.

out: such an array to write into, C-contiguous; it is returned.
Raises ValueError for a plug that holds no mesh and another `out`; RuntimeError when it cannot be evaluated, when the
host or the deformer shows an error (a model that is missing), and when a coordinate is not finite.)")
        .def("faces", &faces, py::arg("plug"), R"(The polygons of a plug that holds a mesh.

Returns their numbers of corners, int32 [polygons], and the vertices of all corners, int32 [sum of these].)")
        .def("deformers", &deformers, R"(The neuralWarp deformers.

A dict for each: "node", and "geometries": a list of dicts with "index", "name" (of the mesh), and the plugs "input",
"original" and "output".)")
        .def("controls", &controls, py::arg("deformer") = "", R"(The control values of a deformer: float32 [controls].

deformer: its name; "" for the only one.
Raises ValueError when it is not clear which is meant, RuntimeError when one cannot be evaluated or is not finite.)")
        .def("control_names", &controlNames, py::arg("deformer") = "", "What they are, in the same order.")
        .def("joints", &joints, R"(The joints, parents before their children.

A dict for each: "name", "parent" (an index, -1 for a root) and "rotateOrder" ("xyz").)")
        .def("vertex_map", &vertexMap, py::arg("mesh") = "",
             R"(The scene's vertex of each vertex of the character's file: int32.

mesh: the name of its node; "" for the only one. None when the scene does not come from a character's file.
Raises ValueError, with the reason, when the file with the map cannot be read.)")
        .def("play", &play, py::arg("plug"), py::arg("frames"), py::arg("out") = py::none(),
             R"(The points of a plug that holds a mesh, frame by frame: float32 [frames, vertices, 3].

frames: times, in any order. The scene's time is the one of before afterwards. Ctrl-C ends it between two frames.
Raises as points() does.)");
    py::module_::import("atexit").attr("register")(py::cpp_function(&closeAll));
}
