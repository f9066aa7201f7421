// SPDX-License-Identifier: Apache-2.0
// What the GPU deformer does on the device: uploads, kernels, launches.
#include "deformer/KernelCall.h"
#include "deformer/neuralWarpGPUNode.h"

#include "messages/guard.h"
#include "messages/sourceUnits.h"
#include "openquarn/HGlobal.h"
#include "openquarn/gpu/HOpenCLInfo.h"

#include <utility>

namespace neuralWarp {
namespace {

constexpr std::size_t pointSize = sizeof(quill::val3<float>);

const HString kernelFolder("/GPUBuiltInDeformer/kernels/");
const HString applyName("gpu_apply_deltas_kernel");
const HString principalShapesName("gpu_principal_shapes_kernel");
const HString smoothName("averageVertKernel");
const HString copyToAffectName("copyToAffectBuffer");

bool holds(const HOpenCLBuffer& buffer, std::size_t elements, std::size_t elementSize) {
    return buffer.bufferSize() == elements * elementSize;
}

cl_int uploadFloats(const std::vector<float>& values, HOpenCLBuffer& buffer) {
    return HOpenCLUtils::uploadToGPU(values.size() * sizeof(float), values.empty() ? nullptr : values.data(), buffer,
                                     HOpenCLUtils::kCopyData);
}

} // namespace

void neuralWarpGPUNode::terminate() {
    try {
        for (HOpenCLKernelInfo* kernel : {&applyKernel_, &smoothKernel_, &principalShapesKernel_, &copyToAffectKernel_})
            kernel->reset();
        for (HOpenCLBuffer* buffer :
             {&deltasBuffer_, &affectToDeltaMapBuffer_, &framesIndexerBuffer_, &framesPairsBuffer_, &connectionsBuffer_,
              &connectionsIndexerBuffer_, &connectionWeightsBuffer_, &targetPositionsBuffer_, &restPointsBuffer_,
              &restFramesInverseBuffer_, &principalShapesBuffer_, &coefficientsBuffer_, &affectPositionsA_,
              &affectPositionsB_})
            buffer->reset();
        syncState_ = {}; // nothing is uploaded any more
        HPxGPUStandardDeformer::terminate();
    } catch (...) {
        statusOfException("leaving the GPU").pAPIerror(sourceUnit::gpuNode, __LINE__);
    }
}

bool neuralWarpGPUNode::uploadSetupBuffers() {
    if (!syncState_.isDirty()) {
        forgetSetupEvents();
        return true;
    }
    struct Upload {
        unsigned slot; ///< of neuralWarpData::cacheVersions
        const char* name;
        HOpenCLBuffer& buffer;
    };
    const Upload uploads[] = {
        {neuralWarpData::framesCache, "FramesIndexer", framesIndexerBuffer_},
        {neuralWarpData::framesCache, "FramesPairs", framesPairsBuffer_},
        {neuralWarpData::connectionsCache, "Connections", connectionsBuffer_},
        {neuralWarpData::connectionsCache, "ConnectionsIndexer", connectionsIndexerBuffer_},
        {neuralWarpData::connectionsCache, "ConnectionWeights", connectionWeightsBuffer_},
        {neuralWarpData::restFramesCache, "OriginalVerts", restPointsBuffer_},
        {neuralWarpData::restFramesCache, "SmoothOriginalFramesInverse", restFramesInverseBuffer_},
        {neuralWarpData::affectMapCache, "AffectToDeltaMap", affectToDeltaMapBuffer_},
        {neuralWarpData::principalShapesCache, "PrincipalShapesData", principalShapesBuffer_},
    };
    cl_int status = CL_SUCCESS;
    unsigned elements = 0;
    for (const Upload& upload : uploads)
        if (syncState_.isDirty(static_cast<unsigned>(upload.slot)))
            uploadFixedSetupData(upload.name, upload.buffer, status, elements);
    if (status == CL_SUCCESS)
        syncState_.uploaded = syncState_.captured;
    return status == CL_SUCCESS;
}

// What an earlier evaluation has put into the queue comes before all of this one: to wait for it as well, with each
// launch that reads it, takes longer than a small launch.
void neuralWarpGPUNode::forgetSetupEvents() {
    for (HOpenCLBuffer* buffer : {&affectToDeltaMapBuffer_, &framesIndexerBuffer_, &framesPairsBuffer_,
                                  &connectionsBuffer_, &connectionsIndexerBuffer_, &connectionWeightsBuffer_,
                                  &restPointsBuffer_, &restFramesInverseBuffer_, &principalShapesBuffer_})
        buffer->setBufferReadyEvent({});
}

void neuralWarpGPUNode::takeSlots(const neuralWarpData& data, const std::vector<float>& outputs) {
    principalActive_ = data.frameModel().shapes.isUsed();
    shapeCount_ = static_cast<std::uint32_t>(data.principalShapeCount);
    deltaVertexCount_ = static_cast<std::uint32_t>(principalActive_ ? data.principalVertCount : outputs.size() / 3);
}

bool neuralWarpGPUNode::uploadOutputs(const std::vector<float>& outputs) {
    return uploadFloats(outputs, principalActive_ ? coefficientsBuffer_ : deltasBuffer_) == CL_SUCCESS;
}

void neuralWarpGPUNode::KernelFiles::update() {
    HString folder = HGlobal::getAbsolutePathToResources();
    if (folder == resources && !deformer.isEmpty())
        return;
    const HString directory = folder + kernelFolder;
    deformer = directory + "neuralWarpGPUNode.cl";
    utilities = directory + "quillUtils.cl";
    buffers = directory + "quillBuffers.cl";
    includes.clear();
    includes.append(directory);
    resources = std::move(folder);
}

bool neuralWarpGPUNode::loadKernels() {
    kernelFiles_.update();
    const KernelFiles& files = kernelFiles_;
    return applyKernel_.loadOrUpdate(files.deformer, applyName, affectCount(), &files.includes) &&
           principalShapesKernel_.loadOrUpdate(files.deformer, principalShapesName, deltaVertexCount_,
                                               &files.includes) &&
           smoothKernel_.loadOrUpdate(files.utilities, smoothName, affectCount(), &files.includes) &&
           copyToAffectKernel_.loadOrUpdate(files.buffers, copyToAffectName, affectCount());
}

// What was uploaded is that of an evaluation on the CPU, and may be of another vertex set, or have been freed since: no
// kernel is let near a buffer that is shorter than what it reads.

bool neuralWarpGPUNode::areConnectionsUsable() const {
    if (smoothingIterations_ <= 0)
        return true;
    return holds(connectionsIndexerBuffer_, std::size_t{affectCount()} + 1, sizeof(cl_uint)) &&
           connectionWeightsBuffer_.bufferSize() == connectionsBuffer_.bufferSize();
}

bool neuralWarpGPUNode::areFramesUsable() const {
    if (deltaMode_ != kSurfaceMode)
        return true;
    if (framesIndexerBuffer_.bufferSize() == 0 || framesPairsBuffer_.bufferSize() == 0)
        return false;
    const std::size_t count = affectCount();
    return !deltasActive_ ||
           (holds(framesIndexerBuffer_, count + 1, sizeof(cl_uint)) && holds(restPointsBuffer_, count, pointSize) &&
            holds(restFramesInverseBuffer_, count, sizeof(quill::mat4d)));
}

bool neuralWarpGPUNode::areDeltasUsable() const {
    if (!deltasActive_)
        return true;
    if (useAffectMap_ && !holds(affectToDeltaMapBuffer_, affectCount(), sizeof(cl_uint)))
        return false;
    return !principalActive_ || principalShapesBuffer_.bufferSize() / pointSize / shapeCount_ >= deltaVertexCount_;
}

cl_int neuralWarpGPUNode::enqueueDeformation(HOpenCLEvent& event) {
    if (affectCount() == 0)
        return CL_SUCCESS;
    const char* misfit = !areConnectionsUsable() ? "the smoothing's tables on the device are not of this geometry"
                         : !areFramesUsable()    ? "the frames' tables on the device are not of this geometry"
                         : !areDeltasUsable()    ? "the model's tables on the device are not of this geometry"
                                                 : nullptr;
    if (misfit) {
        HOpenCLInfo::explainFailure(misfit);
        return CL_INVALID_BUFFER_SIZE;
    }
    const HOpenCLBuffer* current = &affectPositionsA_;
    cl_int status = enqueueGather(event);
    if (status == CL_SUCCESS && smoothingIterations_ > 0)
        status = enqueueSmoothing(event, current);
    if (status == CL_SUCCESS && deltasActive_ && principalActive_)
        status = enqueuePrincipalShapes(event);
    return status == CL_SUCCESS ? enqueueApply(event, *current) : status;
}

cl_int neuralWarpGPUNode::enqueueGather(HOpenCLEvent& event) {
    if (const cl_int status = affectPositionsA_.ensureBufferSize(affectCount() * pointSize); status != CL_SUCCESS)
        return status;
    KernelCall call(copyToAffectKernel_, event);
    call.buffer(affectPositionsA_)
        .buffer(inputPositions())
        .buffer(affectMapBuffer(), !isIdentityMap())
        .value<cl_uint>(affectCount());
    const cl_int status = call.enqueue(event);
    affectPositionsA_.setBufferReadyEvent(event);
    return status;
}

cl_int neuralWarpGPUNode::enqueueSmoothing(HOpenCLEvent& event, const HOpenCLBuffer*& current) {
    cl_int status = affectPositionsB_.ensureBufferSize(affectCount() * pointSize);
    if (status == CL_SUCCESS)
        status = enqueueCopy(event);
    HOpenCLBuffer* source = &affectPositionsA_;
    HOpenCLBuffer* destination = &affectPositionsB_;
    // passes follow one another in the queue, which is in order: the first waits for all, the last has the event
    for (std::int32_t pass = 0; pass < smoothingIterations_ && status == CL_SUCCESS; ++pass) {
        KernelCall call(smoothKernel_, pass == 0 ? event : HOpenCLEvent());
        call.buffer(*destination)
            .buffer(*source)
            .nullBuffer() // a mask
            .value<cl_float>(1.0F)
            .buffer(connectionsIndexerBuffer_)
            .buffer(connectionsBuffer_)
            .buffer(connectionWeightsBuffer_)
            .value<cl_uint>(affectCount());
        status = pass + 1 == smoothingIterations_ ? call.enqueue(event) : call.enqueue();
        for (HOpenCLBuffer* buffer : {source, destination})
            buffer->setBufferReadyEvent({});
        std::swap(source, destination);
    }
    source->setBufferReadyEvent(event);
    current = source;
    return status;
}

cl_int neuralWarpGPUNode::enqueueCopy(HOpenCLEvent& event) {
    const HOpenCLEventList waitFor{affectPositionsA_.bufferReadyEvent(), affectPositionsB_.bufferReadyEvent(), event};
    HOpenCLEvent copied;
    const cl_int status = clEnqueueCopyBuffer(HOpenCLInfo::getQuarnDefaultOpenCLCommandQueue(), affectPositionsA_.get(),
                                              affectPositionsB_.get(), 0, 0, affectCount() * pointSize,
                                              waitFor.length(), waitFor.data(), copied.receive());
    event = copied;
    affectPositionsB_.setBufferReadyEvent(event);
    return HOpenCLInfo::checkCLErrorStatus(status);
}

cl_int neuralWarpGPUNode::enqueuePrincipalShapes(HOpenCLEvent& event) {
    const cl_int allocated = deltasBuffer_.ensureBufferSize(deltaVertexCount_ * pointSize);
    if (allocated != CL_SUCCESS)
        return allocated;
    KernelCall call(principalShapesKernel_, event);
    call.buffer(deltasBuffer_)
        .buffer(coefficientsBuffer_)
        .buffer(principalShapesBuffer_)
        .value<cl_uint>(shapeCount_)
        .value<cl_uint>(deltaVertexCount_);
    const cl_int status = call.enqueue(event);
    deltasBuffer_.setBufferReadyEvent(event);
    return status;
}

cl_int neuralWarpGPUNode::enqueueApply(HOpenCLEvent& event, const HOpenCLBuffer& current) {
    const bool isSurface = deltaMode_ == kSurfaceMode;
    KernelCall call(applyKernel_, event);
    call.buffer(outputPositions())
        .buffer(inputPositions())
        .buffer(current)
        .buffer(weightsBuffer(), hasEnvelopeWeights())
        .buffer(affectMapBuffer(), !isIdentityMap())
        .value<cl_float>(envelope())
        .buffer(deltasBuffer_, deltasActive_)
        .buffer(affectToDeltaMapBuffer_, useAffectMap_)
        .value<cl_uint>(deltaVertexCount_)
        .buffer(framesIndexerBuffer_, isSurface)
        .buffer(framesPairsBuffer_, isSurface)
        .buffer(restPointsBuffer_, isSurface)
        .buffer(restFramesInverseBuffer_, isSurface)
        .buffer(targetPositionsBuffer_, morphActive_)
        .value<cl_float>(morphEnvelope_)
        .value<cl_uint>(affectCount());
    return call.enqueue(event);
}

} // namespace neuralWarp
