// SPDX-License-Identifier: Apache-2.0
#include "stripScene.h"

#include "host/support/testDeformers.h"

#include "openquarn/HFnMesh.h"
#include "openquarn_app/Commands.h"
#include "quarn/play/commands.h"
#include "quarn/pose/commands.h"
#include "quarn/scene/SceneSession.h"
#include "support/StdoutCapture.h"

#include <CLI/CLI.hpp>

#include <cstdlib>
#include <sstream>
#include <stdexcept>

namespace stripScene {
namespace {

void run(const std::string& script) {
    if (const auto outcome = OpenQuarn::runScript(script, "strip"); !outcome)
        throw std::runtime_error(outcome.error);
}

const char* const rig = R"(
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

// the whole picture on every quad: each edge between two is a seam
HObject textured(const HObject& grid) {
    HFnMesh mesh(grid);
    HIntArray corners;
    for (int corner = 0; corner < 4 * mesh.numPolygons(); ++corner)
        corners.append(corner % 4);
    if (mesh.setUVs({0, 1, 1, 0}, {0, 0, 1, 1}, corners).error())
        throw std::runtime_error("no UVs");
    return mesh.object();
}

} // namespace

void write(const std::filesystem::path& scene, const std::string& further) {
    ::setenv("NEURALWARP_PLUGIN", NW_PLUGIN, 1);
    quarn::SceneSession session;
    testDeformers::meshNode("strip", textured(testDeformers::grid(vertexCount / 2, 2)));
    run(rig);
    std::ostringstream limits;
    for (const auto& [plug, place, least, most, rest] : sampled)
        limits << "setAttr poses." << place << ".minValue " << least << "; setAttr poses." << place << ".maxValue "
               << most << "; setAttr poses." << place << ".defaultValue " << rest << '\n';
    run(limits.str() + further);
    session.save(scene);
}

std::string quarn(const std::vector<std::string>& arguments) {
    CLI::App app("quarn");
    ::quarn::addPoseCommand(app);
    ::quarn::addTargetCommand(app);
    ::quarn::addPlayCommand(app);
    ::quarn::addBakeCommand(app);
    std::vector<std::string> reversed(arguments.rbegin(), arguments.rend());
    reversed.insert(reversed.end() - 1, "--quiet");
    StdoutCapture capture;
    app.parse(reversed);
    return capture.take();
}

} // namespace stripScene
