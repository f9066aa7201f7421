// SPDX-License-Identifier: Apache-2.0
// A plug-in outside of the project that brings a GPU deformer, with kernels in a file and with OpenCL calls of its own.
#include <openquarn/HFnPlugin.h>
#include <openquarn/gpu/HGPUDeformerRegistry.h>
#include <openquarn/gpu/HOpenCLInfo.h>
#include <openquarn/gpu/HOpenCLKernelInfo.h>
#include <openquarn/gpu/HPxGPUStandardDeformer.h>
#include <openquarn/gpu/SourceNodeSyncState.h>

namespace {

// Leaves the points where they are.
class StillDeformer : public HPxGPUStandardDeformer {
public:
    using HPxGPUStandardDeformer::evaluate;
    DeformerStatus evaluate(HDataBlock&, const HEvaluationNode&, const HPlug&, unsigned, const HOpenCLBuffer& input,
                            HOpenCLBuffer& output) override {
        const HOpenCLEventList waitFor{input.bufferReadyEvent()};
        HOpenCLEvent copied;
        const cl_int status =
            clEnqueueCopyBuffer(HOpenCLInfo::getQuarnDefaultOpenCLCommandQueue(), input.get(), output.get(), 0, 0,
                                input.bufferSize(), waitFor.length(), waitFor.data(), copied.receive());
        output.setBufferReadyEvent(copied);
        return HOpenCLInfo::checkCLErrorStatus(status) == CL_SUCCESS ? kDeformerSuccess : kDeformerFailure;
    }
    void terminate() override {
        kernel_.reset();
        HPxGPUStandardDeformer::terminate();
    }

private:
    HOpenCLKernelInfo kernel_;
    deformer_utils::SourceNodeSyncState sync_;
};

class StillInfo : public HGPUDeformerRegistrationInfo {
public:
    HPxGPUDeformer* createGPUDeformer() override { return new StillDeformer; }
};

StillInfo info;

} // namespace

extern "C" OPENQUARN_API const char HApiVersion[8];
const char HApiVersion[8] = OPENQUARN_API_VERSION;

extern "C" OPENQUARN_API HStatus initializePlugin(HObject object);
HStatus initializePlugin(HObject object) {
    HStatus status;
    const HFnPlugin plugin(object, "consumer", "1.0", "Any", &status);
    return status.error() ? status : HGPUDeformerRegistry::registerGPUDeformerCreator("still", "consumer", &info);
}

extern "C" OPENQUARN_API HStatus uninitializePlugin(HObject object);
HStatus uninitializePlugin(HObject) {
    return HGPUDeformerRegistry::deregisterGPUDeformerCreator("still", "consumer");
}
