// SPDX-License-Identifier: Apache-2.0
#include "nw_deform/Deformer.h"

#include "frame/FrameSampler.h"
#include "frame/blend.h"
#include "nw_deform/SessionNetwork.h"
#include "quill/parallelFor.h"

#include <algorithm>
#include <cmath>
#include <string>
#include <utility>

namespace neuralWarp {
namespace {

/// Claims a deformer for a call, or throws.
class Use {
public:
    explicit Use(std::atomic<bool>& isInUse)
        : isInUse_(isInUse) {
        if (isInUse_.exchange(true, std::memory_order_acquire))
            throw DeformerInUse();
    }
    ~Use() { isInUse_.store(false, std::memory_order_release); }
    Use(const Use&) = delete;
    Use& operator=(const Use&) = delete;

private:
    std::atomic<bool>& isInUse_;
};

/// `coordinates` [size], of `perVertex` each; throws with the first vertex that has one that is not finite.
void checkFinite(const char* argument, const float* coordinates, std::size_t size, std::size_t perVertex) {
    const float* const end = coordinates + size;
    const float* const bad = std::find_if_not(coordinates, end, [](float x) { return std::isfinite(x); });
    if (bad != end)
        throw std::invalid_argument(std::string(argument) + ": vertex " +
                                    std::to_string(static_cast<std::size_t>(bad - coordinates) / perVertex) +
                                    " has the value " + std::to_string(*bad));
}

std::shared_ptr<const Model> fitting(std::shared_ptr<const Model> model, const Points& rest) {
    if (model->metadata().fullCount != rest.size())
        throw std::invalid_argument("rest has " + std::to_string(rest.size()) +
                                    " vertices, and the model was trained on a mesh of " +
                                    std::to_string(model->metadata().fullCount));
    if (!rest.empty())
        checkFinite("rest", &rest.front().x, 3 * rest.size(), 3);
    return model;
}

void copyPoints(Points& to, const float* from, std::size_t count) {
    to.resize(count);
    quill::parallelFor(
        count,
        [&](std::size_t i) {
            to[i] = {from[3 * i], from[3 * i + 1], from[3 * i + 2]};
        },
        quill::copyGrain);
}

void checkFrame(const FrameCheck& check, const ModelSession& session) {
    if (check.fault == FrameFault::none)
        return;
    if (check.fault == FrameFault::noOutputs)
        throw std::runtime_error("the network gave no values: " + session.errorText());
    throw std::runtime_error("the model gives " + std::to_string(check.has) + " values where " +
                             std::to_string(check.needed) + " are needed");
}

} // namespace

Deformer::Deformer(std::shared_ptr<const Model> model, const quill::MeshTopology& topology, const Points& rest,
                   const quill::WorkWatch& watch)
    : model_(fitting(std::move(model), rest))
    , session_(model_->takeSession())
    , rest_(topology, rest, model_->settings(), watch)
    , slots_(mapSlots(quill::IndexMapper(model_->vertices()), rest_.map)) {}

Deformer::~Deformer() {
    model_->giveBack(std::move(session_));
}

FrameModel Deformer::frameModel() const {
    return {.settings = model_->settings(),
            .vertexCount = vertexCount(),
            .driven = slots_.isIdentity ? DrivenVertices(vertexCount()) : DrivenVertices(slots_.vertices, slots_.slots),
            .slotCount = slots_.slotCount,
            .shapes = model_->shapes(),
            .rest = rest_.surface()};
}

void Deformer::check(const Pose& pose) const {
    if (pose.controls.size() != model_->controlCount())
        throw std::invalid_argument("controls has " + std::to_string(pose.controls.size()) +
                                    " values, and the model takes " + std::to_string(model_->controlCount()));
    for (std::size_t i = 0; i < pose.controls.size(); ++i)
        if (!std::isfinite(pose.controls[i]))
            throw std::invalid_argument("controls: " + model_->controlCalled(i) + " is " +
                                        std::to_string(pose.controls[i]));
    if (!std::isfinite(pose.envelope))
        throw std::invalid_argument("envelope is " + std::to_string(pose.envelope));
    if (pose.weights)
        checkFinite("weights", pose.weights, vertexCount(), 1);
    checkFinite("points", pose.points, 3 * vertexCount(), 3);
}

void Deformer::place(const Pose& pose, const IsCancelled& isCancelled) {
    SessionNetwork network(*session_);
    FrameObserver& observer = FrameObserver::none();
    Prediction prediction(network, pose.controls, observer, Prediction::bestFor(vertexCount()));
    prediction.meanwhile([&] { copyPoints(workspace_.points, pose.points, vertexCount()); });
    const FrameSampler sampler(frameModel(), observer);
    checkFrame(sampler.place(workspace_, workspace_.result, workspace_.points, prediction, isCancelled), *session_);
}

void Deformer::evaluate(const Pose& pose, float* out, const IsCancelled& isCancelled) {
    const Use use(isInUse_);
    check(pose);
    const bool isDriven = slots_.isIdentity || !slots_.vertices.empty();
    if (pose.envelope == 0.0F || !isDriven) { // as the plug-in leaves a mesh alone
        std::copy_n(pose.points, 3 * vertexCount(), out);
        return;
    }
    const LentArrays arrays(workspace_);
    place(pose, isCancelled);
    const FrameModel model = frameModel();
    blendPositions(MovedPointsOf<float>{pose.points, out, vertexCount()}, pose.weights,
                   {.driven = model.driven, .model = &workspace_.result, .envelope = pose.envelope});
}

} // namespace neuralWarp
