// SPDX-License-Identifier: Apache-2.0
#include "host/pipeline/gpuDeformers.h"

#include "host/support/testNodes.h"

#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnPlugin.h"
#include "openquarn/gpu/HGPUDeformerRegistry.h"
#include "openquarn/gpu/HOpenCLKernelInfo.h"
#include "openquarn/gpu/HOpenCLUtils.h"
#include "openquarn_app/Plugins.h"

#include <fstream>

namespace gpuDeformers {
namespace {

std::string kernelFile;

constexpr const char* kernelSource = R"(
kernel void push(global float* out, global const float* in, global const uint* map, global const float* weights,
                 float distance, uint count) {
    size_t i = get_global_id(0);
    if (i >= count)
        return;
    size_t g = map ? map[i] : i;
    float3 p = vload3(g, in);
    p.x += distance * (weights ? weights[i] : 1.0f);
    vstore3(p, g, out);
}
)";

class Push final : public HPxGPUStandardDeformer {
public:
    Push() { ++Seen::alive; }
    ~Push() override { --Seen::alive; }

    using HPxGPUStandardDeformer::evaluate;
    DeformerStatus evaluate(HDataBlock& block, const HEvaluationNode& node, const HPlug& output,
                            const HPlugArray& inputs, const HGPUDeformerData& inputData,
                            HGPUDeformerData& outputData) override {
        ++Seen::evaluations;
        HOpenCLEvent event;
        const DeformerStatus status = prepareEvaluation(block, node, output, inputs, inputData, outputData, event);
        if (status != kDeformerSuccess)
            return status;
        prepareAffectMapBuffer();
        prepareWeightsBuffer(node);
        if (initializeOutputPositions(event) != CL_SUCCESS)
            return kDeformerFailure;
        const DeformerStatus made = hooks.deform ? hooks.deform(*this, inputData, block) : push(block, event);
        return made == kDeformerSuccess ? finishEvaluation(event, outputData) : made;
    }
    void terminate() override {
        ++Seen::terminations;
        kernel_.reset();
        HPxGPUStandardDeformer::terminate();
        if (hooks.terminate)
            hooks.terminate(*this);
    }

private:
    DeformerStatus push(HDataBlock& block, HOpenCLEvent& event) {
        const HFnDependencyNode node(dependencyNode());
        const auto distance = static_cast<float>(block.inputValue(node.attribute("push")).asDouble()) * envelope();
        const cl_uint count = affectCount();
        if (!kernel_.loadOrUpdate(HString(kernelFile), "push", count))
            return kDeformerFailure;
        cl_int status = CL_SUCCESS;
        kernel_.setKernelArgBuffer(0, outputPositions(), status);
        kernel_.setKernelArgBuffer(1, inputPositions(), status);
        kernel_.setKernelArgBuffer(2, affectMapBuffer(), status);
        kernel_.setKernelArgBuffer(3, weightsBuffer(), status);
        HOpenCLUtils::setKernelArg(kernel_, 4, sizeof distance, &distance, status);
        HOpenCLUtils::setKernelArg(kernel_, 5, sizeof count, &count, status);
        if (status == CL_SUCCESS)
            status = kernel_.enqueueKernel({event, affectMapBuffer().bufferReadyEvent()}, &event);
        return status == CL_SUCCESS ? kDeformerSuccess : kDeformerFailure;
    }

    HOpenCLKernelInfo kernel_;
};

class PushInfo final : public HGPUDeformerRegistrationInfo {
public:
    HPxGPUDeformer* createGPUDeformer() override { return hooks.create ? hooks.create() : makePush(); }
    bool validateNodeInGraph(HDataBlock&, const HObject&, const HPlug&, HStringArray* messages) override {
        return !hooks.validateGraph || hooks.validateGraph(messages);
    }
    bool validateNodeValues(HDataBlock&, const HObject&, const HPlug&, HStringArray* messages) override {
        return !hooks.validateValues || hooks.validateValues(messages);
    }
    HObject outputMeshAttribute(const HObject& node) const override {
        return hooks.outputMesh ? hooks.outputMesh(node) : HGPUDeformerRegistrationInfo::outputMeshAttribute(node);
    }
    void additionalInputMeshAttributes(const HObject& node, HObjectArray& attributes) const override {
        if (hooks.additional)
            hooks.additional(node, attributes);
    }
    bool matchAncestorLogicalIndices() const override { return hooks.matchesIndices; }
    HObject passThroughInputMeshAttribute(const HObject& node) const override {
        return hooks.passThroughMesh ? hooks.passThroughMesh(node)
                                     : HGPUDeformerRegistrationInfo::passThroughInputMeshAttribute(node);
    }
    bool isGeometryFilter() const override { return hooks.isGeometryFilter; }
};

PushInfo& info() {
    static PushInfo theInfo;
    return theInfo;
}

HStatus initializePlugin(HObject) {
    return HGPUDeformerRegistry::registerGPUDeformerCreator("testDeformer", "tests", &info());
}

HStatus uninitializePlugin(HObject) {
    return HGPUDeformerRegistry::deregisterGPUDeformerCreator("testDeformer", "tests");
}

} // namespace

HPxGPUDeformer* makePush() {
    return new Push;
}

void registerPush(const std::string& folder) {
    hooks = {};
    Seen::reset();
    kernelFile = folder + "/push.cl";
    std::ofstream(kernelFile) << kernelSource;
    OpenQuarn::addPlugin("gpuDeformers", initializePlugin, uninitializePlugin);
}

} // namespace gpuDeformers
