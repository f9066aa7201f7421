// SPDX-License-Identifier: Apache-2.0
#include "rig/blendShapeNode.h"

#include "openquarn_helpers/AttributeMaker.h"
#include "openquarn_helpers/guard.h"

#include "rig/Inputs.h"
#include "rig/ShapeState.h"
#include "rig/listChecks.h"
#include "rig/shapeWeights.h"
#include "rig/texts.h"

#include <algorithm>
#include <string>

namespace rig {

using openquarn_helpers::AttributeMaker;
using openquarn_helpers::guarded;

using Node = blendShapeNode;

const HTypeId Node::id(0x6e770014);
const HString Node::typeName("blendShape");

HObject Node::weight;
HObject Node::combination;
HObject Node::factors;
HObject Node::ramps;
HObject Node::shapes;
HObject Node::shape;
HObject Node::vertices;
HObject Node::deltas;

blendShapeNode::blendShapeNode() = default;
blendShapeNode::~blendShapeNode() = default;

HPxNode* blendShapeNode::create() {
    return new (std::nothrow) blendShapeNode;
}

HStatus blendShapeNode::initialize() {
    constexpr openquarn_helpers::AttributeFlags list{.array = true};
    AttributeMaker make;
    weight = make.real("weight", "w", 0.0, list);
    factors = make.data("factors", "fac", HFnData::kDoubleArray);
    ramps = make.data("ramps", "rmp", HFnData::kDoubleArray);
    combination = make.compound("combination", "cmb", {factors, ramps}, list);
    vertices = make.data("vertices", "vtx", HFnData::kDoubleArray);
    deltas = make.data("deltas", "dlt", HFnData::kDoubleArray);
    shape = make.compound("shape", "shp", {vertices, deltas}, list);
    shapes = make.compound("shapes", "shs", {shape}, list);
    make.add({weight, combination, shapes});
    make.affects({weight, combination, shapes}, {outputGeom}, true);
    return make.status();
}

ShapeState& blendShapeNode::stateOf(unsigned multiIndex) {
    const std::lock_guard lock(statesMutex_);
    std::unique_ptr<ShapeState>& state = states_[multiIndex];
    if (!state)
        state = std::make_unique<ShapeState>();
    return *state;
}

namespace {

/// The shapes of one geometry; without elements when it has none.
HArrayDataHandle shapesOf(HDataBlock& block, unsigned multiIndex, HStatus& status) {
    HArrayDataHandle geometries = block.outputArrayValue(Node::shapes, &status); // evaluates no other geometry's
    if (status.error() || geometries.elementCount() == 0 || geometries.jumpToElement(multiIndex).error())
        return {};
    const HDataHandle geometry = geometries.inputValue(&status);
    return status.error() ? HArrayDataHandle() : geometry.childArray(Node::shape, &status);
}

/// Makes the shape anew where its lists are others.
void updateShape(std::uint32_t index, const HDataHandle& lists, KeptShape& kept) {
    HObject vertices = lists.child(Node::vertices).data();
    HObject values = lists.child(Node::deltas).data();
    if (kept.isCurrent && kept.index == index && kept.vertices == vertices && kept.values == values)
        return;
    kept.isCurrent = false; // until all of it has come through: it may throw
    kept.index = index;
    kept.deltas = {};
    kept.status =
        makeShapeDeltas(HFnDoubleArrayData(vertices).values(), HFnDoubleArrayData(values).values(), kept.deltas);
    kept.vertices = std::move(vertices);
    kept.values = std::move(values);
    kept.isCurrent = true;
}

HStatus checkShape(const KeptShape& kept, unsigned vertices) {
    HStatus status = kept.status;
    if (!status.error() && kept.deltas.extent() > vertices)
        status = wrong("it moves vertex " + std::to_string(kept.deltas.extent() - 1) + "; the geometry has " +
                       std::to_string(vertices) + " vertices");
    return status.error() ? wrong(element("shape", kept.index) + ": " + status.errorString().asStdString()) : status;
}

HStatus updateShapes(HArrayDataHandle elements, unsigned vertices, ShapeState& state) {
    const unsigned count = elements.elementCount();
    state.shapes.resize(count);
    HStatus status;
    for (unsigned i = 0; i < count && !status.error(); ++i) {
        status = elements.jumpToPosition(i);
        const HDataHandle lists = status.error() ? HDataHandle() : elements.inputValue(&status);
        if (status.error())
            return status;
        updateShape(elements.elementIndex(), lists, state.shapes[i]);
        status = checkShape(state.shapes[i], vertices);
    }
    return status;
}

/// The shapes that have a weight; both lists ascend.
void chooseActive(const std::vector<ShapeWeight>& weights, ShapeState& state) {
    state.active.clear();
    auto weight = weights.begin();
    for (const KeptShape& kept : state.shapes) {
        weight = std::find_if(weight, weights.end(), [&](const ShapeWeight& at) { return at.shape >= kept.index; });
        if (weight != weights.end() && weight->shape == kept.index && weight->value != 0.0)
            state.active.push_back({&kept.deltas, weight->value});
    }
}

HStatus named(const HStatus& status, unsigned multiIndex) {
    if (!status.error())
        return status;
    return {status.statusCode(), "geometry " + std::to_string(multiIndex) + ": " + status.errorString().asStdString()};
}

} // namespace

HStatus blendShapeNode::deformByShapes(HDataBlock& block, HItGeometry& iterator, ShapeState& state,
                                       unsigned multiIndex) {
    Inputs inputs(block);
    const double amount = static_cast<double>(inputs.handle(envelope).asFloat());
    HStatus status = inputs.status();
    if (status.error() || amount == 0.0)
        return status;
    const HArrayDataHandle elements = shapesOf(block, multiIndex, status);
    if (status.error() || !elements.isValid())
        return status;
    const HIndexMapper affected = indexMapper(multiIndex, &status);
    if (!status.error())
        status = updateShapes(elements, affected.fullCount(), state);
    std::vector<ShapeWeight> ofShapes;
    if (!status.error())
        status = readShapeWeights(block, ofShapes);
    const float* pointWeights = status.error() ? nullptr : envelopeWeights(block, multiIndex, &status);
    if (status.error())
        return status;
    chooseActive(ofShapes, state);
    if (state.active.empty())
        return status;
    status = iterator.allPositions(state.points);
    if (status.error())
        return status;
    addShapes({state.active, affected.fullCount(), affected.affectMap(), pointWeights, amount}, state.sums,
              state.points);
    return iterator.setAllPositions(state.points);
}

HStatus blendShapeNode::deform(HDataBlock& block, HItGeometry& iterator, const HMatrix&, unsigned multiIndex) {
    return guarded([&] { return named(deformByShapes(block, iterator, stateOf(multiIndex), multiIndex), multiIndex); });
}

} // namespace rig
