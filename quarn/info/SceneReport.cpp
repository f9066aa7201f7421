// SPDX-License-Identifier: Apache-2.0
#include "quarn/info/SceneReport.h"

#include "openquarn/HDataBlock.h"
#include "openquarn/HFnGeometryData.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/SceneFile.h"
#include "quarn/info/LineList.h"
#include "quarn/info/attributeTexts.h"
#include "quarn/scene/Warp.h"
#include "quarn/scene/modelDirectory.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/replacedSkins.h"
#include "quarn/scene/units.h"

#include <algorithm>
#include <numeric>
#include <stdexcept>

namespace quarn {
namespace {

// the vertices of a tag; all for "*" and none
std::vector<std::uint32_t> affectedOf(const HFnGeometryData& data, const std::string& tag) {
    HUintArray listed;
    if (!tag.empty() && tag != "*") {
        if (data.getComponentTag(tag.c_str(), listed).error())
            throw std::runtime_error("the geometry has no component tag " + tag);
        std::vector<std::uint32_t> affected;
        affected.reserve(listed.length());
        for (const auto vertex : listed)
            affected.push_back(vertex);
        return affected;
    }
    std::vector<std::uint32_t> all(data.vertexCount());
    std::iota(all.begin(), all.end(), 0U);
    return all;
}

DeformedGeometry describe(const Warp& warp, const WarpGeometry& geometry) {
    DeformedGeometry report;
    report.facts = factsOf(warp, geometry);
    report.index = geometry.index;
    if (!skinReplacedBy(geometry.input).isNull())
        report.skinCache = textOf(plugOf(geometry.input.node(), "cacheFile"));
    report.modelName = textOf(warp.plug("models", geometry, "modelName"));
    report.modelDirectory = modelDirectory(warp, geometry).string();
    report.isModelActive = isModelActive(warp, geometry);
    std::error_code error;
    report.isModelThere = std::filesystem::is_directory(report.modelDirectory, error);
    return report;
}

DeformerReport describe(const Warp& warp) {
    DeformerReport report;
    report.name = warp.name;
    report.firstFrame = wholeNumberOf(warp.plug("exportStartFrame"));
    report.lastFrame = wholeNumberOf(warp.plug("exportEndFrame"));
    for (const WarpGeometry& geometry : warp.geometries)
        report.geometries.push_back(describe(warp, geometry));
    return report;
}

// nothing is missed of a deformer whose models are all off: before anything was trained there is no folder for them
bool isMissed(const OpenQuarn::ExternalContent& file, const std::vector<DeformerReport>& deformers) {
    if (file.role == OpenQuarn::filePatternRole)
        return false;
    return std::none_of(deformers.begin(), deformers.end(), [&](const DeformerReport& deformer) {
        return deformer.name == file.node && std::none_of(deformer.geometries.begin(), deformer.geometries.end(),
                                                          [](const auto& geometry) { return geometry.isModelActive; });
    });
}

std::vector<std::string> missingFiles(const std::vector<DeformerReport>& deformers) {
    std::vector<std::string> missing;
    for (const OpenQuarn::ExternalContent& file : OpenQuarn::externalContent()) {
        const std::string& path = file.resolved.empty() ? file.unresolved : file.resolved;
        std::error_code error;
        if (!path.empty() && isMissed(file, deformers) && !std::filesystem::exists(path, error))
            missing.push_back(file.node + ": " + path);
    }
    return missing;
}

std::string geometryLine(const DeformedGeometry& geometry) {
    const GeometryFacts& facts = geometry.facts;
    std::string line = "  geometry " + std::to_string(geometry.index) + " (" + facts.name +
                       "): " + std::to_string(facts.vertices) + " vertices, " + std::to_string(facts.affected.size()) +
                       " affected, " + std::to_string(facts.controls) + " controls, ";
    if (!geometry.skinCache.empty())
        line += "skin " + geometry.skinCache + ", ";
    if (geometry.modelName.empty())
        return line + "no model";
    return line + "model " + geometry.modelName + (geometry.isModelActive ? " On" : " Off") +
           (geometry.isModelThere ? "" : ", not there: training makes " + geometry.modelDirectory);
}

void writeInteger(JsonWriter& json, const char* key, std::int64_t value) {
    json.Key(key);
    json.Int64(value);
}

void writeGeometry(JsonWriter& json, const DeformedGeometry& geometry) {
    json.StartObject();
    writeInteger(json, "index", geometry.index);
    writeText(json, "name", geometry.facts.name);
    writeInteger(json, "vertices", static_cast<std::int64_t>(geometry.facts.vertices));
    writeInteger(json, "affected", static_cast<std::int64_t>(geometry.facts.affected.size()));
    writeInteger(json, "controls", static_cast<std::int64_t>(geometry.facts.controls));
    writeText(json, "skinCache", geometry.skinCache);
    writeText(json, "modelName", geometry.modelName);
    writeText(json, "modelDirectory", geometry.modelDirectory);
    writeBool(json, "modelActive", geometry.isModelActive);
    writeBool(json, "modelThere", geometry.isModelThere);
    json.EndObject();
}

} // namespace

GeometryFacts factsOf(const Warp& warp, const WarpGeometry& geometry) {
    HStatus status;
    const HObject mesh = geometry.input.asHObject(&status);
    const HFnGeometryData data(mesh, &status);
    if (status.error())
        throw std::runtime_error(std::string(geometry.input.name().asChar()) + " holds no mesh: connect one into " +
                                 warp.name + ".input[" + std::to_string(geometry.index) + "].inputGeometry");
    GeometryFacts facts;
    facts.name = geometry.name;
    facts.vertices = data.vertexCount();
    facts.affected = affectedOf(data, textOf(warp.plug("input", geometry, "componentTagExpression")));
    // what is connected tells only when it is evaluated how many elements there are
    const HPlug controls = warp.plug("controlValues");
    if (OpenQuarn::evaluate(controls).error())
        throw std::runtime_error(std::string(controls.name().asChar()) + " could not be evaluated");
    facts.controls = indicesOf(controls).size();
    return facts;
}

SceneReport describeScene() {
    SceneReport report;
    if (const std::vector<HObject> characters = nodesOfType("character"); !characters.empty()) {
        report.character = nodeName(characters.front());
        report.fileOrder = textOf(plugOf(characters.front(), "fileOrder"));
    }
    report.metersPerUnit = metersPerUnit();
    for (const HObject& node : nodesOfType("neuralWarp"))
        report.deformers.push_back(describe(Warp::find(nodeName(node))));
    report.missingFiles = missingFiles(report.deformers);
    return report;
}

void writeScene(JsonWriter& json, const SceneReport& scene) {
    writeText(json, "character", scene.character);
    writeText(json, "fileOrder", scene.fileOrder);
    json.Key("metersPerUnit");
    json.Double(scene.metersPerUnit);
    json.Key("deformers");
    json.StartArray();
    for (const DeformerReport& deformer : scene.deformers) {
        json.StartObject();
        writeText(json, "name", deformer.name);
        writeInteger(json, "firstFrame", deformer.firstFrame);
        writeInteger(json, "lastFrame", deformer.lastFrame);
        json.Key("geometries");
        json.StartArray();
        for (const DeformedGeometry& geometry : deformer.geometries)
            writeGeometry(json, geometry);
        json.EndArray();
        json.EndObject();
    }
    json.EndArray();
    json.Key("missingFiles");
    json.StartArray();
    for (const std::string& file : scene.missingFiles)
        writeText(json, file);
    json.EndArray();
}

std::string sceneText(const SceneReport& scene) {
    std::string text;
    if (!scene.character.empty())
        text += "character " + scene.character + ", " + numberText(scene.metersPerUnit, false) + " metres a unit\n";
    LineList orders("file orders");
    if (!scene.fileOrder.empty())
        orders.add("order of its file: " + scene.fileOrder);
    text += orders.text();
    LineList deformers("deformers and geometries");
    for (const DeformerReport& deformer : scene.deformers) {
        deformers.add("deformer " + deformer.name + ", frames " + std::to_string(deformer.firstFrame) + " to " +
                      std::to_string(deformer.lastFrame));
        for (const DeformedGeometry& geometry : deformer.geometries)
            deformers.add(geometryLine(geometry));
    }
    LineList missing("missing files");
    for (const std::string& file : scene.missingFiles)
        missing.add("missing file of " + file);
    return text + deformers.text() + missing.text();
}

} // namespace quarn
