// SPDX-License-Identifier: Apache-2.0
#include "quarn/view/PageModel.h"

#include "nw_model/OnnxGraph.h"
#include "storage/Json.h"

#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;

// what a trainer has left of itself; of no importance where it has not
void readOrigin(const neuralWarp::Model& model, PageModel& page) {
    const storage::JsonDocument document = storage::parseJson(model.metadataText(), storage::jsonRules::modelMetadata);
    if (const auto trainer = document.FindMember("trainer");
        trainer != document.MemberEnd() && trainer->value.IsString())
        page.trainer = storage::viewOf(trainer->value);
    if (const auto seed = document.FindMember("seed"); seed != document.MemberEnd() && seed->value.IsUint64())
        page.seed = seed->value.GetUint64();
}

NetworkProgram programOf(const fs::path& network) {
    const neuralWarp::OnnxGraph graph = neuralWarp::readOnnxGraph(network);
    try {
        return networkProgram(graph);
    } catch (const std::runtime_error& error) {
        throw std::runtime_error(network.string() + ": " + error.what());
    }
}

void takeBasis(const neuralWarp::ShapeBasis& shapes, PageModel& page, BasisKind kind) {
    page.shapes = static_cast<std::size_t>(shapes.shapeCount);
    page.values = shapes.values.slotMajor();
    page.values.resize(page.slots * page.shapes * 3); // no slot beyond those that drive a vertex
    page.basis = packBasis(page.values, page.shapes, kind);
}

} // namespace

PageModel readPageModel(const fs::path& directory, std::size_t vertexCount, BasisKind kind) {
    PageModel page;
    page.model = neuralWarp::Model::load(directory);
    const neuralWarp::Model& model = *page.model;
    if (model.metadata().fullCount != vertexCount)
        throw std::runtime_error("the model " + directory.string() + " was trained on a mesh of " +
                                 std::to_string(model.metadata().fullCount) + " vertices, and this one has " +
                                 std::to_string(vertexCount));
    const fs::path network = model.directory() / "model.onnx";
    page.name = model.directory().stem().string();
    page.networkBytes = fs::file_size(network);
    page.network = programOf(network);
    page.slots = model.vertices().affectCount();
    if (!model.vertices().isIdentity())
        page.vertices = model.vertices().affectedToFull();
    if (model.shapes().isUsed())
        takeBasis(model.shapes(), page, kind);
    readOrigin(model, page);
    return page;
}

double basisErrorOf(const PageModel& page, std::span<const float> controls) {
    if (page.shapes == 0 || page.basis.kind == BasisKind::f32)
        return 0.0;
    const std::size_t each = page.model->controlCount();
    std::unique_ptr<neuralWarp::ModelSession> session = page.model->takeSession();
    std::vector<float> coefficients;
    for (std::size_t first = 0; first + each <= controls.size(); first += each) {
        const std::vector<float> outputs = session->run(controls.subspan(first, each));
        if (outputs.size() < page.shapes)
            throw std::runtime_error("the network of " + page.name + " gave no values: " + session->errorText());
        coefficients.insert(coefficients.end(), outputs.begin(),
                            outputs.begin() + static_cast<std::ptrdiff_t>(page.shapes));
    }
    page.model->giveBack(std::move(session));
    return packingError(page.values, page.basis.floats, page.shapes, coefficients);
}

} // namespace quarn
