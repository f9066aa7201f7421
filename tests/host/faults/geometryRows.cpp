// SPDX-License-Identifier: Apache-2.0
#include "host/faults/FaultRows.h"

#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnMesh.h"
#include "openquarn/HFnMeshData.h"
#include "openquarn/HFnPlugin.h"
#include "openquarn/HPxDeformerNode.h"
#include "openquarn_app/Plugins.h"
#include "openquarn_app/Session.h"

namespace {

constexpr unsigned rowDeformerId = 0x7104;

HPxNode* createDeformer() {
    return new HPxDeformerNode;
}

HStatus registerDeformer(HObject plugin) {
    return HFnPlugin(plugin).registerNode("rowDeformer", rowDeformerId, createDeformer, nullptr,
                                          HPxNode::kDeformerNode);
}

HStatus deregisterDeformer(HObject plugin) {
    return HFnPlugin(plugin).deregisterNode(rowDeformerId);
}

/// A triangle with the tag "tip" in a mesh node, and a deformer without geometry.
struct GeometryRig {
    GeometryRig() {
        OpenQuarn::addPlugin("geometryRows", registerDeformer, deregisterDeformer);
        HFnMeshData data;
        data.create(HPointArray(3), {3}, {0, 1, 2});
        data.setComponentTag("tip", {2});
        mesh = data.object();
        HFnDependencyNode node;
        node.create("mesh");
        node.findPlug("inMesh").setHObject(mesh);
        handle = node.findPlug("inMesh").asHDataHandle();
        node.create("rowDeformer");
        deformer = dynamic_cast<HPxDeformerNode*>(node.userNode());
    }

    OpenQuarn::Session session;
    HObject mesh;
    HDataHandle handle;
    HPxDeformerNode* deformer = nullptr;
};

GeometryRig* current = nullptr;

std::shared_ptr<void> makeRig() {
    const auto rig = std::make_shared<GeometryRig>();
    current = rig.get();
    return rig;
}

FaultRow row(const char* operation, HStatus (*call)(GeometryRig& rig)) {
    return {operation, [call] { return call(*current); }, makeRig};
}

/// For a call that writes its status, and says whether it answered with a value.
FaultRow row(const char* operation, bool (*call)(GeometryRig& rig, HStatus* status)) {
    const auto checked = [call]() -> HStatus {
        HStatus status(HStatus::kNotImplemented, "the status was not written");
        const bool answered = call(*current, &status);
        return answered == status.error() ? HStatus(HStatus::kNotImplemented, "answer and status differ") : status;
    };
    return {operation, checked, makeRig};
}

std::vector<FaultRow> meshRows() {
    return {
        row("HFnMeshData::create",
            [](GeometryRig&, HStatus* status) {
                return !HFnMeshData().create(HPointArray(3), {3}, {0, 1, 2}, status).isNull();
            }),
        row("HFnGeometryData::getComponentTags",
            [](GeometryRig& rig) {
                HStringArray names;
                return HFnGeometryData(rig.mesh).getComponentTags(names);
            }),
        row("HFnGeometryData::getComponentTag",
            [](GeometryRig& rig) {
                HUintArray vertices;
                return HFnGeometryData(rig.mesh).getComponentTag("tip", vertices);
            }),
        row("HFnGeometryData::setComponentTag",
            [](GeometryRig& rig) { return HFnGeometryData(rig.mesh).setComponentTag("new", {1}); }),
        row("HFnGeometryData::removeComponentTag",
            [](GeometryRig& rig) { return HFnGeometryData(rig.mesh).removeComponentTag("tip"); }),
        row("HFnMesh::numVertices",
            [](GeometryRig& rig, HStatus* status) { return HFnMesh(rig.mesh).numVertices(status) == 3; }),
        row("HFnMesh::numPolygons",
            [](GeometryRig& rig, HStatus* status) { return HFnMesh(rig.mesh).numPolygons(status) == 1; }),
        row("HFnMesh::getPolygonVertices",
            [](GeometryRig& rig) {
                HIntArray vertices;
                return HFnMesh(rig.mesh).getPolygonVertices(0, vertices);
            }),
        row("HFnMesh::getPoints",
            [](GeometryRig& rig) {
                HPointArray points;
                return HFnMesh(rig.mesh).getPoints(points);
            }),
        row("HFnMesh::setPoints", [](GeometryRig& rig) { return HFnMesh(rig.mesh).setPoints(HPointArray(3)); }),
    };
}

std::vector<FaultRow> iteratorRows() {
    return {
        row("HItGeometry::HItGeometry",
            [](GeometryRig& rig, HStatus* status) { return HItGeometry(rig.handle, status).count() == 3; }),
        row("HItGeometry::position",
            [](GeometryRig& rig) {
                HStatus status;
                HItGeometry(rig.handle).position(HSpace::kObject, &status);
                return status;
            }),
        row("HItGeometry::rawPositions",
            [](GeometryRig& rig, HStatus* status) { return HItGeometry(rig.handle).rawPositions(status) != nullptr; }),
        row("HItGeometry::setPosition",
            [](GeometryRig& rig) { return HItGeometry(rig.handle).setPosition(HPoint(1, 2, 3)); }),
        row("HItGeometry::allPositions",
            [](GeometryRig& rig) {
                HPointArray points;
                return HItGeometry(rig.handle).allPositions(points);
            }),
        row("HItGeometry::setAllPositions",
            [](GeometryRig& rig) { return HItGeometry(rig.handle).setAllPositions(HPointArray(3)); }),
        row("HPxGeometryFilter::indexMapper",
            [](GeometryRig& rig) {
                HStatus status;
                rig.deformer->indexMapper(0, &status);
                return status;
            }),
        row("HPxDeformerNode::envelopeWeights",
            [](GeometryRig& rig) {
                HStatus status;
                HDataBlock block = rig.deformer->forceCache();
                rig.deformer->envelopeWeights(block, 0, &status);
                return status;
            }),
    };
}

} // namespace

std::vector<FaultRow> geometryRows() {
    std::vector<FaultRow> rows = meshRows();
    for (const FaultRow& added : iteratorRows())
        rows.push_back(added);
    return rows;
}
