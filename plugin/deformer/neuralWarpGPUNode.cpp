// SPDX-License-Identifier: Apache-2.0
// An evaluation on the GPU, up to what goes to the device.
#include "deformer/neuralWarpGPUNode.h"

#include "deformer/ProfiledFrame.h"
#include "deformer/neuralWarpNode.h"
#include "deformer/neuralWarpUtils.h"
#include "frame/FrameCheck.h"
#include "frame/Prediction.h"
#include "messages/displayErrorGated.h"
#include "messages/guard.h"
#include "messages/messageText.h"
#include "messages/sourceUnits.h"
#include "nw_deform/SessionNetwork.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <utility>

namespace neuralWarp {
namespace {

using Status = HPxGPUDeformer::DeformerStatus;

/// Below this, a target morph is off; this near to 1, it leaves nothing of the model to see.
constexpr float smallestMorphEnvelope = 1e-6F;

/// Runs `body`; what it throws is reported, and the host then evaluates on the CPU (decision 0094).
template <class Body>
Status guardedEvaluation(Body&& body) noexcept {
    try {
        return std::forward<Body>(body)();
    } catch (...) {
        statusOfException("evaluating on the GPU").pAPIerror(sourceUnit::gpuNode, __LINE__);
        return Status::kDeformerFailure;
    }
}

} // namespace

neuralWarpGPUNode::~neuralWarpGPUNode() {
    neuralWarpGPUNode::terminate();
}

Status neuralWarpGPUNode::evaluate(HDataBlock& block, const HEvaluationNode& evaluationNode, const HPlug& outputPlug,
                                   const HPlugArray& inputPlugs, const HGPUDeformerData& inputData,
                                   HGPUDeformerData& outputData) {
    return guardedEvaluation([&] {
        neuralWarpData* data = fetchNodeData(block, multiIndex());
        if (!data)
            return kDeformerFailure;
        data->observer->beginFrame();
        if (data->exportMode)
            return kDeformerPassThrough;
        HOpenCLEvent event;
        Status status = kDeformerSuccess;
        {
            const ObservedStep step(*data->observer, FrameStep::prepare);
            takeSettings(*data);
            status = prepareEvaluation(block, evaluationNode, outputPlug, inputPlugs, inputData, outputData, event);
            if (status == kDeformerSuccess)
                status = findMorph(block, evaluationNode, inputData);
        }
        std::vector<float> outputs;
        if (status == kDeformerSuccess && deltasActive_)
            status = computeOutputs(block, *data, outputs);
        return status == kDeformerSuccess ? deformPrepared(evaluationNode, *data, outputs, event, outputData) : status;
    });
}

void neuralWarpGPUNode::takeSettings(const neuralWarpData& data) {
    // a mode that does not fit is none that there is
    constexpr std::uint32_t largest = std::numeric_limits<std::uint16_t>::max();
    deltaMode_ = static_cast<std::uint16_t>(std::min(data.activeSettings.deltaMode, largest));
    smoothingIterations_ = static_cast<std::int32_t>(data.activeSettings.smoothingIterations);
    useAffectMap_ = data.useAffectMap;
    // a map without elements would read as "each vertex is driven"
    deltasActive_ = data.modelApplied && !data.drivesNothing();
    principalActive_ = false;
    shapeCount_ = 0;
    deltaVertexCount_ = 0;
    morphActive_ = false;
    targetPositionsBuffer_.reset();
}

Status neuralWarpGPUNode::findMorph(HDataBlock& block, const HEvaluationNode& evaluationNode,
                                    const HGPUDeformerData& inputData) {
    HStatus status;
    const bool isEnabled = block.inputValue(neuralWarpNode::targetMorphEnabled, &status).asBool() && !status.error();
    const double wanted = block.inputValue(neuralWarpNode::targetMorphEnvelope, &status).asDouble();
    morphEnvelope_ = status.error() ? 0.0F : static_cast<float>(wanted);
    if (!isEnabled || std::abs(morphEnvelope_) < smallestMorphEnvelope)
        return kDeformerSuccess;
    if (findTarget(evaluationNode, inputData) != CL_SUCCESS)
        return kDeformerFailure;
    morphActive_ = !targetPositionsBuffer_.isNull();
    if (!morphActive_)
        raiseMessage<Text::kErrorMLTargetBuffer>(displayErrorGated);
    if (std::abs(morphEnvelope_ - 1.0F) < smallestMorphEnvelope)
        deltasActive_ = false;
    // a target is read by the vertex's index in the geometry: more points do no harm
    const std::size_t points = targetPositionsBuffer_.bufferSize() / sizeof(quill::val3<float>);
    return morphActive_ && points < vertexCount() ? kDeformerFailure : kDeformerSuccess;
}

cl_int neuralWarpGPUNode::findTarget(const HEvaluationNode& evaluationNode, const HGPUDeformerData& inputData) {
    HPlug target(evaluationNode.dependencyNode(), neuralWarpNode::targetMorphGeometry);
    target.selectAncestorLogicalIndex(multiIndex());
    cl_int status = CL_SUCCESS;
    targetPositionsBuffer_ = inputData.getBuffer(target, sPositionsName, &status);
    return status;
}

Status neuralWarpGPUNode::computeOutputs(HDataBlock& block, neuralWarpData& data, std::vector<float>& outputs) {
    if (!runInference(block, data, outputs))
        return kDeformerPassThrough;
    const bool isSameGeometry = data.componentMap.affectCount() == affectCount();
    return isSameGeometry && areEnoughForAllSlots(data.frameModel(), outputs.size()) ? kDeformerSuccess
                                                                                     : kDeformerFailure;
}

bool neuralWarpGPUNode::runInference(HDataBlock& block, neuralWarpData& data, std::vector<float>& outputs) {
    if (!data.session.isLoaded()) {
        raiseMessage<Text::kErrorMLModelInit>(displayErrorGated, multiIndex());
        return false;
    }
    if (!data.canApplyModel()) {
        raiseMessage<Text::kErrorMLModelInvalid>(displayErrorGated, multiIndex());
        return false;
    }
    ProfiledFrame observer(*data.observer, "InferenceDeltasForGPU",
                           "Inference Neural Warp deltas to be applied on the GPU.", false);
    const HStatus status = gatherControlValues(block, data.session.inputCount(), observer, controls_);
    if (reported(status, sourceUnit::gpuNode).error())
        return false;
    SessionNetwork network(data.session);
    outputs = std::move(Prediction(network, controls_, observer, Prediction::Where::inLine).outputs());
    if (outputs.empty())
        raiseMessage<Text::kErrorMLModelNoDeltas>(displayErrorGated);
    return !outputs.empty();
}

Status neuralWarpGPUNode::deformPrepared(const HEvaluationNode& evaluationNode, const neuralWarpData& data,
                                         const std::vector<float>& outputs, HOpenCLEvent& event,
                                         HGPUDeformerData& outputData) {
    {
        const ObservedStep step(*data.observer, FrameStep::points);
        prepareAffectMapBuffer();
        prepareWeightsBuffer(evaluationNode);
        syncState_.capture(*this);
        if (deltasActive_)
            takeSlots(data, outputs);
        // what is small goes up last, and the kernels follow at once: the device is woken once
        if (!uploadSetupBuffers() || !loadKernels() || (deltasActive_ && !uploadOutputs(outputs)))
            return kDeformerFailure;
    }
    {
        const ObservedStep step(*data.observer, FrameStep::apply);
        if (initializeOutputPositions(event) != CL_SUCCESS || enqueueDeformation(event) != CL_SUCCESS)
            return kDeformerFailure;
    }
    return finishEvaluation(event, outputData);
}

} // namespace neuralWarp
