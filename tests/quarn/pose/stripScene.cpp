// SPDX-License-Identifier: Apache-2.0
#include "stripScene.h"

#include "openquarn_app/Commands.h"
#include "quarn/pose/commands.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"
#include "support/StdoutCapture.h"

#include <CLI/CLI.hpp>
#include <gtest/gtest.h>

#include <cstdlib>
#include <sstream>
#include <stdexcept>

namespace stripScene {
namespace {

constexpr unsigned columns = vertexCount / 2;

void run(const std::string& script) {
    if (const auto outcome = OpenQuarn::runScript(script, "strip"); !outcome)
        throw std::runtime_error(outcome.error);
}

// 2 long, from the first joint to behind the last
HObject stripMesh() {
    std::vector<double> xyz;
    quarn::MeshPolygons polygons;
    polygons.vertexCount = vertexCount;
    for (unsigned vertex = 0; vertex < vertexCount; ++vertex)
        for (const double coordinate : {0.25 * (vertex % columns), vertex < columns ? 0.0 : 0.25, 0.0})
            xyz.push_back(coordinate);
    for (unsigned i = 0; i + 1 < columns; ++i) {
        polygons.sizes.push_back(4);
        for (const unsigned corner : {i, i + 1, i + 1 + columns, i + columns})
            polygons.corners.push_back(corner);
    }
    return quarn::meshData(xyz, polygons);
}

const char* const rig = R"(
createNode mesh -name strip
createNode joint -name root; createNode joint -name middle; createNode joint -name tip
setAttr middle.translateX 1; setAttr tip.translateX 0.5
connectAttr root.worldMatrix middle.parentMatrix
connectAttr middle.worldMatrix tip.parentMatrix
setAttr middle.restMatrix 1 0 0 0 0 1 0 0 0 0 1 0 1 0 0 1
setAttr tip.restMatrix 1 0 0 0 0 1 0 0 0 0 1 0 0.5 0 0 1
createNode skinCluster -name strip_skin
connectAttr strip.outMesh strip_skin.input[0].inputGeometry
connectAttr root.worldMatrix strip_skin.matrix[0]
connectAttr middle.worldMatrix strip_skin.matrix[1]
connectAttr tip.worldMatrix strip_skin.matrix[2]
setAttr strip_skin.bindPreMatrix[1] 1 0 0 0 0 1 0 0 0 0 1 0 -1 0 0 1
setAttr strip_skin.bindPreMatrix[2] 1 0 0 0 0 1 0 0 0 0 1 0 -1.5 0 0 1
setAttr strip_skin.skin[0].influenceCounts 1 1 1 1 1 1 1 1 1 1 1 1 1 1 1 1 1 1
setAttr strip_skin.skin[0].influences 0 0 0 0 1 1 2 2 2 0 0 0 0 1 1 2 2 2
setAttr strip_skin.skin[0].skinWeights 1 1 1 1 1 1 1 1 1 1 1 1 1 1 1 1 1 1
createNode neuralWarp -name warp
connectAttr strip_skin.outputGeom[0] warp.input[0].inputGeometry
connectAttr strip.outMesh warp.originalGeometry[0]
createNode controlCollector -name poses
connectAttr middle.rotateX poses.inputList[0].input[0]
connectAttr middle.rotateY poses.inputList[0].input[1]
connectAttr middle.rotateZ poses.inputList[0].input[2]
connectAttr tip.rotateZ poses.inputList[1].input[0]
connectAttr poses.message warp.poseGenerator
createNode orthoAxisFromMatrixArray -name axes
connectAttr middle.relativeMatrix axes.input[0]
connectAttr tip.relativeMatrix axes.input[1]
createNode controlCollector -name controls
connectAttr axes.outputList[0].output controls.inputList[0].input
connectAttr axes.outputList[1].output controls.inputList[1].input
connectAttr controls.output warp.controlValues
)";

std::string limitsScript() {
    std::ostringstream script;
    for (unsigned i = 0; i < limits().size(); ++i) {
        const std::string place = i < 3 ? "poses.limitsList[0].limits[" + std::to_string(i) + "]."
                                        : std::string("poses.limitsList[1].limits[0].");
        script << "setAttr " << place << "minValue " << limits()[i].least << "; setAttr " << place << "maxValue "
               << limits()[i].most << "; setAttr " << place << "defaultValue " << limits()[i].rest << '\n';
    }
    return script.str();
}

} // namespace

const std::vector<std::string>& sampledPlugs() {
    static const std::vector<std::string> plugs{"middle.rotateX", "middle.rotateY", "middle.rotateZ", "tip.rotateZ"};
    return plugs;
}

const std::vector<Limits>& limits() {
    static const std::vector<Limits> all{{-0.5, 0.5, 0.0}, {-0.25, 0.75, 0.0}, {0.0, 2.0, 0.0}, {0.25, 1.5, 0.5}};
    return all;
}

void write(const std::filesystem::path& scene, const std::string& further) {
    ::setenv("NEURALWARP_PLUGIN", NW_PLUGIN, 1);
    quarn::SceneSession session;
    run(rig);
    HPlug mesh = quarn::findPlug("strip.inMesh");
    mesh.setHObject(stripMesh());
    run(limitsScript() + further);
    session.save(scene);
}

std::string quarn(const std::vector<std::string>& arguments) {
    CLI::App app("quarn");
    ::quarn::addPoseCommand(app);
    ::quarn::addTargetCommand(app);
    std::vector<std::string> reversed(arguments.rbegin(), arguments.rend());
    reversed.insert(reversed.end() - 1, "--quiet");
    StdoutCapture capture;
    app.parse(reversed);
    return capture.take();
}

std::string failureOf(const std::vector<std::string>& arguments) {
    try {
        ADD_FAILURE() << "succeeded: " << quarn(arguments);
    } catch (const std::runtime_error& error) {
        return error.what();
    }
    return {};
}

} // namespace stripScene
