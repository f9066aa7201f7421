// SPDX-License-Identifier: Apache-2.0
#include "deformer/geometryReaders.h"

#include "deformer/neuralWarpUtils.h"
#include "frame/smoothing.h"
#include "messages/sourceUnits.h"
#include "openquarn/HFnMesh.h"
#include "openquarn/HItGeometry.h"
#include "openquarn/HLongWork.h"
#include "openquarn/HNodeClass.h"
#include "quill/parallelFor.h"

#include <stdexcept>
#include <string>

namespace neuralWarp {
namespace {

/// Throws when the host does not find it, so that nobody keeps a null attribute for good.
HObject filterAttribute(const char* name) {
    HStatus status;
    HObject attribute = HNodeClass("geometryFilter").attribute(name, &status);
    if (status.error())
        throw std::runtime_error(status.errorString().asStdString());
    return attribute;
}

} // namespace

HDataHandle restGeometryHandle(HDataBlock& block, std::uint32_t multiIndex, HStatus& status) {
    static const HObject originalGeometry = filterAttribute("originalGeometry");
    return existingElement(block, originalGeometry, multiIndex, status);
}

HDataHandle inputGeometryHandle(HDataBlock& block, std::uint32_t multiIndex, HStatus& status) {
    static const HObject input = filterAttribute("input");
    static const HObject inputGeometry = filterAttribute("inputGeometry");
    const HDataHandle element = existingElement(block, input, multiIndex, status);
    return status.error() ? HDataHandle() : element.child(inputGeometry);
}

bool readGeometryPoints(const HDataHandle& geometry, Points& points, const quill::IndexMapper& map) {
    HStatus status;
    const HItGeometry iterator(geometry, &status);
    if (status.error() || iterator.count() < map.fullCount())
        return false;
    const double* xyz = iterator.rawPositions(&status);
    if (status.error())
        return false;
    points.resize(map.affectCount());
    quill::parallelFor(
        points.size(),
        [&](std::size_t k) {
            const double* p = xyz + std::size_t{3} * map.toFull(k);
            points[k] = {static_cast<float>(p[0]), static_cast<float>(p[1]), static_cast<float>(p[2])};
        },
        quill::copyGrain);
    return true;
}

HStatus readMeshPoints(const HDataHandle& geometry, const neuralWarpData& data, Points& points, bool smooth) {
    HStatus status;
    const HFnMesh mesh(geometry.asMesh(), &status);
    if (status.error())
        return reported(status, sourceUnit::node);
    if (!readGeometryPoints(geometry, points, data.componentMap))
        points.clear(); // those of another frame are none
    if (smooth)
        smoothPoints(points, data.frameModel().rest, data.activeSettings.smoothingIterations, HLongWork::isInterrupted);
    return HStatus::kSuccess;
}

HStatus readMeshTopology(const HFnMesh& mesh, quill::MeshTopology& topology) {
    topology = {};
    HStatus status;
    const int vertices = mesh.numVertices(&status);
    const int polygons = status.error() ? 0 : mesh.numPolygons(&status);
    if (status.error())
        return status;
    topology.vertexCount = vertices;
    topology.polygonOffsets.reserve(static_cast<std::size_t>(polygons) + 1);
    topology.polygonVertices.reserve(static_cast<std::size_t>(polygons) * 4);
    HIntArray corners;
    for (int polygon = 0; polygon < polygons; ++polygon) {
        if (mesh.getPolygonVertices(polygon, corners).error())
            continue;
        ++topology.polygonCount;
        topology.polygonOffsets.push_back(static_cast<std::uint32_t>(topology.polygonVertices.size()));
        for (const int corner : corners)
            topology.polygonVertices.push_back(static_cast<std::uint32_t>(corner));
    }
    topology.polygonOffsets.push_back(static_cast<std::uint32_t>(topology.polygonVertices.size()));
    topology.valid = true;
    return HStatus::kSuccess;
}

void buildFrames(quill::VertexFrames& frames, const quill::MeshTopology& topology, const quill::IndexMapper& map,
                 const Points& restPoints, const HString& nodeName) {
    const auto announce = [&](std::size_t polygon, std::size_t corners, double seconds) {
        HLongWork::announce("'" + nodeName.asStdString() + "' chooses frames for polygon " + std::to_string(polygon) +
                                " of the rest geometry, which has " + std::to_string(corners) + " corners",
                            seconds);
    };
    frames.build(topology, map, &restPoints, {HLongWork::isInterrupted, announce});
}

quill::IndexMapper readIndexMap(const HIndexMapper& mapper) {
    quill::IndexMapper map;
    if (mapper.isIdentityMap()) {
        map.setIdentity(mapper.fullCount());
    } else {
        const HUintArray& affected = mapper.affectMap();
        map.set(std::vector<std::uint32_t>(affected.begin(), affected.end()), mapper.fullCount());
    }
    return map;
}

HDoubleArray convertDeltasToHDoubleArray(const Points& deltas) {
    HDoubleArray array;
    if (array.setLength(3 * deltas.size()).error())
        return {};
    quill::parallelFor(deltas.size(), [&](std::size_t j) {
        for (std::size_t axis = 0; axis < 3; ++axis)
            array[3 * j + axis] = static_cast<double>(deltas[j][axis]);
    });
    return array;
}

} // namespace neuralWarp
