// SPDX-License-Identifier: Apache-2.0
// What a geometry is led towards: the target of its training deltas, and that of its morph.
#include "deformer/geometryReaders.h"
#include "deformer/neuralWarpNode.h"
#include "deformer/neuralWarpUtils.h"
#include "messages/displayErrorGated.h"
#include "messages/messageText.h"
#include "messages/sourceUnits.h"
#include "openquarn/HFnGeometryData.h"

#include <cmath>
#include <string>
#include <utility>

namespace neuralWarp {
namespace {

/// Below this, a target morph is off.
constexpr double smallestMorphEnvelope = 1e-6;

/// A handle on a plug's evaluated data, given back in every case.
struct PlugData {
    explicit PlugData(HPlug source)
        : plug(std::move(source))
        , handle(plug.asHDataHandle()) {}
    ~PlugData() { plug.destructHandle(handle); }
    PlugData(const PlugData&) = delete;
    PlugData& operator=(const PlugData&) = delete;

    const HPlug plug;
    HDataHandle handle;
};

HStatus readMorphPoints(const neuralWarpNode& node, HDataBlock& block, std::uint32_t multiIndex, Points& points) {
    const neuralWarpData* data = fetchNodeData(block, multiIndex);
    if (!data)
        return {HStatus::kFailure, "there is no state to morph geometry " + std::to_string(multiIndex) + " by"};
    HStatus status;
    HArrayDataHandle targets = block.inputArrayValue(neuralWarpNode::targetMorphGeometry, &status);
    if (status.error())
        return reported(status, sourceUnit::node);
    status = targets.jumpToArrayElement(multiIndex);
    if (status.error()) {
        raiseMessage<Text::kErrorMLTargetInvalid>(displayErrorGated);
        return status;
    }
    const HDataHandle target = targets.inputValue(&status);
    if (status.error())
        return reported(status, sourceUnit::node);
    if (target.type() != HFnData::kMesh) {
        raiseMessage<Text::kErrorMLTargetInvalid>(displayErrorGated);
        return {HStatus::kFailure, "the target of the morph is no mesh"};
    }
    readGeometryPoints(target, points, data->componentMap);
    if (points.size() == data->componentMap.affectCount())
        return HStatus::kSuccess;
    raiseMessage<Text::kErrorMLTargetMismatch>(displayErrorGated, points.size(),
                                               node.indexMapper(multiIndex).fullCount());
    return {HStatus::kFailure, "the target of the morph has fewer vertices than the geometry"};
}

} // namespace

HStatus neuralWarpNode::readTargetPoints(const neuralWarpData& data, std::uint32_t multiIndex, Points& points) {
    HPlug element(thisHObject(), targetGeometry);
    HStatus status = element.selectAncestorLogicalIndex(multiIndex);
    const HPlug source = status.error() ? HPlug() : element.source(&status);
    if (status.error() || source.isNull()) {
        raiseMessage<Text::kErrorMLNoTarget>(displayErrorGated);
        return {HStatus::kFailure, "nothing is connected into targetGeometry[" + std::to_string(multiIndex) + "]"};
    }
    const PlugData target(source);
    const HFnGeometryData targetData(target.handle.data(), &status);
    if (status.error())
        return reported(status, sourceUnit::node);
    readGeometryPoints(target.handle, points, data.componentMap);
    return HStatus::kSuccess;
}

bool neuralWarpNode::readTargetMorph(HDataBlock& block, std::uint32_t multiIndex, double& morphEnvelope, Points& points,
                                     HStatus& status) {
    morphEnvelope = 0.0;
    const bool isEnabled = block.inputValue(targetMorphEnabled, &status).asBool();
    if (reported(status, sourceUnit::node).error() || !isEnabled)
        return false;
    const double wanted = block.inputValue(targetMorphEnvelope, &status).asDouble();
    if (reported(status, sourceUnit::node).error())
        return false;
    if (std::abs(wanted) < smallestMorphEnvelope) {
        morphEnvelope = wanted;
        return false;
    }
    status = readMorphPoints(*this, block, multiIndex, points);
    if (status.error())
        return false;
    morphEnvelope = wanted;
    return true;
}

} // namespace neuralWarp
