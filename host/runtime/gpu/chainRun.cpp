// SPDX-License-Identifier: Apache-2.0
#include "gpu/chainRun.h"

#include "geometry/filterAttributes.h"
#include "geometry/filterEvaluation.h"
#include "gpu/activity.h"
#include "gpu/deformerImpl.h"
#include "gpu/failure.h"
#include "gpu/programs.h"
#include "gpu/transfer.h"
#include "graph/arrayLock.h"
#include "graph/plugImpl.h"
#include "openquarn/HDataBlock.h"

#include <exception>

namespace OpenQuarn {
namespace {

using Status = HPxGPUDeformer::DeformerStatus;

class ChainRun {
public:
    ChainRun(Chain& chain, const std::shared_ptr<Device>& device)
        : chain_(chain)
        , device_(device)
        , mesh_(chain.mesh) {}

    std::shared_ptr<MeshData> run() {
        GpuGeometry& first = chain_.links.front().gpu();
        if (!first.enterDevice(device_) || first.input.bring(*chain_.mesh->points) != CL_SUCCESS)
            return nullptr;
        positions_ = first.input.buffer;
        for (Link& link : chain_.links)
            if (!runLink(link))
                return nullptr;
        std::shared_ptr<MeshData> result = mesh_ ? mesh_ : downloaded();
        timesMeasured();
        return result;
    }

private:
    bool runLink(Link& link) {
        GpuGeometry& gpu = link.gpu();
        if (!gpu.enterDevice(device_))
            return false;
        describe(link, *Access::impl(*gpu.deformer));
        const HPlug output = makePlug(*link.output);
        const HPlugArray inputs = inputPlugs(link);
        gpu.inputData.clear();
        gpu.inputData.setBuffer(inputs.front(), HPxGPUDeformer::sPositionsName, positions_);
        supplyAdditional(link);
        switch (evaluate(link, output, inputs)) {
        case HPxGPUDeformer::kDeformerSuccess:
            return takeOutput(gpu, output);
        case HPxGPUDeformer::kDeformerPassThrough:
            return passThrough(link);
        default:
            return false;
        }
    }

    static void describe(const Link& link, HPxGPUDeformer::Impl& about) {
        about.node = Access::object(link.node);
        about.multiIndex = link.index;
        about.affected = link.affected;
        about.isGeometryFilter = link.gpu().traits.isGeometryFilter;
        about.weights = about.isGeometryFilter ? weightsOf(link) : nullptr;
        about.weightsVersion = link.state->weightsVersion();
    }

    static const float* weightsOf(const Link& link) {
        const std::shared_ptr<Slot> element = elementOf(*link.data, *filterAttributes().weightList, link.index);
        const std::shared_ptr<Slot> list = element ? element->children().front() : nullptr;
        if (list)
            pull(list);
        return link.state->weights(list.get(), link.affected);
    }

    /// That of the geometry; for a deformer that makes an output of all inputs, the others after it.
    static HPlugArray inputPlugs(const Link& link) {
        HPlugArray plugs{makePlug(*link.geometry)};
        if (link.gpu().traits.matchesIndices)
            return plugs;
        const std::shared_ptr<Slot> all = link.input->parent->shared_from_this();
        const ArrayReadLock lock(all->owner);
        all->elements().forEach([&](unsigned index, const std::shared_ptr<Slot>& element) {
            for (const std::shared_ptr<Slot>& part : element->children())
                if (index != link.index && part->field.attribute == link.geometry->field.attribute)
                    plugs.push_back(makePlug(*part));
        });
        return plugs;
    }

    static void supplyAdditional(const Link& link) {
        GpuGeometry& gpu = link.gpu();
        gpu.additional.resize(gpu.traits.additional.length());
        for (unsigned i = 0; i < gpu.traits.additional.length(); ++i) {
            const std::shared_ptr<Slot> slot = slotOfGeometry(*link.data, gpu.traits.additional[i], link.index);
            if (slot)
                gpu.inputData.setSupplier(
                    makePlug(*slot), HPxGPUDeformer::sPositionsName,
                    [slot, &kept = gpu.additional[i]](cl_int& status) { return meshOnDevice(slot, kept, status); });
        }
    }

    static HOpenCLBuffer meshOnDevice(const std::shared_ptr<Slot>& slot, DevicePositions& kept, cl_int& status) {
        const std::shared_ptr<MeshData> mesh = evaluatedMesh(slot);
        if (!mesh)
            return {};
        status = kept.bring(*mesh->points);
        return status == CL_SUCCESS ? kept.buffer : HOpenCLBuffer();
    }

    Status evaluate(const Link& link, const HPlug& output, const HPlugArray& inputs) const {
        GpuGeometry& gpu = link.gpu();
        auto block = Access::make<HDataBlock>(link.data);
        const HEvaluationNode evaluationNode(Access::object(link.node));
        Status status = HPxGPUDeformer::kDeformerFailure;
        const OutsideOfGraph outside;
        const TimedStep step(*device_, "deform");
        callPlugin(*link.node, "evaluate", [&] {
            status = gpu.deformer->evaluate(block, evaluationNode, output, inputs, gpu.inputData, gpu.outputData);
            return HStatus();
        });
        return status;
    }

    bool takeOutput(const GpuGeometry& gpu, const HPlug& output) {
        positions_ = gpu.outputData.getBuffer(output, HPxGPUDeformer::sPositionsName);
        mesh_ = nullptr;
        if (positions_.bufferSize() == std::size_t{chain_.mesh->vertexCount()} * 3 * sizeof(float))
            return true;
        noteFailure("its GPU deformer gave no positions");
        return false;
    }

    /// The geometry goes on as it came in, or as another attribute of the node has it.
    bool passThrough(const Link& link) {
        GpuGeometry& gpu = link.gpu();
        if (gpu.traits.passThrough == gpu.traits.input)
            return true;
        const std::shared_ptr<MeshData> mesh =
            evaluatedMesh(slotOfGeometry(*link.data, gpu.traits.passThrough, link.index));
        if (!mesh || mesh->vertexCount() != chain_.mesh->vertexCount()) {
            noteFailure("what its GPU deformer passes through is no mesh of " +
                        std::to_string(chain_.mesh->vertexCount()) + " vertices");
            return false;
        }
        mesh_ = mesh;
        const bool isUploaded = gpu.passedThrough.bring(*mesh->points) == CL_SUCCESS;
        positions_ = gpu.passedThrough.buffer;
        return isUploaded;
    }

    std::shared_ptr<MeshData> downloaded() const {
        const std::shared_ptr<Positions> points = chain_.links.back().state->pool->take(chain_.mesh->vertexCount());
        if (downloadPositions(positions_, *points) != CL_SUCCESS)
            return nullptr;
        return chain_.mesh->withPositions(points);
    }

    Chain& chain_;
    const std::shared_ptr<Device>& device_;
    HOpenCLBuffer positions_;        ///< after the last link so far
    std::shared_ptr<MeshData> mesh_; ///< the same in the host's memory; null when it is on the device alone
};

} // namespace

std::shared_ptr<MeshData> runChain(Chain& chain, const std::shared_ptr<Device>& device) {
    try {
        const OneLook look;
        return ChainRun(chain, device).run();
    } catch (const std::exception& error) { // no memory: the CPU's evaluation may do with less
        noteFailure(error.what());
        return nullptr;
    }
}

} // namespace OpenQuarn
