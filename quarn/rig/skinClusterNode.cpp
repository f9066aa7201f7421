// SPDX-License-Identifier: Apache-2.0
#include "rig/skinClusterNode.h"

#include "openquarn_helpers/AttributeMaker.h"
#include "openquarn_helpers/guard.h"

#include "rig/Inputs.h"
#include "rig/SkinState.h"
#include "rig/texts.h"

namespace rig {

using openquarn_helpers::AttributeMaker;
using openquarn_helpers::guarded;

using Node = skinClusterNode;

const HTypeId Node::id(0x6e770011);
const HString Node::typeName("skinCluster");

HObject Node::matrix;
HObject Node::bindPreMatrix;
HObject Node::skin;
HObject Node::influenceCounts;
HObject Node::influences;
HObject Node::skinWeights;
HObject Node::normalize;

skinClusterNode::skinClusterNode() = default;
skinClusterNode::~skinClusterNode() = default;

HPxNode* skinClusterNode::create() {
    return new (std::nothrow) skinClusterNode;
}

HStatus skinClusterNode::initialize() {
    constexpr openquarn_helpers::AttributeFlags list{.array = true};
    AttributeMaker make;
    matrix = make.data("matrix", "m", HFnData::kMatrix, list);
    bindPreMatrix = make.matrix("bindPreMatrix", "bpm", list);
    influenceCounts = make.data("influenceCounts", "ifc", HFnData::kDoubleArray);
    influences = make.data("influences", "ifl", HFnData::kDoubleArray);
    skinWeights = make.data("skinWeights", "skw", HFnData::kDoubleArray);
    skin = make.compound("skin", "skn", {influenceCounts, influences, skinWeights}, list);
    normalize = make.boolean("normalize", "nrm", true);
    make.add({matrix, bindPreMatrix, skin, normalize});
    make.affects({matrix, bindPreMatrix, skin, normalize}, {outputGeom}, true);
    return make.status();
}

SkinState& skinClusterNode::stateOf(unsigned multiIndex) {
    const std::lock_guard lock(statesMutex_);
    std::unique_ptr<SkinState>& state = states_[multiIndex];
    if (!state)
        state = std::make_unique<SkinState>();
    return *state;
}

namespace {

/// The element of one geometry; invalid, which has no lists, when it has none.
HDataHandle listsOf(HDataBlock& block, unsigned multiIndex, HStatus& status) {
    HArrayDataHandle skins = block.outputArrayValue(Node::skin, &status); // evaluates no other geometry's
    const bool isThere = !status.error() && !skins.jumpToElement(multiIndex).error();
    return isThere ? skins.inputValue(&status) : HDataHandle();
}

void makeSkin(SkinSource source, SkinState& state) {
    const std::vector<double> counts = HFnDoubleArrayData(source.counts).values();
    const std::vector<double> influences = HFnDoubleArrayData(source.influences).values();
    const std::vector<double> weights = HFnDoubleArrayData(source.weights).values();
    state.status = makeSkinWeights({counts, influences, weights}, source.normalize, state.skin);
    state.source = std::move(source);
    state.isCurrent = true;
}

HStatus updateSkin(const HDataHandle& lists, bool normalize, SkinState& state) {
    SkinSource now{lists.child(Node::influenceCounts).data(), lists.child(Node::influences).data(),
                   lists.child(Node::skinWeights).data(), normalize};
    if (!state.isCurrent || now != state.source) {
        state.isCurrent = false; // until the next line has come through: it may throw
        makeSkin(std::move(now), state);
    }
    return state.status;
}

HStatus checkVertexCount(const SkinState& state, unsigned vertices) {
    if (state.skin.vertexCount() == vertices)
        return HStatus::kSuccess;
    return {HStatus::kFailure, "influenceCounts has " + std::to_string(state.skin.vertexCount()) +
                                   " values; the geometry has " + std::to_string(vertices) + " vertices"};
}

HStatus readJoint(HArrayDataHandle& matrices, std::uint32_t index, HMatrix& joint) {
    HStatus status = matrices.jumpToElement(index);
    if (status.error())
        return {HStatus::kFailure,
                "an influence is " + std::to_string(index) + ", but there is no " + element("matrix", index)};
    const HDataHandle value = matrices.inputValue(&status);
    if (status.error())
        return status;
    const HFnMatrixData data(value.data(), &status);
    if (status.error())
        return {HStatus::kFailure, element("matrix", index) + " holds no matrix"};
    joint = data.matrix();
    return status;
}

/// bindPreMatrix[index] * matrix[index]; without a bindPreMatrix, matrix[index].
HStatus readBoundJoint(HArrayDataHandle& matrices, HArrayDataHandle& binds, std::uint32_t index, Affine& bound) {
    HMatrix joint;
    HStatus status = readJoint(matrices, index, joint);
    // asked first: a failing jump makes a text, and this is done on every frame
    if (!status.error() && binds.elementCount() > 0 && !binds.jumpToElement(index).error())
        joint = binds.inputValue(&status).asMatrix() * joint;
    bound = affineOf(joint);
    return status;
}

HStatus readJoints(HDataBlock& block, SkinState& state) {
    HStatus status;
    HArrayDataHandle matrices = block.outputArrayValue(Node::matrix, &status);
    if (status.error())
        return status;
    HArrayDataHandle binds = block.outputArrayValue(Node::bindPreMatrix, &status);
    state.joints.resize(state.skin.joints.size());
    for (std::size_t i = 0; i < state.joints.size() && !status.error(); ++i)
        status = readBoundJoint(matrices, binds, state.skin.joints[i], state.joints[i]);
    return status;
}

HStatus named(const HStatus& status, unsigned multiIndex) {
    if (!status.error())
        return status;
    return {status.statusCode(), "geometry " + std::to_string(multiIndex) + ": " + status.errorString().asStdString()};
}

} // namespace

HStatus skinClusterNode::deformSkinned(HDataBlock& block, HItGeometry& iterator, SkinState& state,
                                       unsigned multiIndex) {
    Inputs inputs(block);
    const double amount = static_cast<double>(inputs.handle(envelope).asFloat());
    const bool normalized = inputs.boolean(normalize);
    HStatus status = inputs.status();
    if (status.error() || amount == 0.0)
        return status;
    const HDataHandle lists = listsOf(block, multiIndex, status);
    if (!status.error())
        status = updateSkin(lists, normalized, state);
    if (status.error() || state.skin.vertexCount() == 0)
        return status;
    const HIndexMapper affected = indexMapper(multiIndex, &status);
    if (!status.error())
        status = checkVertexCount(state, affected.fullCount());
    if (!status.error())
        status = readJoints(block, state);
    const float* pointWeights = status.error() ? nullptr : envelopeWeights(block, multiIndex, &status);
    if (!status.error())
        status = iterator.allPositions(state.points);
    if (status.error())
        return status;
    blendPoints({state.skin, state.joints, affected.affectMap(), pointWeights, amount}, state.points);
    return iterator.setAllPositions(state.points);
}

HStatus skinClusterNode::deform(HDataBlock& block, HItGeometry& iterator, const HMatrix&, unsigned multiIndex) {
    return guarded([&] { return named(deformSkinned(block, iterator, stateOf(multiIndex), multiIndex), multiIndex); });
}

} // namespace rig
