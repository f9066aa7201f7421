// SPDX-License-Identifier: Apache-2.0
#include "openquarn/gpu/HPxGPUDeformer.h"

#include "core/Operations.h"
#include "gpu/deformerImpl.h"
#include "gpu/failure.h"
#include "gpu/publishedBuffer.h"
#include "gpu/transfer.h"
#include "graph/Node.h"
#include "openquarn/HPxDeformerNode.h"
#include "openquarn/TapiCastAnim.h"
#include "openquarn/gpu/HOpenCLUtils.h"

using OpenQuarn::isRefused;
using OpenQuarn::Operation;

const HString HPxGPUDeformer::sPositionsName("positions");

HPxGPUDeformer::HPxGPUDeformer()
    : impl_(std::make_unique<Impl>()) {}
HPxGPUDeformer::~HPxGPUDeformer() = default;

HPxGPUDeformer::DeformerStatus HPxGPUDeformer::evaluate(HDataBlock& block, const HEvaluationNode& evaluationNode,
                                                        const HPlug& outputPlug, const HPlugArray& inputPlugs,
                                                        const HGPUDeformerData& inputData,
                                                        HGPUDeformerData& outputData) {
    if (inputPlugs.empty())
        return kDeformerFailure;
    return evaluate(block, evaluationNode, outputPlug, inputPlugs.front(), inputData, outputData);
}

HPxGPUDeformer::DeformerStatus HPxGPUDeformer::evaluate(HDataBlock& block, const HEvaluationNode& evaluationNode,
                                                        const HPlug& outputPlug, const HPlug& inputPlug,
                                                        const HGPUDeformerData& inputData,
                                                        HGPUDeformerData& outputData) {
    const HOpenCLBuffer input = inputData.getBuffer(inputPlug, sPositionsName);
    HOpenCLBuffer output = outputData.getBuffer(outputPlug, sPositionsName);
    if (output.ensureBufferSize(input.bufferSize()) != CL_SUCCESS)
        return kDeformerFailure;
    const auto vertexCount = static_cast<unsigned>(input.bufferSize() / sizeof(T3dFltVector));
    const DeformerStatus status = evaluate(block, evaluationNode, outputPlug, vertexCount, input, output);
    if (status == kDeformerSuccess)
        outputData.setBuffer(outputPlug, sPositionsName, output);
    return status;
}

HPxGPUDeformer::DeformerStatus HPxGPUDeformer::evaluate(HDataBlock&, const HEvaluationNode&, const HPlug&, unsigned,
                                                        const HOpenCLBuffer&, HOpenCLBuffer&) {
    return kDeformerFailure;
}

void HPxGPUDeformer::terminate() {}

bool HPxGPUDeformer::passThroughWithZeroEnvelope() const {
    return true;
}

HObject HPxGPUDeformer::dependencyNode() const {
    return isRefused(Operation::HPxGPUDeformer_dependencyNode) ? HObject() : impl_->node;
}

unsigned HPxGPUDeformer::multiIndex() const {
    return isRefused(Operation::HPxGPUDeformer_multiIndex) ? 0U : impl_->multiIndex;
}

namespace {

struct Bytes {
    const void* data = nullptr;
    std::size_t elements = 0;
    std::size_t elementSize = 0;
};

template <class Array>
bool take(const Array* array, Bytes& bytes) {
    if (array)
        bytes = {array->data(), array->length(), sizeof(typename Array::value_type)};
    return array != nullptr;
}

/// False when the object holds no array.
bool bytesOf(const HObject& object, Bytes& bytes) {
    return take(TapiCastAnim::floatArray(object), bytes) || take(TapiCastAnim::uInt32Array(object), bytes) ||
           take(TapiCastAnim::floatVectorArray(object), bytes) || take(TapiCastAnim::doubleMatrixArray(object), bytes);
}

} // namespace

namespace OpenQuarn {

HObject publishedBuffer(const HObject& dependencyNode, const HString& name, unsigned multiIndex) {
    const auto node = Access::as<Node>(dependencyNode);
    auto* deformer = node ? dynamic_cast<HPxDeformerNode*>(node->userNode()) : nullptr;
    HObject buffer;
    if (deformer)
        callPlugin(*node, "getNamedBuffer", [&] {
            buffer = deformer->getNamedBuffer(name, multiIndex);
            return HStatus();
        });
    return buffer;
}

} // namespace OpenQuarn

void HPxGPUDeformer::uploadFixedSetupData(const HString& name, HOpenCLBuffer& buffer, cl_int& status,
                                          unsigned& elementCount) {
    elementCount = 0;
    if (isRefused(Operation::HPxGPUDeformer_uploadFixedSetupData))
        status = CL_INVALID_OPERATION;
    if (status != CL_SUCCESS)
        return;
    const HObject published = OpenQuarn::publishedBuffer(impl_->node, name, impl_->multiIndex);
    Bytes bytes;
    if (!bytesOf(published, bytes)) {
        status = OpenQuarn::noteFailure(CL_INVALID_VALUE, "the node publishes no buffer '" + name.asStdString() + "'");
        return;
    }
    status = OpenQuarn::uploadNamed(name.asStdString(), bytes.elements * bytes.elementSize, bytes.data, buffer,
                                    HOpenCLUtils::kCopyData);
    if (status == CL_SUCCESS)
        elementCount = static_cast<unsigned>(bytes.elements);
}
