// SPDX-License-Identifier: Apache-2.0
#include "ScenarioScene.h"

#include "values.h"

#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnMeshData.h"
#include "openquarn/HGlobal.h"
#include "openquarn/HPxDeformerNode.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/Plugins.h"

#include <algorithm>
#include <stdexcept>

namespace replay {
namespace {

constexpr const char* nodeName = "neuralWarp1";
constexpr std::string_view rootMark = "<ROOT>";

void require(const HStatus& status) {
    if (status.error())
        throw std::runtime_error(status.errorString().asStdString());
}

std::string replaced(std::string text, std::string_view from, std::string_view to) {
    for (std::size_t at = text.find(from); at != std::string::npos; at = text.find(from, at + to.size()))
        text.replace(at, from.size(), to);
    return text;
}

HPointArray readPoints(const Json& list) {
    HPointArray points;
    for (const auto& p : readVectors<double>(list))
        require(points.append(HPoint(p.x, p.y, p.z)));
    return points;
}

HObject makeMesh(const HPointArray& points, const Json& polygons) {
    HIntArray counts, corners;
    for (const Json& polygon : polygons.GetArray()) {
        counts.append(static_cast<int>(polygon.Size()));
        for (const std::uint32_t corner : readIndices(polygon))
            corners.append(static_cast<int>(corner));
    }
    HStatus status;
    HObject mesh = HFnMeshData().create(points, counts, corners, &status);
    require(status);
    return mesh;
}

// by vertex of the whole geometry, where the case has them by affected vertex
std::vector<float> spreadWeights(const Json& list, const std::optional<std::vector<unsigned>>& affected,
                                 std::size_t vertexCount) {
    if (list.IsNull())
        return {};
    std::vector<float> weights(vertexCount, 1.0F);
    if (list.Size() != (affected ? affected->size() : vertexCount))
        throw std::runtime_error("there is not a weight for each affected vertex");
    for (rapidjson::SizeType k = 0; k < list.Size(); ++k)
        weights.at(affected ? (*affected)[k] : k) = static_cast<float>(readNumber(list[k]));
    return weights;
}

void setPlug(HPlug plug, const Json& value, const std::string& root) {
    if (value.IsBool())
        require(plug.setBool(value.GetBool()));
    else if (value.IsInt())
        require(plug.setInt(value.GetInt()));
    else if (value.IsNumber())
        require(plug.setDouble(value.GetDouble()));
    else
        require(plug.setString(replaced(readText(value), rootMark, root)));
}

unsigned readIndex(const std::string& text) {
    std::size_t used = 0;
    const unsigned long index = std::stoul(text, &used);
    if (used != text.size())
        throw std::runtime_error("\"" + text + "\" is not an index");
    return static_cast<unsigned>(index);
}

void requireAllRead(const Input& members) {
    for (const std::string& key : members.unread())
        throw std::runtime_error("nothing reads \"" + key + "\" of a geometry");
}

} // namespace

ScenarioScene::ScenarioScene(Input& input)
    : root_((input.folder() / readText(input["modelRoot"])).lexically_normal().string())
    , plugin_(OpenQuarn::loadPlugin(NW_PLUGIN_FILE))
    , rig_(nodeName) {
    rig_.setModelRoot(root_);
    const Json& geometries = input["geometry"];
    if (!geometries.IsObject())
        throw std::runtime_error("\"geometry\" is no object");
    for (const auto& geometry : geometries.GetObject())
        addGeometry(readIndex(geometry.name.GetString()), Input(geometry.value));
}

void ScenarioScene::addGeometry(unsigned index, Input geometry) {
    const Json& polygons = geometry["polygons"];
    warpRig::GeometrySpec spec;
    spec.rest = makeMesh(readPoints(geometry["rest"]), polygons);
    spec.mesh = makeMesh(readPoints(geometry["input"]), polygons);
    if (const Json& affected = geometry["affected"]; !affected.IsNull())
        spec.affected = readIndices(affected);
    spec.weights = spreadWeights(geometry["weights"], spec.affected, geometry["input"].Size());
    const Json* modelName = geometry.find("modelName");
    spec.hasModelElement = modelName && !modelName->IsNull();
    if (spec.hasModelElement)
        spec.modelName = readText(*modelName);
    rig_.addGeometry(index, spec);
    if (const Json* settings = geometry.find("export"); settings && !settings->IsNull()) {
        const std::string element = "export[" + std::to_string(index) + "].";
        setPlug(rig_.plug(element + "smoothingIterations"), (*settings)[0], root_);
        setPlug(rig_.plug(element + "deltaMode"), (*settings)[1], root_);
    }
    requireAllRead(geometry);
}

void ScenarioScene::set(const std::string& attribute, const Json& value) {
    if (!value.IsArray())
        return setPlug(rig_.plug(attribute), value, root_);
    if (attribute != "controlValues")
        throw std::runtime_error("\"" + attribute + "\" takes no list");
    std::vector<double> controls;
    for (const Json& number : value.GetArray())
        controls.push_back(readNumber(number));
    rig_.setControls(controls);
}

void ScenarioScene::setElement(const std::string& attribute, unsigned index, const Json& value) {
    if (attribute == "input")
        return rig_.setInput(index, meshOf(index, value));
    if (attribute == "targetGeometry")
        return rig_.setTarget(index, meshOf(index, value));
    if (attribute == "targetMorphGeometry")
        return rig_.setMorphTarget(index, meshOf(index, value));
    HStatus status;
    HPlug plug(rig_.node, HFnDependencyNode(rig_.node).attribute(attribute, &status));
    require(status);
    require(plug.selectAncestorLogicalIndex(index));
    setPlug(plug, value, root_);
}

// the geometry's own mesh, its component tag included, with other points; with another number of points only these
HObject ScenarioScene::meshOf(unsigned index, const Json& pointList) const {
    const HPointArray points = readPoints(pointList);
    const HObject mesh = rig_.plug("input[" + std::to_string(index) + "].inputGeometry").asHObject();
    if (!mesh.isNull() && warpRig::pointsOf(mesh).length() == points.length())
        return warpRig::withPoints(mesh, points);
    return makeMesh(points, Json(rapidjson::kArrayType));
}

HStatus ScenarioScene::deform(unsigned index) {
    observeOutputs(index);
    modelOutputs_.values.clear();
    return rig_.deform(index);
}

HStatus ScenarioScene::deformNextFrame(unsigned index) const {
    rig_.setInput(index, rig_.plug("input[" + std::to_string(index) + "].inputGeometry").asHObject());
    return OpenQuarn::evaluate(rig_.output(index));
}

double ScenarioScene::morphWeight() const {
    return rig_.plug("targetMorphEnabled").asBool() ? rig_.plug("targetMorphEnvelope").asDouble() : 0.0;
}

// The host makes the state in the first evaluation, which is to be observed as well: so it is made now, with the same
// call, and the host finds it.
void ScenarioScene::observeOutputs(unsigned index) {
    if (!rig_.state(index)) {
        auto* deformer = dynamic_cast<HPxDeformerNode*>(HFnDependencyNode(rig_.node).userNode());
        if (!deformer)
            throw std::runtime_error(std::string(nodeName) + " is no deformer");
        HDataBlock block = deformer->forceCache();
        require(deformer->initializeMultiIndex(block, index, false));
    }
    neuralWarp::neuralWarpData* state = rig_.state(index);
    if (!state)
        throw std::runtime_error("geometry " + std::to_string(index) + " has no state");
    state->observer = &modelOutputs_;
}

HStatus ScenarioScene::runCommand(const std::string& words, const Json* indices, HCommandResult& result) const {
    std::string line = "neuralWarp " + words;
    if (indices && !indices->IsNull())
        for (const std::uint32_t index : readIndices(*indices))
            line += " -multiIndex " + std::to_string(index);
    return HGlobal::executeCommand(HString(line + " " + nodeName), result);
}

void ScenarioScene::close() {
    session_.newScene();
    OpenQuarn::unloadPlugin(plugin_);
}

std::string ScenarioScene::withoutRoot(std::string text) const {
    return replaced(std::move(text), root_, rootMark);
}

} // namespace replay
