// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/modelFiles.h"

#include "nw_model/PrincipalBasisFiles.h"

#include <algorithm>
#include <stdexcept>

namespace quarn {

namespace fs = std::filesystem;
using neuralWarp::ModelMetadata;
using neuralWarp::SubsetState;

namespace {

/// Who only wants to know whether the numbers can be read.
class NoSink final : public neuralWarp::PrincipalShapesSink {
public:
    void begin(std::uint64_t, std::uint64_t, std::span<const float>) override {}
    void append(std::span<const float>) override {}
    void append(std::span<const std::uint16_t>) override {}
};

} // namespace

void readMetadata(const fs::path& directory, ModelMetadata& metadata, std::vector<std::string>& problems) {
    const fs::path file = directory / "metadata.json";
    if (!fs::exists(file))
        problems.emplace_back("metadata.json is missing: the deformer ignores the model without a word");
    else if (!neuralWarp::readMetadataFile(metadata, file))
        problems.emplace_back("metadata.json is no JSON object that can be read");
    if (!metadata.loaded)
        return;
    if (metadata.subsetState == SubsetState::Unrecognized)
        problems.emplace_back("metadata.json has no subsetState that is known: the model drives no vertex");
    if (metadata.deltaMode > 1)
        problems.push_back("metadata.json has the deltaMode " + std::to_string(metadata.deltaMode) +
                           ": 0 (Offset) and 1 (Surface) are known");
    const auto& map = metadata.affectMap;
    const auto beyond = std::find_if(map.begin(), map.end(), [&](auto vertex) { return vertex >= metadata.fullCount; });
    if (beyond != map.end())
        problems.push_back("metadata.json drives vertex " + std::to_string(*beyond) + ", and its mesh has " +
                           std::to_string(metadata.fullCount) + " vertices");
}

ModelKnowledge readKnowledge(const fs::path& directory) {
    ModelKnowledge knowledge;
    try {
        knowledge.certificate = neuralWarp::readCertificate(directory / "metadata.json");
    } catch (const std::runtime_error& error) {
        knowledge.why = "its certificate is of no use: " + std::string(error.what());
        return knowledge;
    }
    if (!knowledge.certificate) {
        knowledge.why = "it has no certificate: which poses it was trained on is not known";
        return knowledge;
    }
    try {
        knowledge.poses = neuralWarp::TrainedPoses::read(directory, *knowledge.certificate);
        if (knowledge.poses.isEmpty())
            knowledge.why = "it names no trained poses: only the ranges of its controls are known";
    } catch (const std::runtime_error& error) {
        knowledge.why = "only the ranges of its controls are known: " + std::string(error.what());
    }
    return knowledge;
}

ShapeSizes readShapeSizes(const fs::path& directory, std::vector<std::string>& problems) {
    ShapeSizes sizes;
    sizes.hasFile = fs::exists(directory / "principal_shapes.json");
    if (!sizes.hasFile)
        return sizes;
    NoSink sink;
    neuralWarp::PrincipalShapesAnswer answer;
    if (!neuralWarp::readPrincipalBasis(directory, sink, answer))
        problems.emplace_back("principal_shapes.json is damaged: the deformer would take the network's outputs "
                              "for deltas");
    sizes.count = answer.shapeCount;
    sizes.vertices = answer.vertCount;
    sizes.source = answer.isFromArchive ? "principal_shapes.npz" : "principal_shapes.json";
    sizes.whyNotArchive = answer.whyNotArchive;
    return sizes;
}

} // namespace quarn
