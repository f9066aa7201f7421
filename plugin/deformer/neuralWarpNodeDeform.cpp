// SPDX-License-Identifier: Apache-2.0
// The evaluation of one geometry.
#include "deformer/ProfiledFrame.h"
#include "deformer/framePlan.h"
#include "deformer/neuralWarpNode.h"
#include "deformer/neuralWarpUtils.h"
#include "frame/FrameSampler.h"
#include "frame/blend.h"
#include "messages/displayErrorGated.h"
#include "messages/guard.h"
#include "messages/messageText.h"
#include "messages/sourceUnits.h"
#include "nw_deform/SessionNetwork.h"
#include "openquarn/HIndexMapper.h"
#include "openquarn/HItGeometry.h"
#include "openquarn/HLongWork.h"

#include <string>

namespace neuralWarp {
namespace {

HStatus noDeltas(const std::string& reason) {
    raiseMessage<Text::kErrorMLModelNoDeltas>(displayErrorGated);
    return {HStatus::kFailure, reason};
}

HStatus tooFewDeltas(const FrameCheck& check) {
    raiseMessage<Text::kMlNodeVertexCountMismatch>(displayErrorGated, check.has, check.needed);
    return {HStatus::kFailure, "the model gives " + std::to_string(check.has) + " deltas where " +
                                   std::to_string(check.needed) + " are needed"};
}

HStatus misfit(const char* what, std::size_t has, std::size_t needed) {
    return {HStatus::kFailure, std::string(what) + " has " + std::to_string(has) + " points where " +
                                   std::to_string(needed) + " vertices are deformed"};
}

/// A failure, which the user is told of when it is the model's, for a frame without positions.
HStatus statusOf(const FrameCheck& check, const ModelSession& session) {
    switch (check.fault) {
    case FrameFault::none:
        break;
    case FrameFault::noOutputs:
        return noDeltas("the model gave no values: " + session.errorText());
    case FrameFault::tooFewCoefficients:
        return noDeltas("the model gives " + std::to_string(check.has) + " coefficients for " +
                        std::to_string(check.needed) + " principal shapes");
    case FrameFault::tooFewDeltas:
        return tooFewDeltas(check);
    case FrameFault::otherPointCount:
        return misfit("the input geometry", check.has, check.needed);
    case FrameFault::tooFewRestPoints:
        return misfit("the rest geometry", check.has, check.needed);
    }
    return HStatus::kSuccess;
}

} // namespace

struct neuralWarpNode::TargetMorph {
    bool isOn = false;
    double weight = 0.0;
    Points points;
};

HStatus neuralWarpNode::deform(HDataBlock& block, HItGeometry& iterator, const HMatrix&, unsigned multiIndex) {
    return guarded(*this, "deform", [&] { return evaluate(block, iterator, multiIndex); });
}

HStatus neuralWarpNode::evaluate(HDataBlock& block, HItGeometry& iterator, std::uint32_t multiIndex) {
    HStatus status;
    const HDataHandle model = existingElement(block, models, multiIndex, status);
    if (status.error())
        return status;
    const bool isActive = model.child(modelActive).asShort() == 1;
    const float envelopeValue = block.inputValue(envelope, &status).asFloat();
    if (status.error())
        return reported(status, sourceUnit::node);
    if (envelopeValue == 0.0F)
        return HStatus::kSuccess;
    neuralWarpData* data = fetchNodeData(block, multiIndex);
    if (!data)
        return {HStatus::kFailure, "there is no state for geometry " + std::to_string(multiIndex)};
    data->observer->beginFrame();
    if (data->exportMode) {
        data->modelApplied = false;
        return HStatus::kSuccess;
    }
    TargetMorph morph;
    Attempt attempt = Attempt::nothing;
    status = prepare(block, multiIndex, *data, isActive, morph, attempt);
    if (status.error() || attempt == Attempt::nothing)
        return status;
    const LentArrays arrays(data->workspace);
    Points& result = data->workspace.result;
    if (data->modelApplied) {
        status = applyNeuralModel(block, multiIndex, *data, result);
        if (status.error())
            return reported(status, sourceUnit::node);
    }
    const Blend blend{data->driven(), data->modelApplied ? &result : nullptr, morph.isOn ? &morph.points : nullptr,
                      static_cast<float>(morph.weight), envelopeValue};
    return writeBlended(block, iterator, multiIndex, *data, blend);
}

HStatus neuralWarpNode::prepare(HDataBlock& block, std::uint32_t multiIndex, neuralWarpData& data, bool isActive,
                                TargetMorph& morph, Attempt& attempt) {
    const ObservedStep step(*data.observer, FrameStep::prepare);
    bool isGivenUp = isActive && !updateModelSettings(block, data);
    HStatus status = prepareRestState(data, block, multiIndex);
    if (status.error())
        return status;
    morph.isOn = readTargetMorph(block, multiIndex, morph.weight, morph.points, status);
    if (status.error())
        return reported(status, sourceUnit::node);
    attempt = whatToAttempt(isActive && !isGivenUp, morph.isOn, morph.weight);
    if (attempt == Attempt::withModel) {
        if (data.modelLoadPending)
            status = loadWholeModel(block, data);
        if (status.error())
            return status;
        isGivenUp = data.modelLoadPending;
    }
    data.leaveLoads(isGivenUp);
    data.modelApplied = isModelApplied(attempt, data.canApplyModel(), data.drivesNothing());
    return HStatus::kSuccess;
}

HStatus neuralWarpNode::applyNeuralModel(HDataBlock& block, std::uint32_t multiIndex, neuralWarpData& data,
                                         Points& result) {
    if (!data.canApplyModel())
        return {HStatus::kFailure, "there is no model to apply"};
    ProfiledFrame observer(*data.observer, "InferenceDeltas", name(), data.activeSettings.isSurface());
    std::vector<float> controls;
    if (const HStatus status = gatherControlValues(block, data.session.inputCount(), observer, controls);
        status.error())
        return reported(status, sourceUnit::node);
    const FrameModel model = data.frameModel();
    SessionNetwork network(data.session);
    Prediction prediction(network, controls, observer, Prediction::bestFor(model.vertexCount));
    const HProfilingScope scope(evaluationCategory(), 9, "ApplyDeltas", name());
    HStatus status;
    prediction.meanwhile([&] {
        const ObservedStep step(observer, FrameStep::points);
        status = readInputPoints(data, block, multiIndex, data.workspace.points, false);
    });
    if (status.error())
        return status;
    const FrameSampler sampler(model, observer);
    return statusOf(sampler.place(data.workspace, result, data.workspace.points, prediction, HLongWork::isInterrupted),
                    data.session);
}

HStatus neuralWarpNode::writeBlended(HDataBlock& block, HItGeometry& iterator, std::uint32_t multiIndex,
                                     neuralWarpData& data, const Blend& blend) {
    const float* vertexWeights = nullptr;
    HIndexMapper mapper;
    MovedPoints points{};
    {
        const ObservedStep step(*data.observer, FrameStep::fetch);
        HStatus status;
        mapper = indexMapper(multiIndex, &status);
        if (status.error())
            return reported(status, sourceUnit::node);
        vertexWeights = envelopeWeights(block, multiIndex, &status);
        if (status.error())
            return reported(status, sourceUnit::node);
        points.count = mapper.affectCount();
        points.vertices = mapper.isIdentityMap() ? nullptr : mapper.affectMap().data();
        points.from = iterator.rawPositions(&status);
        if (status.error())
            return reported(status, sourceUnit::node);
        if (iterator.count() != points.count || !blend.fits(points.count))
            return misfit("the deformed geometry", iterator.count(), points.count);
        points.to = iterator.rawPositionsToSet(&status);
        if (status.error())
            return reported(status, sourceUnit::node);
    }
    const ObservedStep step(*data.observer, FrameStep::blend);
    blendPositions(points, vertexWeights, blend);
    return HStatus::kSuccess;
}

} // namespace neuralWarp
