// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HFnMesh.h"

#include "core/apiCall.h"
#include "geometry/MeshData.h"
#include "graph/Context.h"
#include "graph/evaluation.h"
#include "openquarn/HFnMeshData.h"

#include <stdexcept>

using OpenQuarn::Access;
using OpenQuarn::apiCall;
using OpenQuarn::apiValue;
using OpenQuarn::MeshData;
using OpenQuarn::Operation;
using OpenQuarn::threadStatus;

namespace {

HStatus noMesh() {
    return {HStatus::kInvalidParameter, "the function set is attached to no mesh"};
}

/// Runs `read` on the mesh that a set is attached to.
template <class Read>
HStatus withMesh(Operation point, const HObject& object, Read&& read) {
    return apiCall(point, [&]() -> HStatus {
        const auto mesh = Access::as<MeshData>(object);
        return mesh ? read(*mesh) : noMesh();
    });
}

/// Attaches the set to what `make` makes of its mesh; what it refuses is an invalid parameter.
template <class Make>
HStatus replaceMesh(Operation point, HObject& object, Make&& make) {
    return withMesh(point, object, [&](const MeshData& mesh) -> HStatus {
        try {
            object = Access::object(make(mesh));
        } catch (const std::invalid_argument& refused) {
            return {HStatus::kInvalidParameter, refused.what()};
        }
        return HStatus::kSuccess;
    });
}

HStatus noTag(const HString& name) {
    return {HStatus::kFailure, "the geometry has no component tag '" + name.asStdString() + "'"};
}

} // namespace

// --- HFnGeometryData ---

HFnGeometryData::HFnGeometryData(const HObject& data, HStatus* status) {
    const HStatus outcome = setObject(data);
    if (status)
        *status = outcome;
}

unsigned HFnGeometryData::vertexCount() const {
    const auto mesh = Access::as<MeshData>(object_);
    return mesh ? mesh->vertexCount() : 0U;
}

HStatus HFnGeometryData::getComponentTags(HStringArray& names) const {
    return withMesh(Operation::HFnGeometryData_getComponentTags, object_, [&](const MeshData& mesh) -> HStatus {
        names.clear();
        if (!mesh.tags)
            return HStatus::kSuccess;
        if (HStatus status = names.reserve(mesh.tags->size()); status.error())
            return status;
        for (const auto& [name, vertices] : *mesh.tags)
            names.append(name);
        return HStatus::kSuccess;
    });
}

HStatus HFnGeometryData::getComponentTag(const HString& name, HUintArray& vertices) const {
    return withMesh(Operation::HFnGeometryData_getComponentTag, object_, [&](const MeshData& mesh) -> HStatus {
        const auto found = mesh.tag(name.asStdString());
        if (!found)
            return noTag(name);
        vertices = *found;
        return HStatus::kSuccess;
    });
}

HStatus HFnGeometryData::setComponentTag(const HString& name, const HUintArray& vertices) {
    return replaceMesh(Operation::HFnGeometryData_setComponentTag, object_,
                       [&](const MeshData& mesh) { return withTag(mesh, name.asStdString(), vertices); });
}

HStatus HFnGeometryData::removeComponentTag(const HString& name) {
    return withMesh(Operation::HFnGeometryData_removeComponentTag, object_, [&](const MeshData& mesh) -> HStatus {
        if (!mesh.tag(name.asStdString()))
            return noTag(name);
        object_ = Access::object(withoutTag(mesh, name.asStdString()));
        return HStatus::kSuccess;
    });
}

// --- HFnMeshData ---

HFnMeshData::HFnMeshData(const HObject& data, HStatus* status)
    : HFnGeometryData(data, status) {}

HObject HFnMeshData::create(const HPointArray& points, const HIntArray& polygonCounts, const HIntArray& polygonConnects,
                            HStatus* status) {
    return apiValue(Operation::HFnMeshData_create, status, HObject(), [&](HStatus& outcome) {
        object_ = HObject();
        try {
            object_ = Access::object(OpenQuarn::makeMesh(points, polygonCounts, polygonConnects));
        } catch (const std::invalid_argument& refused) {
            outcome = {HStatus::kInvalidParameter, refused.what()};
        }
        return object_;
    });
}

// --- HFnMesh ---

namespace {

/// The mesh that a mesh node gives, evaluated.
HObject meshOf(OpenQuarn::Node& node, HStatus& status) {
    status = threadStatus(Operation::HFnMesh_HFnMesh);
    if (status.error())
        return {};
    const OpenQuarn::Field* field = node.type().find("outMesh");
    const auto slot = field ? dataIn(OpenQuarn::currentContext(), node)->slot(*field) : nullptr;
    if (slot)
        status = pull(slot);
    auto mesh = slot ? std::dynamic_pointer_cast<MeshData>(slot->data) : nullptr;
    if (!mesh && !status.error())
        status = {HStatus::kFailure, "node '" + node.name() + "' holds no mesh"};
    return Access::object(std::move(mesh));
}

/// The data of a mesh node; any other object as it is.
HObject dataOf(const HObject& object, HStatus& status) noexcept {
    try {
        const auto node = Access::as<OpenQuarn::Node>(object);
        return node && node->isKind(HFn::kMeshNode) ? meshOf(*node, status) : object;
    } catch (...) {
        status = OpenQuarn::statusOfException("HFnMesh::HFnMesh");
        return {};
    }
}

} // namespace

HFnMesh::HFnMesh(const HObject& mesh, HStatus* status) {
    HStatus outcome;
    const HObject data = dataOf(mesh, outcome);
    if (!outcome.error())
        outcome = setObject(data);
    if (status)
        *status = outcome;
}

int HFnMesh::numVertices(HStatus* status) const {
    return apiValue(Operation::HFnMesh_numVertices, status, 0, [&](HStatus& outcome) {
        const auto mesh = Access::as<MeshData>(object_);
        outcome = mesh ? HStatus() : noMesh();
        return mesh ? static_cast<int>(mesh->vertexCount()) : 0;
    });
}

int HFnMesh::numPolygons(HStatus* status) const {
    return apiValue(Operation::HFnMesh_numPolygons, status, 0, [&](HStatus& outcome) {
        const auto mesh = Access::as<MeshData>(object_);
        outcome = mesh ? HStatus() : noMesh();
        return mesh ? static_cast<int>(mesh->topology->polygonCount()) : 0;
    });
}

HStatus HFnMesh::getPolygonVertices(int polygon, HIntArray& vertices) const {
    return withMesh(Operation::HFnMesh_getPolygonVertices, object_, [&](const MeshData& mesh) -> HStatus {
        const OpenQuarn::Topology& topology = *mesh.topology;
        if (polygon < 0 || static_cast<std::size_t>(polygon) >= topology.polygonCount())
            return {HStatus::kInvalidParameter, "there is no polygon " + std::to_string(polygon) + ": the mesh has " +
                                                    std::to_string(topology.polygonCount())};
        const unsigned* range = topology.offsets.data() + polygon;
        return vertices.assign(topology.corners.data() + range[0], range[1] - range[0]);
    });
}

HStatus HFnMesh::getPoints(HPointArray& points) const {
    return withMesh(Operation::HFnMesh_getPoints, object_,
                    [&](const MeshData& mesh) -> HStatus { return copyPoints(*mesh.points, points); });
}

HStatus HFnMesh::getUVs(HFloatArray& us, HFloatArray& vs, HIntArray& corners) const {
    return withMesh(Operation::HFnMesh_getUVs, object_, [&](const MeshData& mesh) -> HStatus {
        const std::size_t count = mesh.uvs ? mesh.uvs->count() : 0;
        HStatus status = us.setLength(static_cast<unsigned>(count));
        if (!status.error())
            status = vs.setLength(static_cast<unsigned>(count));
        if (status.error())
            return status;
        for (unsigned uv = 0; uv < count; ++uv) {
            us[uv] = mesh.uvs->uvs[2 * std::size_t{uv}];
            vs[uv] = mesh.uvs->uvs[2 * std::size_t{uv} + 1];
        }
        return mesh.uvs ? corners.assign(mesh.uvs->corners.data(), static_cast<unsigned>(mesh.uvs->corners.size()))
                        : corners.setLength(0);
    });
}

HStatus HFnMesh::setUVs(const HFloatArray& us, const HFloatArray& vs, const HIntArray& corners) {
    return replaceMesh(Operation::HFnMesh_setUVs, object_,
                       [&](const MeshData& mesh) { return withUvs(mesh, us, vs, corners); });
}

HStatus HFnMesh::setPoints(const HPointArray& points) {
    return replaceMesh(Operation::HFnMesh_setPoints, object_,
                       [&](const MeshData& mesh) { return withPoints(mesh, points); });
}
