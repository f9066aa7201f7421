// SPDX-License-Identifier: Apache-2.0
#include "openquarn/gpu/HPxGPUStandardDeformer.h"

#include "core/Operations.h"
#include "gpu/Device.h"
#include "gpu/activity.h"
#include "gpu/deformerImpl.h"
#include "gpu/failure.h"
#include "gpu/transfer.h"
#include "openquarn/HPxGeometryFilter.h"
#include "openquarn/TArray.h"
#include "openquarn/gpu/HOpenCLInfo.h"
#include "openquarn/gpu/HOpenCLUtils.h"

#include <vector>

using OpenQuarn::isRefused;
using OpenQuarn::Operation;

namespace {
const HOpenCLBuffer noBuffer;
} // namespace

struct HPxGPUStandardDeformer::Standard {
    HPlug outputPlug;
    HOpenCLBuffer input, output, affectMap, weights;
    std::shared_ptr<const OpenQuarn::IndexMap> uploadedMap; ///< null: none
    std::uint64_t uploadedWeights = 0;                      ///< their version; 0: none
    unsigned vertexCount = 0;
    float envelope = 1.0F;
    cl_int status = CL_SUCCESS; ///< of the preparations of this evaluation

    /// Uploads the input, if that has been left for later.
    cl_int bringInput() {
        if (status == CL_SUCCESS)
            status = OpenQuarn::writeStaged(input);
        return status;
    }
};

HPxGPUStandardDeformer::HPxGPUStandardDeformer()
    : standard_(std::make_unique<Standard>()) {}
HPxGPUStandardDeformer::~HPxGPUStandardDeformer() = default;

void HPxGPUStandardDeformer::terminate() {
    if (isRefused(Operation::HPxGPUStandardDeformer_terminate))
        return;
    *standard_ = Standard();
    HPxGPUDeformer::terminate();
}

namespace {

/// The envelope of a geometry filter, else 1.
float envelopeOf(HDataBlock& block, bool isGeometryFilter, HStatus& status) {
    return isGeometryFilter ? block.inputValue(HPxGeometryFilter::envelope, &status).asFloat() : 1.0F;
}

} // namespace

HPxGPUDeformer::DeformerStatus HPxGPUStandardDeformer::prepareEvaluation(
    HDataBlock& block, const HEvaluationNode& /*evaluationNode*/, const HPlug& outputPlug, const HPlugArray& inputPlugs,
    const HGPUDeformerData& inputData, HGPUDeformerData& outputData, HOpenCLEvent& event) {
    if (isRefused(Operation::HPxGPUStandardDeformer_prepareEvaluation))
        return kDeformerFailure;
    Standard& now = *standard_;
    now.status = CL_SUCCESS;
    now.outputPlug = outputPlug;
    outputData.clear();
    now.input = {};
    if (!inputPlugs.empty())
        now.input = inputData.find(inputPlugs.front(), sPositionsName, now.status);
    now.vertexCount = static_cast<unsigned>(now.input.bufferSize() / sizeof(T3dFltVector));
    if (now.input.isNull() || !impl_->affected || impl_->affected->fullCount != now.vertexCount) {
        OpenQuarn::noteFailure("the geometry has no positions on the device");
        return kDeformerFailure;
    }
    HStatus status;
    now.envelope = envelopeOf(block, impl_->isGeometryFilter, status);
    if (status.error())
        return kDeformerFailure;
    if (now.envelope == 0.0F && passThroughWithZeroEnvelope())
        return kDeformerPassThrough;
    if (now.output.ensureBufferSize(now.input.bufferSize()) != CL_SUCCESS)
        return kDeformerFailure;
    event = now.input.bufferReadyEvent();
    return kDeformerSuccess;
}

void HPxGPUStandardDeformer::prepareAffectMapBuffer() {
    if (isRefused(Operation::HPxGPUStandardDeformer_prepareAffectMapBuffer))
        return;
    Standard& now = *standard_;
    if (isIdentityMap() || now.uploadedMap == impl_->affected || now.status != CL_SUCCESS)
        return;
    const HUintArray& map = *impl_->affected->affected;
    const std::vector<cl_uint> indices(map.begin(), map.end());
    now.status = OpenQuarn::uploadNamed("affectMap", indices.size() * sizeof(cl_uint), indices.data(), now.affectMap,
                                        HOpenCLUtils::kCopyData);
    now.uploadedMap = now.status == CL_SUCCESS ? impl_->affected : nullptr;
}

void HPxGPUStandardDeformer::prepareWeightsBuffer(const HEvaluationNode& /*evaluationNode*/) {
    if (isRefused(Operation::HPxGPUStandardDeformer_prepareWeightsBuffer))
        return;
    Standard& now = *standard_;
    if (!hasEnvelopeWeights() || now.uploadedWeights == impl_->weightsVersion || now.status != CL_SUCCESS)
        return;
    now.status = OpenQuarn::uploadNamed("weights", affectCount() * sizeof(float), impl_->weights, now.weights,
                                        HOpenCLUtils::kCopyData);
    now.uploadedWeights = now.status == CL_SUCCESS ? impl_->weightsVersion : 0;
}

cl_int HPxGPUStandardDeformer::initializeOutputPositions(HOpenCLEvent& event) {
    if (isRefused(Operation::HPxGPUStandardDeformer_initializeOutputPositions))
        return CL_INVALID_OPERATION;
    Standard& now = *standard_;
    if (now.bringInput() == CL_SUCCESS && event.isNull())
        event = now.input.bufferReadyEvent();
    if (now.status != CL_SUCCESS || isIdentityMap())
        return now.status;
    const std::shared_ptr<OpenQuarn::Device> device = OpenQuarn::currentDevice();
    if (!device)
        return CL_DEVICE_NOT_AVAILABLE;
    const HOpenCLEventList waitFor{event};
    HOpenCLEvent copied;
    const cl_int status =
        clEnqueueCopyBuffer(device->queue, now.input.get(), now.output.get(), 0, 0, now.input.bufferSize(),
                            waitFor.length(), waitFor.data(), copied.receive());
    if (status == CL_SUCCESS) {
        OpenQuarn::timeCommand(*device, "copy", copied.get());
        event = copied;
    }
    return OpenQuarn::noteFailure(status, "clEnqueueCopyBuffer");
}

HPxGPUDeformer::DeformerStatus HPxGPUStandardDeformer::finishEvaluation(const HOpenCLEvent& event,
                                                                        HGPUDeformerData& outputData) {
    if (isRefused(Operation::HPxGPUStandardDeformer_finishEvaluation) || standard_->status != CL_SUCCESS)
        return kDeformerFailure;
    standard_->output.setBufferReadyEvent(event);
    outputData.setBuffer(standard_->outputPlug, sPositionsName, standard_->output);
    return kDeformerSuccess;
}

const HOpenCLBuffer& HPxGPUStandardDeformer::inputPositions() const {
    if (isRefused(Operation::HPxGPUStandardDeformer_inputPositions))
        return noBuffer;
    standard_->bringInput(); // finishEvaluation() answers for a failure
    return standard_->input;
}

HOpenCLBuffer& HPxGPUStandardDeformer::outputPositions() {
    isRefused(Operation::HPxGPUStandardDeformer_outputPositions); // said; a reference has to be given
    return standard_->output;
}

unsigned HPxGPUStandardDeformer::vertexCount() const {
    return isRefused(Operation::HPxGPUStandardDeformer_vertexCount) ? 0 : standard_->vertexCount;
}

unsigned HPxGPUStandardDeformer::affectCount() const {
    return impl_->affected && !isRefused(Operation::HPxGPUStandardDeformer_affectCount) ? impl_->affected->affectCount()
                                                                                        : 0;
}

const HOpenCLBuffer& HPxGPUStandardDeformer::affectMapBuffer() const {
    return isRefused(Operation::HPxGPUStandardDeformer_affectMapBuffer) || isIdentityMap() ? noBuffer
                                                                                           : standard_->affectMap;
}

bool HPxGPUStandardDeformer::isIdentityMap() const {
    return isRefused(Operation::HPxGPUStandardDeformer_isIdentityMap) || !impl_->affected ||
           impl_->affected->isIdentity();
}

const HOpenCLBuffer& HPxGPUStandardDeformer::weightsBuffer() const {
    return !isRefused(Operation::HPxGPUStandardDeformer_weightsBuffer) && hasEnvelopeWeights() ? standard_->weights
                                                                                               : noBuffer;
}

bool HPxGPUStandardDeformer::hasEnvelopeWeights() const {
    return !isRefused(Operation::HPxGPUStandardDeformer_hasEnvelopeWeights) && impl_->weights != nullptr;
}

float HPxGPUStandardDeformer::envelope() const {
    return isRefused(Operation::HPxGPUStandardDeformer_envelope) ? 0.0F : standard_->envelope;
}
