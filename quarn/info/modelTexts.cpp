// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/json.h"
#include "quarn/info/LineList.h"
#include "quarn/info/ModelReport.h"
#include "quarn/info/certificateTexts.h"
#include "quarn/scene/poseTexts.h"

#include <array>

namespace quarn {
namespace {

using neuralWarp::SubsetState;

const char* subsetText(SubsetState state) {
    constexpr std::array texts = {"unrecognized", "empty", "complete", "partial"};
    return texts.at(static_cast<std::size_t>(state));
}

std::string deltaModeText(std::uint32_t mode) {
    return mode == 0 ? "Offset" : mode == 1 ? "Surface" : std::to_string(mode);
}

void writeMetadata(JsonWriter& json, const neuralWarp::ModelMetadata& metadata) {
    json.Key("metadata");
    if (!metadata.loaded)
        return static_cast<void>(json.Null());
    json.StartObject();
    writeText(json, "geometry", metadata.geometry);
    writeText(json, "deltaMode", deltaModeText(metadata.deltaMode));
    writeCount(json, "deltaCount", metadata.deltaCount);
    writeCount(json, "smoothingIterations", metadata.smoothingIterations);
    writeCount(json, "fullCount", metadata.fullCount);
    writeCount(json, "affectCount", metadata.affectCount);
    writeText(json, "subsetState", subsetText(metadata.subsetState));
    writeText(json, "componentTagExpression", metadata.componentTagExpression);
    writeCount(json, "trainedVertices", trainedVertices(metadata));
    json.EndObject();
}

constexpr std::uint32_t manySmoothingPasses = 1000;

std::string lines(const char* kind, const std::vector<std::string>& texts) {
    LineList all("of the kind");
    for (const std::string& text : texts)
        all.add(std::string(kind) + ": " + text);
    return all.text();
}

std::string metadataLines(const neuralWarp::ModelMetadata& metadata) {
    LineList lines("lines");
    lines.add("trained on " + std::to_string(trainedVertices(metadata)) + " of " + std::to_string(metadata.fullCount) +
              " vertices (" + subsetText(metadata.subsetState) + ")" +
              (metadata.geometry.empty() ? "" : " of " + metadata.geometry));
    lines.add("deltas " + deltaModeText(metadata.deltaMode) + ", smoothing iterations " +
              std::to_string(metadata.smoothingIterations));
    if (metadata.smoothingIterations >= manySmoothingPasses)
        lines.add("warning: so many smoothing passes make every frame slow: 10 are usual");
    return lines.text();
}

} // namespace

std::string modelText(const ModelReport& model, const std::optional<Fit>& fit) {
    std::string text = "model directory, " + std::to_string(model.bytes) + " bytes\n";
    if (model.metadata.loaded)
        text += metadataLines(model.metadata);
    if (model.outputs != 0)
        text +=
            "network: " + std::to_string(model.inputs) + " controls to " + std::to_string(model.outputs) + " outputs\n";
    if (model.shapeCount != 0)
        text += std::to_string(model.shapeCount) + " principal shapes of " + std::to_string(model.shapeVertices) +
                " vertices, read from " + model.shapeSource + "\n";
    text += certificateText(model.knowledge);
    text += lines("damaged", model.problems) + lines("note", model.notes);
    if (fit)
        text += posesText(fit->poses) + lines("does not fit", fit->errors) + lines("warning", fit->warnings) +
                (fit->errors.empty() && model.problems.empty() ? "fits\n" : "");
    return text;
}

std::string modelJson(const ModelReport& model, const std::optional<Fit>& fit) {
    rapidjson::StringBuffer buffer;
    JsonWriter json(buffer);
    json.StartObject();
    writeText(json, "model", model.directory.string());
    writeCount(json, "bytes", model.bytes);
    writeMetadata(json, model.metadata);
    writeCount(json, "inputs", model.inputs);
    writeCount(json, "outputs", model.outputs);
    writeCount(json, "principalShapes", model.shapeCount);
    writeCount(json, "principalShapeVertices", model.shapeVertices);
    writeText(json, "principalShapesFile", model.shapeSource);
    writeCertificate(json, model.knowledge);
    writeTexts(json, "problems", model.problems);
    writeTexts(json, "notes", model.notes);
    if (fit) {
        writeBool(json, "fits", fit->errors.empty() && model.problems.empty());
        writeTexts(json, "misfits", fit->errors);
        writeTexts(json, "warnings", fit->warnings);
        writePoses(json, fit->poses);
    }
    json.EndObject();
    return std::string(buffer.GetString()) + "\n";
}

} // namespace quarn
