// SPDX-License-Identifier: Apache-2.0
#include "gpu/pipeline.h"

#include "core/threads.h"
#include "geometry/filterAttributes.h"
#include "gpu/Chain.h"
#include "gpu/GPUDeformers.h"
#include "gpu/activity.h"
#include "gpu/chainRun.h"
#include "gpu/failure.h"
#include "graph/Graph.h"
#include "graph/plugImpl.h"
#include "openquarn/HPxGeometryFilter.h"
#include "openquarn_app/Gpu.h"
#include "openquarn_app/Messages.h"

#include <atomic>
#include <utility>

namespace OpenQuarn {
namespace {

// the user has been told that there is no device
std::atomic<bool> saidNoDevice{false};

void sayOnce(GpuGeometry& gpu, const Slot& output, const std::string& reason) {
    if (!gpu.isFailing)
        showMessage(Severity::warning, "'" + output.name() + "' is evaluated on the CPU: " + reason);
    gpu.isFailing = true;
}

void sayNoDevice(GpuGeometry& gpu) {
    const std::string reason = takeFailure();
    // whoever was told that a frame failed has been told that the device has gone
    if (!std::exchange(gpu.isFailing, true) && !saidNoDevice.exchange(true))
        showMessage(Severity::warning, "deformers are evaluated on the CPU: " + reason);
}

/// Nothing of a failed frame stays on the device, nor the device where it does not answer any more (decision 0064).
void clearAfterFailure(const Chain& chain, const std::shared_ptr<Device>& device) {
    if (clFinish(device->queue) != CL_SUCCESS) // what was handed over may still be read until then
        closeDevice();
    for (const Link& link : chain.links)
        link.gpu().leaveDevice();
}

std::shared_ptr<MeshData> runOn(const std::shared_ptr<Device>& device, Chain& chain) {
    takeFailure(); // of before
    std::shared_ptr<MeshData> mesh = runChain(chain, device);
    const Link& last = chain.links.back();
    if (!mesh) {
        const std::string reason = takeFailure();
        clearAfterFailure(chain, device);
        sayOnce(last.gpu(), *last.output, reason.empty() ? "its GPU deformer failed" : reason);
        return nullptr;
    }
    for (const Link& link : chain.links) {
        link.gpu().isFailing = false;
        countEvaluation(true);
    }
    return mesh;
}

DeformerTraits traitsOf(const HGPUDeformerRegistrationInfo& info, const HObject& node) {
    DeformerTraits traits;
    traits.output = info.outputMeshAttribute(node);
    traits.input = info.inputMeshAttribute(node);
    traits.passThrough = info.passThroughInputMeshAttribute(node);
    info.additionalInputMeshAttributes(node, traits.additional);
    traits.matchesIndices = info.matchAncestorLogicalIndices();
    traits.isGeometryFilter = info.isGeometryFilter();
    return traits;
}

std::string joined(const HStringArray& texts) {
    std::string all;
    for (const HString& text : texts)
        all += (all.empty() ? "" : "; ") + text.asStdString();
    return all.empty() ? "its GPU deformer does not take it" : all;
}

/// Whether the plug-in lets the node be moved, as it is now.
bool isAccepted(GpuGeometry& gpu, const NodeData& data, HDataBlock& block, const Slot& output, std::string& refusal) {
    const HObject node = Access::object(data.node.shared_from_this());
    const HPlug plug = makePlug(output);
    HStringArray reasons;
    bool isAccepted = false;
    callPlugin(data.node, "validateNodeInGraph", [&] {
        isAccepted = gpu.info.validateNodeInGraph(block, node, plug, &reasons) &&
                     gpu.info.validateNodeValues(block, node, plug, &reasons);
        gpu.traits = traitsOf(gpu.info, node);
        return HStatus();
    });
    if (!isAccepted)
        refusal = joined(reasons);
    return isAccepted && gpu.traits.output == HPxGeometryFilter::outputGeom;
}

class Pipeline final : public GeometryDevice { // NOLINT(cppcoreguidelines-virtual-class-destructor): final
public:
    std::shared_ptr<MeshData> evaluate(NodeData& data, unsigned index, bool& failed) override;
    void evaluatedOnCpu(NodeData& data, HDataBlock& block, unsigned index, const HStatus& status,
                        bool isFallback) override;
};

constinit Pipeline pipeline;

std::shared_ptr<MeshData> Pipeline::evaluate(NodeData& data, unsigned index, bool& failed) {
    failed = false;
    std::optional<Chain> chain = findChain(data, index);
    if (!chain)
        return nullptr;
    failed = true;
    takeFailure();
    const std::shared_ptr<Device> device = currentDevice();
    if (!device) {
        sayNoDevice(chain->links.back().gpu());
        return nullptr;
    }
    saidNoDevice = false;
    std::shared_ptr<MeshData> mesh = runOn(device, *chain);
    failed = !mesh;
    return mesh;
}

void Pipeline::evaluatedOnCpu(NodeData& data, HDataBlock& block, unsigned index, const HStatus& status,
                              bool isFallback) {
    HGPUDeformerRegistrationInfo* info = findGPUDeformer(data.node.type().name);
    if (!info)
        return;
    countEvaluation(false, isFallback);
    GeometryState& state = *filterStateOf(data).geometry(index);
    if (!state.onDevice)
        state.onDevice = std::make_unique<GpuGeometry>(*info, data.node);
    auto& gpu = static_cast<GpuGeometry&>(*state.onDevice);
    gpu.isPrimed = false;
    if (status.error())
        return;
    gpu.primedValues = primingValues(data, index);
    const std::shared_ptr<Slot> output = elementOf(data, *filterAttributes().outputGeom, index);
    std::string refusal;
    gpu.isPrimed = output && isAccepted(gpu, data, block, *output, refusal);
    if (!refusal.empty())
        sayOnce(gpu, *output, refusal);
}

} // namespace

void takeFromDevice(const std::string& nodeType) {
    for (const Graph* graph : Graph::all())
        for (const std::shared_ptr<Node>& node : graph->nodes())
            if (node->data()->filterState && (nodeType.empty() || node->type().name == nodeType))
                filterStateOf(*node->data()).takeFromDevice();
}

void Gpu::setEnabled(bool enabled) {
    if (isRefused({"Gpu::setEnabled", ThreadTag::main}))
        return;
    if (!enabled)
        takeFromDevice("");
    GeometryDevice::setCurrent(enabled ? &pipeline : nullptr);
    saidNoDevice = false;
}

bool Gpu::isEnabled() noexcept {
    return GeometryDevice::current() != nullptr;
}

} // namespace OpenQuarn
