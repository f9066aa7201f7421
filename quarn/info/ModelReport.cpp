// SPDX-License-Identifier: Apache-2.0
#include "quarn/info/ModelReport.h"

#include "nw_model/DirectoryState.h"
#include "quarn/scene/modelFiles.h"

#include <algorithm>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using neuralWarp::ModelMetadata;
using neuralWarp::SubsetState;

std::uint64_t sizeOf(const fs::path& file) {
    std::error_code error;
    const std::uint64_t size = fs::file_size(file, error);
    return error ? 0 : size;
}

void readNetwork(ModelReport& model, neuralWarp::ModelSession& session) {
    const fs::path file = model.directory / "model.onnx";
    if (session.load(file, true) == neuralWarp::LoadResult::NotFound) {
        model.problems.emplace_back("model.onnx is missing");
        return;
    }
    if (!session.isLoaded()) {
        model.problems.push_back("model.onnx cannot be used: " + session.errorText());
        return;
    }
    model.inputs = static_cast<std::size_t>(session.inputCount());
    model.outputs = session.run(std::vector<float>(model.inputs)).size();
    if (model.outputs == 0)
        model.problems.push_back("model.onnx gives no values for controls of 0: " + session.errorText());
}

void readShapes(ModelReport& model) {
    const ShapeSizes sizes = readShapeSizes(model.directory, model.problems);
    model.hasShapes = sizes.hasFile;
    model.shapeCount = sizes.count;
    model.shapeVertices = sizes.vertices;
    model.shapeSource = sizes.source;
    if (!sizes.whyNotArchive.empty())
        model.notes.push_back("principal_shapes.npz is not used, and principal_shapes.json is read instead, which "
                              "takes longer: " +
                              sizes.whyNotArchive);
}

std::string numbers(const char* what, std::size_t has, const char* needs, std::size_t needed) {
    return std::string(what) + " " + std::to_string(has) + ", and " + needs + " " + std::to_string(needed);
}

// the network, and the shapes, have to reach the last slot
void checkReach(std::vector<std::string>& problems, const ModelReport& model, std::size_t slots) {
    const bool usesShapes = model.shapeCount != 0 && model.shapeVertices != 0;
    if (!usesShapes && model.outputs / 3 < slots)
        problems.push_back(
            numbers("the network gives values:", model.outputs, "three for each driven vertex are:", 3 * slots));
    if (usesShapes && model.outputs < model.shapeCount)
        problems.push_back(
            numbers("the network gives coefficients:", model.outputs, "there are principal shapes:", model.shapeCount));
    if (usesShapes && model.shapeVertices < slots)
        problems.push_back(
            numbers("the principal shapes cover vertices:", model.shapeVertices, "the model drives:", slots));
}

// the vertices that the model drives, by slot
std::vector<std::uint32_t> drivenBy(const ModelMetadata& metadata) {
    std::vector<std::uint32_t> driven;
    if (metadata.subsetState == SubsetState::Partial)
        return metadata.affectMap;
    if (metadata.subsetState == SubsetState::Complete)
        for (std::uint32_t vertex = 0; vertex < metadata.fullCount; ++vertex)
            driven.push_back(vertex);
    return driven;
}

void compareSubsets(Fit& fit, const ModelMetadata& metadata, const GeometryFacts& geometry) {
    if (metadata.affectCount != geometry.affected.size())
        fit.warnings.push_back(numbers("the deformer affects vertices:", geometry.affected.size(),
                                       "it did in training:", metadata.affectCount));
    std::vector<std::uint32_t> driven = drivenBy(metadata);
    if (driven == geometry.affected)
        return;
    std::vector<std::uint32_t> affected = geometry.affected;
    std::sort(driven.begin(), driven.end());
    std::sort(affected.begin(), affected.end());
    std::vector<std::uint32_t> both;
    std::set_intersection(driven.begin(), driven.end(), affected.begin(), affected.end(), std::back_inserter(both));
    if (both.empty())
        fit.errors.emplace_back("the model drives none of the vertices that the deformer affects");
    else if (both.size() != affected.size())
        fit.warnings.push_back(numbers("the model drives, of the affected vertices,", both.size(),
                                       "the deformer affects", affected.size()));
}

} // namespace

std::size_t trainedVertices(const ModelMetadata& metadata) {
    return metadata.subsetState == SubsetState::Partial    ? metadata.affectMap.size()
           : metadata.subsetState == SubsetState::Complete ? metadata.fullCount
                                                           : 0;
}

ModelReport readModel(const fs::path& directory, neuralWarp::ModelSession& session) {
    if (!fs::is_directory(directory))
        throw std::runtime_error(directory.string() + " is no model directory");
    ModelReport model;
    model.directory = directory;
    const auto state = neuralWarp::DirectoryState::atRest(directory);
    for (const char* file :
         {"metadata.json", "model.onnx", "principal_shapes.json", "principal_shapes.npz", "trained_poses.npy"})
        model.bytes += sizeOf(directory / file);
    readMetadata(directory, model.metadata, model.problems);
    readNetwork(model, session);
    readShapes(model);
    model.knowledge = readKnowledge(directory);
    if (!state.isStillThatOf(directory))
        throw std::runtime_error(directory.string() + " was replaced or written into while it was read");
    if (model.metadata.loaded && model.outputs != 0)
        checkReach(model.problems, model, trainedVertices(model.metadata));
    return model;
}

Fit fitOf(const ModelReport& model, const GeometryFacts& geometry) {
    Fit fit;
    if (model.metadata.fullCount != geometry.vertices)
        fit.errors.push_back(numbers((geometry.name + " has vertices:").c_str(), geometry.vertices,
                                     "the model was trained on:", model.metadata.fullCount));
    else
        compareSubsets(fit, model.metadata, geometry);
    const std::string trained = model.knowledge.certificate ? model.knowledge.certificate->mesh : "";
    if (!trained.empty() && !geometry.restSum.empty() && trained != geometry.restSum)
        fit.warnings.push_back("the rest mesh of " + geometry.name + " is another than the one it was trained on (" +
                               geometry.restSum + ", not " + trained + ")");
    if (model.inputs > geometry.controls)
        fit.errors.push_back(
            numbers("controlValues has elements:", geometry.controls, "the network takes:", model.inputs));
    else if (model.inputs != 0 && model.inputs < geometry.controls)
        fit.warnings.push_back(
            numbers("controlValues has elements:", geometry.controls, "the network takes the first:", model.inputs));
    return fit;
}

} // namespace quarn
