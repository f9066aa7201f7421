// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/description.h"

#include "quarn/console/json.h"
#include "quarn/dataset/controlRanges.h"
#include "quarn/dataset/exactNumbers.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/units.h"

#include "openquarn_app/Commands.h"

#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

std::string labelOf(const HPlug& plug) {
    const auto outcome = OpenQuarn::runCommand("getAttr -asString " + OpenQuarn::quotedWord(plug.name().asChar()));
    const auto* label = std::get_if<std::string>(&outcome.result);
    if (label == nullptr)
        throw std::runtime_error(outcome.error);
    return *label;
}

// the training settings of the geometry, one key each
class TrainWriter {
public:
    TrainWriter(JsonWriter& writer, const Warp& warp, const WarpGeometry& geometry)
        : writer_(writer)
        , warp_(warp)
        , geometry_(geometry) {}

    void text(const char* name) { writeText(writer_, name, textOf(plug(name))); }
    void label(const char* name) { writeText(writer_, name, labelOf(plug(name))); }
    void truth(const char* name) { writeBool(writer_, name, wholeNumberOf(plug(name)) != 0); }
    void whole(const char* name) {
        writer_.Key(name);
        writer_.Int(wholeNumberOf(plug(name)));
    }
    void number(const char* name) {
        writer_.Key(name);
        writeNumber(writer_, numberOf(plug(name)));
    }
    void single(const char* name) {
        writer_.Key(name);
        writeNumber(writer_, static_cast<float>(numberOf(plug(name))));
    }

private:
    HPlug plug(const char* name) const { return warp_.plug("train", geometry_, name); }
    JsonWriter& writer_;
    const Warp& warp_;
    const WarpGeometry& geometry_;
};

void writeTrain(JsonWriter& writer, const Warp& warp, const WarpGeometry& geometry) {
    TrainWriter train(writer, warp, geometry);
    writer.Key("train");
    writer.StartObject();
    train.text("outputModelName");
    train.whole("batchSize");
    train.whole("epochs");
    train.number("learningRate");
    train.single("validationRatio");
    train.whole("hiddenLayerCount");
    train.whole("neuronsPerLayer");
    train.label("activationFunction");
    train.single("dropoutRatio");
    train.truth("principalShapesEnabled");
    train.whole("principalShapesLimit");
    train.single("principalShapesAccuracy");
    train.truth("preloadData");
    writer.EndObject();
}

void writeSubset(JsonWriter& writer, const HIndexMapper& map) {
    const bool isComplete = map.isIdentityMap();
    const bool isEmpty = map.affectCount() == 0;
    writeText(writer, "subsetState", isEmpty ? "empty" : isComplete ? "complete" : "partial");
    writeCount(writer, "affectCount", map.affectCount());
    writeCount(writer, "fullCount", map.fullCount());
    if (isComplete || isEmpty)
        return;
    writer.Key("affectMap");
    writer.StartArray();
    for (const unsigned vertex : map.affectMap())
        writer.Uint(vertex);
    writer.EndArray();
}

void writeControls(JsonWriter& writer, const std::vector<std::string>& names, const std::vector<ControlRange>& ranges) {
    writer.Key("controlNames");
    writer.StartArray();
    for (const std::string& name : names)
        writeText(writer, name);
    writer.EndArray();
    writer.Key("controlRanges");
    writeRanges(writer, ranges);
}

// lengths in units of the scene
void writeFit(JsonWriter& writer, const TargetFit& fit) {
    writer.Key("targetFit");
    writer.StartObject();
    writer.Key("meanDistance");
    writeNumber(writer, fit.asItIs.mean);
    writer.Key("largestDistance");
    writeNumber(writer, fit.asItIs.largest);
    writer.Key("motion");
    writeNumber(writer, fit.motion.size);
    writer.Key("follows");
    if (fit.motion.following == Following::untold)
        writer.Null();
    else
        writer.Bool(fit.motion.following == Following::yes);
    writer.EndObject();
}

// a list of spans
void writeDrawnFrames(JsonWriter& writer, const FrameRange& drawn) {
    writer.Key("drawnFrames");
    writer.StartArray();
    writer.StartArray();
    writer.Int(drawn.first);
    writer.Int(drawn.last);
    writer.EndArray();
    writer.EndArray();
}

void writeFiles(JsonWriter& writer) {
    writer.Key("files");
    writer.StartObject();
    writeText(writer, "controls", datasetFile::controls);
    writeText(writer, "deltas", datasetFile::deltas);
    writeText(writer, "frames", datasetFile::frames);
    writeText(writer, "skin", datasetFile::skin);
    writer.EndObject();
}

} // namespace

std::string datasetDescription(const DatasetFacts& facts, const Warp& warp, const WarpGeometry& geometry,
                               const FrameSampler& sampler, const std::filesystem::path& controls) {
    const DatasetShape& shape = facts.shape;
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.SetFormatOptions(rapidjson::kFormatSingleLineArray);
    writer.StartObject();
    writeText(writer, "format", "neuralWarp training data");
    writeCount(writer, "version", 1);
    writeText(writer, "writtenBy", "quarn " QUARN_VERSION);
    writeText(writer, "scene", facts.scene);
    writeText(writer, "deformer", warp.name);
    writeText(writer, "geometry", geometry.name);
    writeCount(writer, "geometryIndex", geometry.index);
    writeCount(writer, "frameCount", shape.rows);
    writeCount(writer, "controlCount", shape.controls);
    writeCount(writer, "deltaCount", shape.deltas);
    writeText(writer, "deltaType", sampler.kind().code());
    writeCount(writer, "deltaMode", static_cast<std::size_t>(sampler.kind().mode));
    writeCount(writer, "smoothingIterations", static_cast<std::size_t>(sampler.kind().smoothingIterations));
    writeSubset(writer, sampler.map());
    writeText(writer, "meshSum", facts.restSum);
    writeText(writer, "componentTagExpression", textOf(warp.plug("input", geometry, "componentTagExpression")));
    writeControls(writer, sampler.names(), controlRanges(controls, shape));
    writer.Key("metersPerUnit");
    writeNumber(writer, metersPerUnit());
    writer.Key("boundingBoxDiagonal");
    writeNumber(writer, facts.diagonal);
    if (facts.fit && std::isfinite(facts.fit->asItIs.mean))
        writeFit(writer, *facts.fit);
    if (facts.drawn)
        writeDrawnFrames(writer, *facts.drawn);
    writeTrain(writer, warp, geometry);
    writeFiles(writer);
    writer.EndObject();
    return buffer.GetString() + std::string("\n");
}

} // namespace quarn
