// SPDX-License-Identifier: Apache-2.0
// The geometry side of the node: input, rest state, targets.
#include "deformer/geometryReaders.h"
#include "deformer/neuralWarpNode.h"
#include "deformer/neuralWarpUtils.h"
#include "messages/displayErrorGated.h"
#include "messages/messageText.h"
#include "messages/sourceUnits.h"
#include "openquarn/HFnGeometryData.h"
#include "openquarn/HFnMesh.h"
#include "openquarn/HProfilingScope.h"
#include "quill/parallelFor.h"

#include <algorithm>
#include <cmath>
#include <string>
#include <utility>

namespace neuralWarp {
namespace {

/// Below this, a target morph is off.
constexpr double smallestMorphEnvelope = 1e-6;

HStatus invalidRest() {
    raiseMessage<Text::kErrorMLOriginalGeomInvalid>(displayErrorGated);
    return {HStatus::kFailure, "the rest geometry is no mesh with a vertex for each that is deformed"};
}

void rebuildConnections(neuralWarpData& data, const quill::MeshTopology& topology) {
    data.vertexConnections.build(topology, data.componentMap, 0, false);
    data.vertexConnections.calculateConnectionWeights(data.connectionWeights, data.restPoints, 1.0, 0.0);
    data.connectionsDirty = false;
    data.restFramesDirty = true;
    data.bump(neuralWarpData::connectionsCache);
}

void rebuildFramesTopology(neuralWarpData& data, const quill::MeshTopology& topology, const HString& nodeName) {
    buildFrames(data.vertexFrames, topology, data.componentMap, data.restPoints, nodeName);
    data.framesTopologyDirty = false;
    data.restFramesDirty = true;
    data.bump(neuralWarpData::framesCache);
}

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

} // namespace

HStatus neuralWarpNode::prepareRestState(neuralWarpData& data, HDataBlock& block, std::uint32_t multiIndex) {
    if (!data.hasDueCaches())
        return HStatus::kSuccess;
    if (data.indexMapDirty)
        if (HStatus status = updateComponentMap(data); status.error())
            return status;
    return data.hasDueCaches() ? rebuildRestCaches(data, block, multiIndex) : HStatus();
}

HStatus neuralWarpNode::updateComponentMap(neuralWarpData& data) {
    HStatus status;
    const HIndexMapper mapper = indexMapper(data.multiIndex, &status);
    if (status.error())
        return reported(status, sourceUnit::node);
    data.componentMap = readIndexMap(mapper);
    data.indexMapDirty = false;
    return HStatus::kSuccess;
}

HStatus neuralWarpNode::rebuildRestCaches(neuralWarpData& data, HDataBlock& block, std::uint32_t multiIndex) {
    HStatus status;
    const HDataHandle rest = restGeometryHandle(block, multiIndex, status);
    if (status.error())
        return reported(status, sourceUnit::node);
    const HFnMesh mesh(rest.asMesh(), &status);
    // a rest geometry with fewer vertices than the deformed one has no rest position for each of them
    if (status.error() || !readGeometryPoints(rest, data.restPoints, data.componentMap))
        return invalidRest();
    quill::MeshTopology topology;
    if (status = readMeshTopology(mesh, topology); status.error())
        return reported(status, sourceUnit::node);
    if (data.connectionsDirty)
        rebuildConnections(data, topology);
    if (data.activeSettings.isSurface() && data.framesTopologyDirty)
        rebuildFramesTopology(data, topology, name());
    return data.restFramesDirty && data.activeSettings.isSurface() ? rebuildRestFrames(data, block, multiIndex)
                                                                   : HStatus();
}

HStatus neuralWarpNode::rebuildRestFrames(neuralWarpData& data, HDataBlock& block, std::uint32_t multiIndex) {
    Points smoothed;
    if (HStatus status = readSmoothedRestPoints(data, block, multiIndex, smoothed, true); status.error())
        return status;
    if (smoothed.size() != data.componentMap.affectCount())
        return invalidRest();
    std::vector<quill::mat4d> frames;
    calculateVertexFrames(data, frames, smoothed, true, nullptr);
    data.restFramesInverse = std::move(frames);
    data.restFramesDirty = false;
    data.bump(neuralWarpData::restFramesCache);
    return HStatus::kSuccess;
}

HStatus neuralWarpNode::readInputPoints(const neuralWarpData& data, HDataBlock& block, std::uint32_t multiIndex,
                                        Points& points) {
    HStatus status;
    const HDataHandle geometry = inputGeometryHandle(block, multiIndex, status);
    if (status.error())
        return reported(status, sourceUnit::node);
    if (geometry.type() != HFnData::kMesh) {
        raiseMessage<Text::kErrorMLInputGeomInvalid>(displayErrorGated);
        return {HStatus::kFailure, "the input geometry is no mesh"};
    }
    return readMeshPoints(geometry, data, points, true);
}

HStatus neuralWarpNode::readSmoothedRestPoints(const neuralWarpData& data, HDataBlock& block, std::uint32_t multiIndex,
                                               Points& points, bool smooth) {
    HStatus status;
    const HDataHandle rest = restGeometryHandle(block, multiIndex, status);
    if (status.error())
        return reported(status, sourceUnit::node);
    return readMeshPoints(rest, data, points, smooth);
}

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
    status = readMorphPoints(block, multiIndex, points);
    if (status.error())
        return false;
    morphEnvelope = wanted;
    return true;
}

HStatus neuralWarpNode::readMorphPoints(HDataBlock& block, std::uint32_t multiIndex, Points& points) {
    const neuralWarpData* data = fetchNodeData(block, multiIndex);
    if (!data)
        return {HStatus::kFailure, "there is no state to morph geometry " + std::to_string(multiIndex) + " by"};
    HStatus status;
    HArrayDataHandle targets = block.inputArrayValue(targetMorphGeometry, &status);
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
    raiseMessage<Text::kErrorMLTargetMismatch>(displayErrorGated, points.size(), indexMapper(multiIndex).fullCount());
    return {HStatus::kFailure, "the target of the morph has fewer vertices than the geometry"};
}

void neuralWarpNode::calculateVertexFrames(const neuralWarpData& data, std::vector<quill::mat4d>& frames,
                                           const Points& positions, bool invert,
                                           const std::vector<std::uint32_t>* subset) const {
    calculateVertexFrames(data.vertexFrames, data.componentMap, frames, positions, invert, subset);
}

void neuralWarpNode::calculateVertexFrames(const quill::VertexFrames& topology, const quill::IndexMapper& map,
                                           std::vector<quill::mat4d>& frames, const Points& positions, bool invert,
                                           const std::vector<std::uint32_t>* subset) const {
    const HProfilingScope scope(evaluationCategory(), 10, "CalculateVertexFrames", name());
    topology.calculateFrames(frames, positions, map, invert, subset);
}

HStatus neuralWarpNode::applyVertexFrames(Points& out, const Points& in, const std::vector<quill::mat4d>& frames,
                                          std::uint32_t multiIndex, const std::vector<std::uint32_t>* subset) const {
    HStatus status;
    const std::size_t count = indexMapper(multiIndex, &status).affectCount();
    if (status.error())
        return reported(status, sourceUnit::node);
    out.resize(count);
    const HProfilingScope scope(evaluationCategory(), 9, "ApplyVertexFrames", name());
    const std::size_t known = std::min({count, in.size(), frames.size()});
    quill::parallelFor(subset ? subset->size() : count, [&](std::size_t j) {
        const std::size_t i = subset ? (*subset)[j] : j;
        if (i < known)
            out[i] = quill::transformAsPoint(in[i], frames[i]);
    });
    return HStatus::kSuccess;
}

} // namespace neuralWarp
