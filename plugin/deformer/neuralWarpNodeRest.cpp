// SPDX-License-Identifier: Apache-2.0
// The rest state of a geometry, and the points and frames that are measured beside it.
#include "deformer/geometryReaders.h"
#include "deformer/neuralWarpNode.h"
#include "deformer/neuralWarpUtils.h"
#include "frame/RestTables.h"
#include "messages/displayErrorGated.h"
#include "messages/messageText.h"
#include "messages/sourceUnits.h"
#include "openquarn/HFnMesh.h"
#include "openquarn/HProfilingScope.h"
#include "quill/parallelFor.h"

#include <algorithm>
#include <utility>

namespace neuralWarp {
namespace {

HStatus invalidRest() {
    raiseMessage<Text::kErrorMLOriginalGeomInvalid>(displayErrorGated);
    return {HStatus::kFailure, "the rest geometry is no mesh with a vertex for each that is deformed"};
}

void rebuildConnections(neuralWarpData& data, const quill::MeshTopology& topology) {
    buildConnections(data.vertexConnections, data.connectionWeights, topology, data.componentMap, data.restPoints);
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

HStatus updateComponentMap(const neuralWarpNode& node, neuralWarpData& data) {
    HStatus status;
    const HIndexMapper mapper = node.indexMapper(data.multiIndex, &status);
    if (status.error())
        return reported(status, sourceUnit::node);
    data.workspace.invalidate();
    data.componentMap = readIndexMap(mapper);
    data.indexMapDirty = false;
    return HStatus::kSuccess;
}

HStatus rebuildRestFrames(const neuralWarpNode& node, neuralWarpData& data, const HDataHandle& rest) {
    Points smoothed;
    if (HStatus status = readMeshPoints(rest, data, smoothed, true); status.error())
        return status;
    if (smoothed.size() != data.componentMap.affectCount())
        return invalidRest();
    std::vector<quill::mat4d> frames;
    node.calculateVertexFrames(data, frames, smoothed, true, nullptr);
    data.restFramesInverse = std::move(frames);
    data.restFramesDirty = false;
    data.bump(neuralWarpData::restFramesCache);
    return HStatus::kSuccess;
}

HStatus rebuildCaches(const neuralWarpNode& node, neuralWarpData& data, HDataBlock& block, std::uint32_t multiIndex) {
    HStatus status;
    const HDataHandle rest = restGeometryHandle(block, multiIndex, status);
    if (status.error())
        return reported(status, sourceUnit::node);
    const HFnMesh mesh(rest.asMesh(), &status);
    data.workspace.invalidate();
    // a rest geometry with fewer vertices than the deformed one has no rest position for each of them
    Points points;
    const bool isWhole = !status.error() && readGeometryPoints(rest, points, data.componentMap);
    data.restPoints = std::move(points);
    if (!isWhole)
        return invalidRest();
    quill::MeshTopology topology;
    if (status = readMeshTopology(mesh, topology); status.error())
        return reported(status, sourceUnit::node);
    if (data.connectionsDirty)
        rebuildConnections(data, topology);
    if (data.activeSettings.isSurface() && data.framesTopologyDirty)
        rebuildFramesTopology(data, topology, node.name());
    return data.restFramesDirty && data.activeSettings.isSurface() ? rebuildRestFrames(node, data, rest) : HStatus();
}

} // namespace

HStatus neuralWarpNode::prepareRestState(neuralWarpData& data, HDataBlock& block, std::uint32_t multiIndex) {
    if (!data.hasDueCaches())
        return HStatus::kSuccess;
    if (data.indexMapDirty)
        if (HStatus status = updateComponentMap(*this, data); status.error())
            return status;
    return data.hasDueCaches() ? rebuildCaches(*this, data, block, multiIndex) : HStatus();
}

HStatus neuralWarpNode::readInputPoints(const neuralWarpData& data, HDataBlock& block, std::uint32_t multiIndex,
                                        Points& points, bool smooth) {
    HStatus status;
    const HDataHandle geometry = inputGeometryHandle(block, multiIndex, status);
    if (status.error())
        return reported(status, sourceUnit::node);
    if (geometry.type() != HFnData::kMesh) {
        raiseMessage<Text::kErrorMLInputGeomInvalid>(displayErrorGated);
        return {HStatus::kFailure, "the input geometry is no mesh"};
    }
    return readMeshPoints(geometry, data, points, smooth);
}

HStatus neuralWarpNode::readSmoothedRestPoints(const neuralWarpData& data, HDataBlock& block, std::uint32_t multiIndex,
                                               Points& points, bool smooth) {
    HStatus status;
    const HDataHandle rest = restGeometryHandle(block, multiIndex, status);
    if (status.error())
        return reported(status, sourceUnit::node);
    return readMeshPoints(rest, data, points, smooth);
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
