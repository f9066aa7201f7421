// SPDX-License-Identifier: Apache-2.0
// Training deltas: what a model would have to predict for the geometry to become its target.
#include "deformer/geometryReaders.h"
#include "deformer/neuralWarpNode.h"
#include "deformer/neuralWarpUtils.h"
#include "messages/guard.h"
#include "messages/sourceUnits.h"
#include "openquarn/HFnMesh.h"
#include "quill/parallelFor.h"

#include <algorithm>
#include <string>

namespace neuralWarp {
namespace {

using Frames = std::vector<quill::mat4d>;

bool isSurfaceType(TargetDeltaType type) {
    return type == TargetDeltaType::targetInInputFrames || type == TargetDeltaType::targetInRestFrames ||
           type == TargetDeltaType::surfaceDelta;
}

bool needsRestPoints(TargetDeltaType type) {
    return type == TargetDeltaType::targetInRestFrames || type == TargetDeltaType::surfaceDelta ||
           type == TargetDeltaType::restOffset;
}

bool needsInputPoints(TargetDeltaType type) {
    return type != TargetDeltaType::restOffset;
}

HStatus tooFew(const char* what, std::size_t has, std::size_t needed) {
    return {HStatus::kFailure, std::string(what) + " has " + std::to_string(has) + " points for " +
                                   std::to_string(needed) + " points of the target"};
}

/// What training deltas are measured between. `input` and `rest` are smoothed; empty when the type has no use for them.
struct TrainingPoints {
    Points input, rest, target;
};

/// The frame topology and the unsmoothed rest points that the surface types are measured with: those of the state, or,
/// while the settings in force have no use for frames, a set made for one call.
struct MeasuredRest {
    const quill::VertexFrames* frames = nullptr;
    const Points* restPoints = nullptr;
    quill::VertexFrames ownFrames;
    Points ownRestPoints;
};

HStatus requirePoints(const TrainingPoints& points, TargetDeltaType type) {
    const std::size_t count = points.target.size();
    if (needsRestPoints(type) && points.rest.size() < count)
        return tooFew("the rest geometry", points.rest.size(), count);
    if (needsInputPoints(type) && points.input.size() < count)
        return tooFew("the input geometry", points.input.size(), count);
    return HStatus::kSuccess;
}

HStatus pointDifferences(HDoubleArray& out, const Points& target, const Points& base) {
    if (HStatus status = out.setLength(3 * target.size()); status.error())
        return status;
    quill::parallelFor(target.size(), [&](std::size_t j) {
        const quill::val3<float> delta = target[j] - base[j];
        for (std::size_t axis = 0; axis < 3; ++axis)
            out[3 * j + axis] = static_cast<double>(delta[axis]);
    });
    return HStatus::kSuccess;
}

HStatus findRestSurface(const neuralWarpNode& node, const neuralWarpData& data, HDataBlock& block,
                        std::uint32_t multiIndex, MeasuredRest& surface) {
    const std::size_t count = data.componentMap.affectCount();
    if (data.activeSettings.isSurface() && !data.framesTopologyDirty && data.restPoints.size() == count) {
        surface.frames = &data.vertexFrames;
        surface.restPoints = &data.restPoints.get();
        return HStatus::kSuccess;
    }
    HStatus status;
    const HDataHandle rest = restGeometryHandle(block, multiIndex, status);
    if (status.error())
        return status;
    const HFnMesh mesh(rest.asMesh(), &status);
    if (status.error())
        return status;
    if (!readGeometryPoints(rest, surface.ownRestPoints, data.componentMap))
        return tooFew("the rest geometry", 0, count);
    quill::MeshTopology topology;
    if (status = readMeshTopology(mesh, topology); status.error())
        return reported(status, sourceUnit::node);
    buildFrames(surface.ownFrames, topology, data.componentMap, surface.ownRestPoints, node.name());
    surface.frames = &surface.ownFrames;
    surface.restPoints = &surface.ownRestPoints;
    return HStatus::kSuccess;
}

HStatus surfaceDeltas(HDoubleArray& out, const neuralWarpNode& node, const neuralWarpData& data, HDataBlock& block,
                      std::uint32_t multiIndex, TargetDeltaType type, const TrainingPoints& points) {
    MeasuredRest surface;
    if (const HStatus status = findRestSurface(node, data, block, multiIndex, surface); status.error())
        return reported(status, sourceUnit::node);
    const bool isCarried = type != TargetDeltaType::targetInInputFrames;
    Frames inputInverse;
    Frames rest;
    node.calculateVertexFrames(*surface.frames, data.componentMap, inputInverse, points.input, true, nullptr);
    if (isCarried)
        node.calculateVertexFrames(*surface.frames, data.componentMap, rest, points.rest, false, nullptr);
    Points deltas(points.target.size());
    quill::parallelFor(deltas.size(), [&](std::size_t j) {
        deltas[j] = quill::transformAsPoint(points.target[j], inputInverse[j]);
        if (isCarried)
            deltas[j] = quill::transformAsPoint(deltas[j], rest[j]);
        if (type == TargetDeltaType::surfaceDelta)
            deltas[j] -= (*surface.restPoints)[j];
    });
    HDoubleArray converted = convertDeltasToHDoubleArray(deltas);
    if (converted.length() != 3 * deltas.size())
        return HStatus::kInsufficientMemory;
    out = std::move(converted);
    return HStatus::kSuccess;
}

} // namespace

HStatus neuralWarpNode::getVertexDeltas(HDoubleArray& out, std::uint32_t multiIndex, TargetDeltaType type) {
    return guarded(*this, "extracting training deltas", [&]() -> HStatus {
        if (type >= TargetDeltaType::invalid)
            return HStatus::kInvalidParameter;
        HDataBlock block = forceCache();
        neuralWarpData* data = fetchNodeData(block, multiIndex);
        if (!data)
            return HStatus::kInvalidParameter;
        if (const HStatus status = prepareRestState(*data, block, multiIndex); status.error())
            return reported(status, sourceUnit::node);
        TrainingPoints points;
        HStatus status;
        if (needsRestPoints(type))
            status = readSmoothedRestPoints(*data, block, multiIndex, points.rest, true);
        if (!status.error() && needsInputPoints(type))
            status = readInputPoints(*data, block, multiIndex, points.input, true);
        if (!status.error())
            status = readTargetPoints(*data, multiIndex, points.target);
        if (!status.error())
            status = requirePoints(points, type);
        if (status.error())
            return reported(status, sourceUnit::node);
        return isSurfaceType(type)
                   ? surfaceDeltas(out, *this, *data, block, multiIndex, type, points)
                   : pointDifferences(out, points.target, needsInputPoints(type) ? points.input : points.rest);
    });
}

} // namespace neuralWarp
