// SPDX-License-Identifier: Apache-2.0
#include "plugin/deformer/support/warpRig.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnMesh.h"
#include "openquarn/HFnMeshData.h"
#include "openquarn/HPxDeformerNode.h"
#include "openquarn/HSelectionList.h"
#include "openquarn_app/Evaluation.h"

#include <stdexcept>

namespace warpRig {
namespace {

void check(const HStatus& status) {
    if (status.error())
        throw std::runtime_error(status.errorString().asStdString());
}

HObject create(const std::string& type, const std::string& name) {
    HStatus status;
    HObject node = HFnDependencyNode().create(type, name, &status);
    check(status);
    return node;
}

/// The connection of before is broken.
void connectInstead(const HPlug& source, const HPlug& destination) {
    if (const HPlug before = destination.source(); !before.isNull())
        disconnect(before, destination);
    connect(source, destination);
}

HObject withAffected(const HObject& mesh, const std::optional<std::vector<unsigned>>& affected) {
    if (!affected)
        return mesh;
    HUintArray vertices;
    check(vertices.assign(affected->data(), affected->size()));
    HFnMeshData data(mesh);
    check(data.setComponentTag("part", vertices));
    return data.object();
}

} // namespace

HObject mesh(const ZooMesh& mesh) {
    HPointArray points(static_cast<unsigned>(mesh.points.size()));
    for (std::size_t i = 0; i < mesh.points.size(); ++i)
        points[i] = HPoint(static_cast<double>(mesh.points[i].x), static_cast<double>(mesh.points[i].y),
                           static_cast<double>(mesh.points[i].z));
    HIntArray counts, corners;
    for (const auto& polygon : mesh.polygons) {
        if (polygon.size() < 3)
            continue;
        counts.append(static_cast<int>(polygon.size()));
        for (const std::uint32_t corner : polygon)
            corners.append(static_cast<int>(corner));
    }
    HStatus status;
    HObject made = HFnMeshData().create(points, counts, corners, &status);
    check(status);
    return made;
}

HObject withPoints(const HObject& mesh, const HPointArray& points) {
    HFnMesh set(mesh);
    check(set.setPoints(points));
    return set.object();
}

HPointArray pointsOf(const HObject& mesh) {
    HPointArray points;
    check(HFnMesh(mesh).getPoints(points));
    return points;
}

HObject meshNode(const std::string& name, const HObject& mesh) {
    HObject node = create("mesh", name);
    setMesh(node, mesh);
    return node;
}

void setMesh(const HObject& meshNode, const HObject& mesh) {
    check(plug(meshNode, "inMesh").setHObject(mesh));
}

void connect(const HPlug& source, const HPlug& destination) {
    HDGModifier modifier;
    check(modifier.connect(source, destination));
    check(modifier.doIt());
}

void disconnect(const HPlug& source, const HPlug& destination) {
    HDGModifier modifier;
    check(modifier.disconnect(source, destination));
    check(modifier.doIt());
}

HPlug plug(const HObject& node, std::string_view name) {
    HSelectionList list;
    check(list.add(HFnDependencyNode(node).name() + "." + HString(name)));
    HPlug found;
    check(list.getPlug(0, found));
    return found;
}

Rig::Rig(const std::string& nodeName)
    : node(create("neuralWarp", nodeName)) {}

HObject Rig::named(const char* kind, unsigned index) const {
    HSelectionList list;
    check(list.add(HFnDependencyNode(node).name() + kind + HString(std::to_string(index))));
    HObject found;
    check(list.getDependNode(0, found));
    return found;
}

HObject Rig::heldMesh(const char* kind, unsigned index, const HObject& mesh) const {
    return meshNode(HFnDependencyNode(node).name().asStdString() + kind + std::to_string(index), mesh);
}

void Rig::addGeometry(unsigned index, const GeometrySpec& spec) {
    const std::string at = "[" + std::to_string(index) + "]";
    const HObject in = heldMesh("in", index, withAffected(spec.mesh, spec.affected));
    const HObject rest =
        heldMesh("rest", index, withAffected(spec.rest.isNull() ? spec.mesh : spec.rest, spec.affected));
    if (spec.affected)
        check(plug("input" + at + ".componentTagExpression").setString("part"));
    connect(warpRig::plug(in, "outMesh"), plug("input" + at + ".inputGeometry"));
    connect(warpRig::plug(rest, "outMesh"), plug("originalGeometry" + at));
    for (std::size_t vertex = 0; vertex < spec.weights.size(); ++vertex)
        check(plug("weightList" + at + ".weights[" + std::to_string(vertex) + "]").setFloat(spec.weights[vertex]));
    if (!spec.hasModelElement)
        return;
    check(plug("models" + at + ".modelName").setString(spec.modelName));
    check(plug("models" + at + ".modelActive").setShort(spec.modelOn ? 1 : 0));
}

void Rig::setModelRoot(const std::filesystem::path& root) const {
    check(plug("modelRoot").setString(root.string()));
}

void Rig::setControls(const std::vector<double>& values) const {
    const HPlug controls = plug("controlValues");
    std::vector<unsigned> present;
    check(controls.getExistingArrayAttributeIndices(present));
    for (const unsigned index : present) {
        if (index < values.size())
            continue;
        HDGModifier modifier;
        check(modifier.removeMultiInstance(controls.elementByLogicalIndex(index), true));
        check(modifier.doIt());
    }
    for (unsigned i = 0; i < values.size(); ++i)
        check(controls.elementByLogicalIndex(i).setDouble(values[i]));
}

void Rig::setInput(unsigned index, const HObject& mesh) const {
    setMesh(named("in", index), mesh);
}

void Rig::setRest(unsigned index, const HObject& mesh) const {
    setMesh(named("rest", index), mesh);
}

void Rig::setTarget(unsigned index, const HObject& mesh) const {
    connectInstead(warpRig::plug(heldMesh("target", index, mesh), "outMesh"),
                   plug("targetGeometry[" + std::to_string(index) + "]"));
}

void Rig::setMorphTarget(unsigned index, const HObject& mesh) const {
    connectInstead(warpRig::plug(heldMesh("morph", index, mesh), "outMesh"),
                   plug("targetMorphGeometry[" + std::to_string(index) + "]"));
}

HPlug Rig::output(unsigned index) const {
    return plug("outputGeom[" + std::to_string(index) + "]");
}

HStatus Rig::deform(unsigned index) const {
    const HPlug geometry = output(index);
    check(OpenQuarn::makeDirty(geometry));
    return OpenQuarn::evaluate(geometry);
}

HPointArray Rig::result(unsigned index) const {
    return pointsOf(output(index).asHObject());
}

#ifdef __clang__
__attribute__((no_sanitize("vptr"))) // checking the cast needs the class's type, which a loaded library keeps to itself
#endif
neuralWarp::neuralWarpData*
Rig::state(unsigned index) const {
    const HFnPluginData data(plug("deformerData[" + std::to_string(index) + "]").asHObject());
    return static_cast<neuralWarp::neuralWarpData*>(data.data()); // the attribute holds data of this one type
}

} // namespace warpRig
