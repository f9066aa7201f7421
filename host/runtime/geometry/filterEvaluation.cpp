// SPDX-License-Identifier: Apache-2.0
#include "geometry/filterEvaluation.h"

#include "geometry/GeometryDevice.h"
#include "geometry/GeometryPoints.h"
#include "geometry/filterAttributes.h"
#include "graph/Context.h"
#include "graph/evaluation.h"
#include "graph/values.h"

namespace OpenQuarn {

std::shared_ptr<MeshData> evaluatedMesh(const std::shared_ptr<Slot>& slot) {
    if (!slot)
        return nullptr;
    pull(slot); // what fails further up is reported there: the last mesh is taken
    return std::dynamic_pointer_cast<MeshData>(slot->data);
}

std::shared_ptr<Slot> childOf(const Slot& element, const Attribute& attribute) {
    for (const std::shared_ptr<Slot>& part : element.children())
        if (part->field.attribute.get() == &attribute)
            return part;
    return nullptr;
}

namespace {

std::shared_ptr<Data> evaluatedExpression(const Slot& input) {
    const std::shared_ptr<Slot> slot = childOf(input, *filterAttributes().componentTagExpression);
    pull(slot);
    return slot->data;
}

/// What the slot, or the nearest one above it, is connected from.
std::weak_ptr<Slot> connectionInto(const Slot* slot) {
    for (; slot; slot = slot->parent)
        if (const std::shared_ptr<Slot> source = sourceInContext(*slot))
            return source;
    return {};
}

/// Null, with the status set, when there is no such component tag.
std::shared_ptr<const IndexMap> resolve(GeometryState& state, const Slot& input, const MeshData& mesh,
                                        HStatus& status) {
    const std::shared_ptr<Data> expression = evaluatedExpression(input);
    std::shared_ptr<const IndexMap> affected = state.affectedVertices(mesh, expression);
    if (!affected)
        status = {HStatus::kFailure, "'" + childOf(input, *filterAttributes().componentTagExpression)->name() +
                                         "': geometry " + std::to_string(input.index) + " has no component tag '" +
                                         static_cast<const StringData&>(*expression).value + "'"};
    return affected;
}

/// One evaluation of one geometry that has a mesh.
class Evaluation {
public:
    Evaluation(HPxGeometryFilter& filter, NodeData& data, HDataBlock& block, unsigned index)
        : filter_(filter)
        , data_(data)
        , block_(block)
        , index_(index)
        , state_(filterStateOf(data).geometry(index)) {}

    HStatus run(const Slot& input, const std::shared_ptr<MeshData>& mesh, Slot& output) {
        HStatus status;
        std::optional<GeometrySources> sources = sourcesOf(data_, index_, input, *mesh, status);
        if (!sources)
            return status;
        const std::shared_ptr<const IndexMap> affected = sources->affected;
        status = initialize(std::move(*sources));
        if (status.error())
            return status;
        GeometryPoints points(mesh, affected, state_->pool);
        status = deform(points);
        if (!status.error())
            output.data = points.result();
        return status;
    }

private:
    HStatus initialize(GeometrySources now) {
        if (state_->isStale(now)) {
            state_->notInitialized();
            HStatus status = callPlugin(data_.node, "initializeMultiIndex",
                                        [&] { return filter_.initializeMultiIndex(block_, index_, true); });
            if (status.error())
                return status;
        }
        state_->initializedFrom(std::move(now)); // shares what was compared, so that it need not be compared again
        return HStatus::kSuccess;
    }

    HStatus deform(GeometryPoints& points) {
        const OutsideOfGraph outside;
        auto iterator = Access::make<HItGeometry>(points);
        return callPlugin(data_.node, "deform", [&] { return filter_.deform(block_, iterator, HMatrix(), index_); });
    }

    HPxGeometryFilter& filter_;
    NodeData& data_;
    HDataBlock& block_;
    const unsigned index_;
    const std::shared_ptr<GeometryState> state_;
};

} // namespace

std::optional<GeometrySources> sourcesOf(const NodeData& data, unsigned index, const Slot& input, const MeshData& mesh,
                                         HStatus& status) {
    GeometrySources now;
    now.affected = resolve(*filterStateOf(data).geometry(index), input, mesh, status);
    if (!now.affected)
        return {};
    const std::shared_ptr<Slot> rest = elementOf(data, *filterAttributes().originalGeometry, index);
    const std::shared_ptr<MeshData> restMesh = evaluatedMesh(rest);
    now.inputConnection = connectionInto(childOf(input, *filterAttributes().inputGeometry).get());
    now.restConnection = connectionInto(rest.get());
    now.input = mesh.topology;
    if (restMesh) {
        now.rest = restMesh->topology;
        now.restPoints = restMesh->points;
    }
    now.expression = textIn(*childOf(input, *filterAttributes().componentTagExpression));
    return now;
}

namespace {

thread_local int withoutDevice = 0;

/// Has everything on this thread evaluated on the CPU, for as long as it lives.
class CpuOnly {
public:
    explicit CpuOnly(bool on)
        : count_(on ? 1 : 0) {
        withoutDevice += count_;
    }
    ~CpuOnly() { withoutDevice -= count_; }
    CpuOnly(const CpuOnly&) = delete;
    CpuOnly& operator=(const CpuOnly&) = delete;

private:
    int count_;
};

/// Null for none: contexts are evaluated on the CPU.
GeometryDevice* deviceFor(const NodeData& data) {
    return data.context ? nullptr : GeometryDevice::current();
}

HStatus evaluateOnCpu(HPxGeometryFilter& filter, NodeData& data, HDataBlock& block, Slot& output, bool deviceFailed) {
    const CpuOnly cpuOnly(deviceFailed);
    const FilterAttributes& attributes = filterAttributes();
    const unsigned index = output.index;
    const std::shared_ptr<Slot> input = elementOf(data, *attributes.input, index);
    const std::shared_ptr<MeshData> mesh = input ? evaluatedMesh(childOf(*input, *attributes.inputGeometry)) : nullptr;
    output.data = mesh; // what stays when something fails
    if (!mesh) {
        filterStateOf(data).forget(index);
        return HStatus::kSuccess;
    }
    HStatus status = Evaluation(filter, data, block, index).run(*input, mesh, output);
    if (GeometryDevice* device = deviceFor(data))
        device->evaluatedOnCpu(data, block, index, status, deviceFailed);
    return status;
}

} // namespace

HStatus evaluateGeometry(HPxGeometryFilter& filter, NodeData& data, HDataBlock& block, unsigned index) {
    const FilterAttributes& attributes = filterAttributes();
    const std::shared_ptr<Slot> output = elementOf(data, *attributes.outputGeom, index);
    if (!output)
        return {HStatus::kFailure, "'" + data.node.name() + ".outputGeom[" + std::to_string(index) + "]' is not there"};
    bool deviceFailed = false;
    HStatus status;
    GeometryDevice* device = withoutDevice == 0 ? deviceFor(data) : nullptr;
    if (const std::shared_ptr<MeshData> deformed = device ? device->evaluate(data, index, deviceFailed) : nullptr)
        output->data = deformed;
    else
        status = evaluateOnCpu(filter, data, block, *output, deviceFailed);
    output->markClean();
    return status;
}

std::shared_ptr<const IndexMap> affectedVertices(const NodeData& data, unsigned index, HStatus& status) {
    const FilterAttributes& attributes = filterAttributes();
    const std::shared_ptr<Slot> input = elementOf(data, *attributes.input, index);
    const std::shared_ptr<MeshData> mesh = input ? evaluatedMesh(childOf(*input, *attributes.inputGeometry)) : nullptr;
    if (!mesh)
        return std::make_shared<IndexMap>();
    return resolve(*filterStateOf(data).geometry(index), *input, *mesh, status);
}

} // namespace OpenQuarn
