// SPDX-License-Identifier: Apache-2.0
// The evaluation of one geometry.
#include "deformer/blend.h"
#include "deformer/checkOutputs.h"
#include "deformer/deltas.h"
#include "deformer/geometryReaders.h"
#include "deformer/neuralWarpNode.h"
#include "deformer/neuralWarpUtils.h"
#include "messages/displayErrorGated.h"
#include "messages/guard.h"
#include "messages/messageText.h"
#include "messages/sourceUnits.h"
#include "openquarn/HItGeometry.h"
#include "openquarn/HLongWork.h"
#include "openquarn/HProfilingScope.h"
#include "quill/parallelFor.h"

#include <algorithm>
#include <string>

namespace neuralWarp {
namespace {

HStatus noDeltas(const std::string& reason) {
    raiseMessage<Text::kErrorMLModelNoDeltas>(displayErrorGated);
    return {HStatus::kFailure, reason};
}

HStatus tooFewDeltas(std::size_t predicted, std::size_t needed) {
    raiseMessage<Text::kMlNodeVertexCountMismatch>(displayErrorGated, predicted, needed);
    return {HStatus::kFailure,
            "the model gives " + std::to_string(predicted) + " deltas where " + std::to_string(needed) + " are needed"};
}

/// A failure, which the user is told of, when there is not enough to drive every vertex from.
HStatus requireOutputs(const neuralWarpData& data, const std::vector<float>& outputs) {
    const OutputCheck check = checkOutputs(data, outputs.size());
    switch (check.outcome) {
    case Outputs::kEnough:
        break;
    case Outputs::kNone:
        return noDeltas("the model gave no values: " + data.session.errorText());
    case Outputs::kTooFewCoefficients:
        return noDeltas("the model gives " + std::to_string(check.has) + " coefficients for " +
                        std::to_string(check.needed) + " principal shapes");
    case Outputs::kTooFewDeltas:
        return tooFewDeltas(check.has, check.needed);
    }
    return HStatus::kSuccess;
}

void extractDeltas(Points& deltas, const neuralWarpData& data, const std::vector<float>& outputs,
                   const DrivenVertices& driven) {
    if (usesPrincipalShapes(data))
        extractPrincipalDeltas(deltas, outputs, static_cast<std::size_t>(data.principalShapeCount),
                               data.principalShapes, driven);
    else
        extractComputedDeltas(deltas, outputs, driven);
}

void applyOffsets(Points& result, const Points& points, const Points& deltas, const DrivenVertices& driven) {
    quill::parallelFor(driven.count, [&](std::size_t k) {
        const std::size_t v = driven.vertex(k);
        result[v] = points[v] + deltas[k];
    });
}

HStatus misfit(const char* what, std::size_t has, std::size_t needed) {
    return {HStatus::kFailure, std::string(what) + " has " + std::to_string(has) + " points where " +
                                   std::to_string(needed) + " vertices are deformed"};
}

} // namespace

HStatus neuralWarpNode::deform(HDataBlock& block, HItGeometry& iterator, const HMatrix&, unsigned multiIndex) {
    return guarded(*this, "deform", [&] { return evaluate(block, iterator, multiIndex); });
}

HStatus neuralWarpNode::evaluate(HDataBlock& block, HItGeometry& iterator, std::uint32_t multiIndex) {
    HStatus status;
    const HDataHandle model = existingElement(block, models, multiIndex, status);
    if (status.error())
        return status;
    bool isActive = model.child(modelActive).asShort() == 1;
    const float envelopeValue = block.inputValue(envelope, &status).asFloat();
    if (status.error())
        return reported(status, sourceUnit::node);
    if (envelopeValue == 0.0F)
        return HStatus::kSuccess;
    neuralWarpData* data = fetchNodeData(block, multiIndex);
    if (!data)
        return {HStatus::kFailure, "there is no state for geometry " + std::to_string(multiIndex)};
    if (data->observedOutputs)
        data->observedOutputs->clear();
    if (data->phases)
        data->phases->start();
    if (data->exportMode) {
        data->modelApplied = false;
        return HStatus::kSuccess;
    }

    bool isGivenUp = isActive && !updateModelSettings(block, *data);
    isActive = isActive && !isGivenUp;
    status = prepareRestState(*data, block, multiIndex);
    if (status.error())
        return status;
    Points target;
    double morphEnvelope = 0.0;
    const bool isMorphed = readTargetMorph(block, multiIndex, morphEnvelope, target, status);
    if (status.error())
        return reported(status, sourceUnit::node);

    if (isMorphed && morphEnvelope == 1.0) {
        isActive = false; // nothing of the model would be left to see
    } else if (isActive) {
        if (data->modelLoadPending)
            status = loadWholeModel(block, *data);
        if (status.error())
            return status;
        isGivenUp = data->modelLoadPending;
    } else if (!isMorphed) {
        data->modelApplied = false;
        data->leaveLoads(isGivenUp);
        return HStatus::kSuccess;
    }
    data->leaveLoads(isGivenUp);
    isActive = isActive && data->canApplyModel() && !data->drivesNothing();
    data->modelApplied = isActive;

    data->endPhase(Phase::prepare);

    Points result;
    if (isActive) {
        status = applyNeuralModel(block, multiIndex, *data, result);
        if (status.error())
            return reported(status, sourceUnit::node);
    }
    const Blend blend{data, isActive ? &result : nullptr, isMorphed ? &target : nullptr,
                      static_cast<float>(morphEnvelope), envelopeValue};
    return writeBlended(block, iterator, multiIndex, blend);
}

/// A model that smooths for long is in force from now on: the user is told before the first frame (decision 0123).
void neuralWarpNode::announceSmoothing(HDataBlock& block, const neuralWarpData& data) const {
    constexpr std::int64_t manyPasses = 1000;
    const std::int64_t passes = data.modelSettings.smoothingIterations;
    if (passes < manyPasses)
        return;
    HStatus status;
    const HDataHandle geometry = inputGeometryHandle(block, data.multiIndex, status);
    const double count = status.error() ? 0.0 : HItGeometry(geometry).count();
    constexpr double perPass = 3e-6, perVertex = 7e-9; // seconds of one core, its loop without vector instructions
    HLongWork::announce("'" + name().asStdString() + "' smooths geometry " + std::to_string(data.multiIndex) + " in " +
                            std::to_string(passes) + " passes, as its model says, in each frame",
                        static_cast<double>(passes) * (perPass + count * perVertex));
}

bool neuralWarpNode::updateModelSettings(HDataBlock& block, neuralWarpData& data) {
    if (data.modelPathDirty && resolveModelDirectory(block, data).error())
        return false;
    if (data.metadataDirty) {
        const bool isRead = !loadMetadata(data, false).error();
        // the map is that of the model before: the new one is loaded in the next evaluation
        if (!isRead || data.drivesNothing())
            return false;
    }
    if (data.modelSettings.smoothingIterations != data.activeSettings.smoothingIterations)
        announceSmoothing(block, data);
    data.applySettings(data.modelSettings);
    data.releaseUnusedCaches();
    return true;
}

HStatus neuralWarpNode::applyNeuralModel(HDataBlock& block, std::uint32_t multiIndex, neuralWarpData& data,
                                         Points& result) {
    if (!data.canApplyModel())
        return {HStatus::kFailure, "there is no model to apply"};
    std::vector<float> controls;
    if (const HStatus status = gatherControlValues(block, data.session.inputCount(), controls); status.error())
        return reported(status, sourceUnit::node);
    data.endPhase(Phase::gather);
    const std::vector<float> outputs = runNetwork(data, controls);
    data.endPhase(Phase::network);

    const HProfilingScope scope(evaluationCategory(), 9, "ApplyDeltas", name());
    Points points;
    if (HStatus status = readInputPoints(data, block, multiIndex, points); status.error())
        return status;
    const std::size_t count = data.componentMap.affectCount();
    if (points.size() != count)
        return misfit("the input geometry", points.size(), count);
    if (HStatus status = requireOutputs(data, outputs); status.error())
        return status;
    data.endPhase(Phase::points);
    result.resize(count);
    Points deltas;
    extractDeltas(deltas, data, outputs, DrivenVertices(data));
    data.endPhase(Phase::deltas);
    return applyDeltas(data, points, deltas, result);
}

std::vector<float> neuralWarpNode::runNetwork(neuralWarpData& data, const std::vector<float>& controls) const {
    const HProfilingScope scope(evaluationCategory(), 0, "InferenceDeltas", name());
    std::vector<float> outputs = data.session.run(controls);
    if (data.observedOutputs)
        *data.observedOutputs = outputs;
    return outputs;
}

HStatus neuralWarpNode::applyDeltas(const neuralWarpData& data, const Points& points, const Points& deltas,
                                    Points& result) const {
    const DrivenVertices driven(data);
    if (data.activeSettings.deltaMode == kOffsetMode) {
        applyOffsets(result, points, deltas, driven);
        data.endPhase(Phase::apply);
    }
    if (!data.activeSettings.isSurface())
        return HStatus::kSuccess;
    if (data.restPoints.size() < points.size() || data.restFramesInverse.size() < points.size())
        return misfit("the rest geometry", std::min(data.restPoints.size(), data.restFramesInverse.size()),
                      points.size());
    const HProfilingScope scope(evaluationCategory(), 10, "CalculateVertexFrames", name());
    data.vertexFrames.transportDeltas(result, deltas, data.restPoints, data.restFramesInverse, points, driven.vertices);
    data.endPhase(Phase::apply);
    return HStatus::kSuccess;
}

HStatus neuralWarpNode::writeBlended(HDataBlock& block, HItGeometry& iterator, std::uint32_t multiIndex,
                                     const Blend& blend) {
    HStatus status;
    const std::size_t count = indexMapper(multiIndex, &status).affectCount();
    if (status.error())
        return reported(status, sourceUnit::node);
    const float* vertexWeights = envelopeWeights(block, multiIndex, &status);
    if (status.error())
        return reported(status, sourceUnit::node);
    HPointArray positions;
    status = iterator.allPositions(positions, HSpace::kObject);
    if (status.error())
        return reported(status, sourceUnit::node);
    if (positions.length() != count || !blend.fits(count))
        return misfit("the deformed geometry", positions.length(), count);
    blend.data->endPhase(Phase::fetch);
    blendPositions(positions, vertexWeights, blend);
    blend.data->endPhase(Phase::blend);
    status = iterator.setAllPositions(positions, HSpace::kObject);
    blend.data->endPhase(Phase::writeBack);
    return reported(status, sourceUnit::node);
}

} // namespace neuralWarp
