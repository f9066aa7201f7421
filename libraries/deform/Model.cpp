// SPDX-License-Identifier: Apache-2.0
#include "nw_deform/Model.h"

#include "modelFiles.h"

#include <utility>

namespace neuralWarp {

namespace fs = std::filesystem;

quill::IndexMapper trainedVertices(const ModelMetadata& metadata) {
    quill::IndexMapper map;
    if (metadata.subsetState == SubsetState::Complete)
        map.setIdentity(metadata.fullCount);
    else if (metadata.subsetState == SubsetState::Partial)
        map.set(metadata.affectMap, metadata.fullCount);
    else
        map.set({}, metadata.fullCount);
    return map;
}

std::shared_ptr<const Model> Model::load(const fs::path& directory) {
    const fs::path folder = fs::absolute(directory);
    checkDirectory(folder);
    constexpr int attempts = 8; // who writes for longer than they take is not done yet
    for (int i = 0; i < attempts; ++i) {
        const DirectoryState state = DirectoryState::atRest(folder);
        try {
            std::shared_ptr<const Model> model(new Model(folder, state));
            if (state.isStillThatOf(folder))
                return model;
        } catch (const std::bad_alloc&) {
            throw;
        } catch (const std::exception&) {
            if (state.isStillThatOf(folder))
                throw;
        }
    }
    throw std::invalid_argument("'" + folder.string() + "' was written again and again while it was read");
}

Model::Model(fs::path directory, const DirectoryState& state)
    : directory_(std::move(directory))
    , state_(state)
    , metadataText_(readMetadataText(directory_ / "metadata.json"))
    , metadata_(readGoodMetadata(directory_ / "metadata.json"))
    , vertices_(trainedVertices(metadata_)) {
    sessions_.push_back(openSession(directory_ / "model.onnx"));
    ModelSession& session = *sessions_.front();
    controlCount_ = static_cast<std::size_t>(session.inputCount());
    const PrincipalShapesAnswer answer = readBasis(directory_, basis_);
    shapeCount_ = answer.shapeCount;
    slotCount_ = answer.vertCount;
    checkOutputs(session);
    readCertificate();
}

void Model::checkOutputs(ModelSession& session) const {
    const std::string network = "'" + (directory_ / "model.onnx").string() + "' ";
    const std::size_t count = session.run(std::vector<float>(controlCount_)).size();
    if (count == 0)
        throw std::invalid_argument(network + "gives no values: " + session.errorText());
    if (shapes().isUsed() && count < shapeCount_)
        throw std::invalid_argument(network + "gives " + std::to_string(count) + " coefficients for " +
                                    std::to_string(shapeCount_) + " principal shapes");
    const std::size_t slots = shapes().isUsed() ? shapes().coveredSlots() : count / 3;
    if (slots < vertices_.affectCount())
        throw std::invalid_argument("'" + directory_.string() + "' has deltas for " + std::to_string(slots) +
                                    " vertices, and its metadata.json drives " +
                                    std::to_string(vertices_.affectCount()));
}

void Model::readCertificate() {
    try {
        certificate_ = neuralWarp::readCertificate(directory_ / "metadata.json");
        if (certificate_ && certificate_->ranges.count() != controlCount_)
            throw std::runtime_error("it is of " + std::to_string(certificate_->ranges.count()) +
                                     " controls, and the network takes " + std::to_string(controlCount_));
    } catch (const std::runtime_error& error) {
        certificate_.reset();
        certificateProblem_ = "its certificate is of no use: " + std::string(error.what());
        return;
    }
    if (!certificate_) {
        certificateProblem_ = "it has no certificate: which poses it was trained on is not known";
        return;
    }
    try {
        trainedPoses_ = TrainedPoses::read(directory_, *certificate_);
        if (trainedPoses_.isEmpty())
            certificateProblem_ = "it names no trained poses: only the ranges of its controls are known";
    } catch (const std::runtime_error& error) {
        certificateProblem_ = "only the ranges of its controls are known: " + std::string(error.what());
    }
}

DeltaSettings Model::settings() const {
    return {.smoothingIterations = metadata_.smoothingIterations, .deltaMode = metadata_.deltaMode};
}

std::string Model::controlCalled(std::size_t control) const {
    const std::string number = "control " + std::to_string(control);
    return certificate_ ? number + " ('" + certificate_->controlNames[control] + "')" : number;
}

double Model::distance(std::span<const float> controls) const {
    if (!certificate_)
        throw std::invalid_argument("'" + directory_.string() + "' does not know its ranges: " + certificateProblem_);
    return certificate_->ranges.distance(controls);
}

std::optional<double> Model::expectedError(std::span<const float> controls) const {
    if (trainedPoses_.isEmpty() || certificate_->expected.isEmpty())
        return {};
    return certificate_->expected.at(trainedPoses_.distance(controls), certificate_->ranges.distance(controls));
}

std::unique_ptr<ModelSession> Model::takeSession() const {
    {
        const std::scoped_lock lock(mutex_);
        if (!sessions_.empty()) {
            std::unique_ptr<ModelSession> session = std::move(sessions_.back());
            sessions_.pop_back();
            return session;
        }
    }
    std::unique_ptr<ModelSession> session = openSession(directory_ / "model.onnx");
    if (!state_.isStillThatOf(directory_))
        throw std::invalid_argument("'" + directory_.string() +
                                    "' is another model now than the one that was loaded: load it again");
    return session;
}

void Model::giveBack(std::unique_ptr<ModelSession> session) const noexcept {
    try {
        const std::scoped_lock lock(mutex_);
        sessions_.push_back(std::move(session));
    } catch (...) { // the next user opens one
    }
}

} // namespace neuralWarp
