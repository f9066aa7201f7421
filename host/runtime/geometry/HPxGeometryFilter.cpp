// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HPxGeometryFilter.h"

#include "core/apiCall.h"
#include "geometry/filterAttributes.h"
#include "geometry/filterEvaluation.h"
#include "graph/Context.h"
#include "graph/arrayLock.h"
#include "graph/evaluation.h"
#include "openquarn/HPxDeformerNode.h"

using OpenQuarn::Access;
using OpenQuarn::apiValue;
using OpenQuarn::Operation;
using OpenQuarn::Slot;

HPxGeometryFilter::HPxGeometryFilter() = default;
HPxGeometryFilter::~HPxGeometryFilter() = default;

namespace {

// each geometry by itself, so that none is computed by two threads at once
HStatus evaluateAll(const OpenQuarn::NodeData& data) {
    const auto outputs = data.slot(*data.node.type().find(*OpenQuarn::filterAttributes().outputGeom));
    std::vector<std::shared_ptr<Slot>> elements;
    {
        const OpenQuarn::ArrayReadLock lock(outputs->owner);
        elements.reserve(outputs->elements().size());
        outputs->elements().forEach([&](unsigned, const std::shared_ptr<Slot>& slot) { elements.push_back(slot); });
    }
    HStatus first;
    for (const std::shared_ptr<Slot>& element : elements) {
        const HStatus status = pull(element);
        if (!first.error())
            first = status;
    }
    return first;
}

} // namespace

HStatus HPxGeometryFilter::compute(const HPlug& plug, HDataBlock& block) {
    if (!(plug == outputGeom))
        return HStatus::kUnknownParameter;
    const std::shared_ptr<OpenQuarn::NodeData>& data = Access::impl(block);
    if (!data || data->isGone())
        return {HStatus::kInvalidParameter, "the data block belongs to no node, or to one that has gone"};
    return plug.isArray() ? evaluateAll(*data) : OpenQuarn::evaluateGeometry(*this, *data, block, plug.logicalIndex());
}

HStatus HPxGeometryFilter::initializeMultiIndex(HDataBlock&, unsigned, bool) {
    return HStatus::kSuccess;
}

HStatus HPxGeometryFilter::deform(HDataBlock&, HItGeometry&, const HMatrix&, unsigned) {
    return HStatus::kSuccess;
}

HIndexMapper HPxGeometryFilter::indexMapper(unsigned multiIndex, HStatus* status) const {
    return apiValue(Operation::HPxGeometryFilter_indexMapper, status, HIndexMapper(), [&](HStatus& outcome) {
        const auto node = Access::as<OpenQuarn::Node>(thisHObject());
        if (!node) {
            outcome = {HStatus::kInvalidParameter, "the node is none of the scene"};
            return HIndexMapper();
        }
        return Access::make<HIndexMapper>(
            OpenQuarn::affectedVertices(*dataIn(OpenQuarn::currentContext(), *node), multiIndex, outcome));
    });
}

// --- HPxDeformerNode ---

HPxDeformerNode::HPxDeformerNode() = default;
HPxDeformerNode::~HPxDeformerNode() = default;

HObject HPxDeformerNode::getNamedBuffer(const HString&, unsigned) {
    return {};
}

void HPxDeformerNode::primingAttributes(HObjectArray&) const {}

bool HPxDeformerNode::isDueOnCpu(HDataBlock&, unsigned) {
    return false;
}

const float* HPxDeformerNode::envelopeWeights(HDataBlock& block, unsigned multiIndex, HStatus* status) {
    const float* none = nullptr;
    return apiValue(Operation::HPxDeformerNode_envelopeWeights, status, none, [&](HStatus& outcome) {
        const std::shared_ptr<OpenQuarn::NodeData>& data = Access::impl(block);
        if (!data || data->isGone() || Access::pointer(thisHObject()).get() != &data->node) {
            outcome = {HStatus::kInvalidParameter, "the data block is not one of node '" + name().asStdString() + "'"};
            return none;
        }
        const auto affected = OpenQuarn::affectedVertices(*data, multiIndex, outcome);
        if (!affected)
            return none;
        const auto element = elementOf(*data, *OpenQuarn::filterAttributes().weightList, multiIndex);
        const std::shared_ptr<Slot> list = element ? element->children().front() : nullptr;
        if (list)
            pull(list);
        return OpenQuarn::filterStateOf(*data).geometry(multiIndex)->weights(list.get(), affected);
    });
}
