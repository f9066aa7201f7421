// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/ExportScene.h"

#include "host/support/testDeformers.h"
#include "openquarn_app/Commands.h"

#include <cmath>
#include <cstdlib>
#include <fstream>
#include <iterator>

namespace {

constexpr unsigned columns = 6;

// controls: the axes of the joint, its angle, and a number that is set; with gaps between the lists
constexpr const char* script = R"(
createNode animCurve -name swing
createNode joint -name arm
connectAttr swing.output arm.rotateZ
connectAttr time1.outTime swing.time
createNode skinCluster -name strip_skin
connectAttr strip.outMesh strip_skin.input[0].inputGeometry
connectAttr arm.worldMatrix strip_skin.matrix[0]
setAttr strip_skin.skin[0].influenceCounts 1 1 1 1 1 1 1 1 1 1 1 1
setAttr strip_skin.skin[0].influences 0 0 0 0 0 0 0 0 0 0 0 0
setAttr strip_skin.skin[0].skinWeights 1 1 1 1 1 1 1 1 1 1 1 1
createNode pointCache -name strip_target
connectAttr strip.outMesh strip_target.inMesh
connectAttr time1.outTime strip_target.time
setAttr strip_target.cacheFile strip.npy
createNode orthoAxisFromMatrixArray -name axes
connectAttr arm.relativeMatrix axes.input[0]
createNode controlCollector -name controls
connectAttr axes.outputList[0].output controls.inputList[0].input
connectAttr arm.rotateZ controls.inputList[2].input[3]
setAttr controls.inputList[5].input[0] 0.25
createNode neuralWarp -name warp
connectAttr strip_skin.outputGeom[0] warp.input[0].inputGeometry
connectAttr strip.outMesh warp.originalGeometry[0]
connectAttr strip_target.outMesh warp.targetGeometry[0]
connectAttr controls.output warp.controlValues
setAttr warp.trainingDataRoot data
setAttr warp.export[0].trainingDataName strip
)";

void run(const std::string& text) {
    const OpenQuarn::CommandOutcome outcome = OpenQuarn::runScript(text, "scene");
    ASSERT_TRUE(outcome) << outcome.error;
}

} // namespace

ExportScene::ExportScene() {
    setenv("NEURALWARP_PLUGIN", NW_PLUGIN, 1);
}

std::vector<float> ExportScene::restPoints() {
    std::vector<float> xyz;
    for (unsigned vertex = 0; vertex < vertexCount; ++vertex)
        xyz.insert(xyz.end(), {static_cast<float>(vertex % columns), vertex < columns ? 0.0F : 1.0F, 0.0F});
    return xyz;
}

std::vector<float> ExportScene::turned(const std::vector<float>& xyz, std::size_t frame) {
    const double angle = turn * static_cast<double>(frame);
    std::vector<float> result = xyz;
    for (std::size_t i = 0; i < xyz.size(); i += 3) {
        const auto x = static_cast<double>(xyz[i]);
        const auto y = static_cast<double>(xyz[i + 1]);
        result[i] = static_cast<float>(x * std::cos(angle) - y * std::sin(angle));
        result[i + 1] = static_cast<float>(x * std::sin(angle) + y * std::cos(angle));
    }
    return result;
}

std::vector<float> ExportScene::targetAt(std::size_t frame) {
    std::vector<float> xyz = turned(restPoints(), frame);
    for (std::size_t i = 0; i < xyz.size(); ++i)
        xyz[i] += 0.1F * std::sin(static_cast<float>(i * 7 + frame * 3));
    return xyz;
}

void ExportScene::build(std::size_t frames, const std::string& more) {
    testDeformers::meshNode("strip", testDeformers::grid(columns, vertexCount / columns));
    run(script);
    run("setAttr swing.keyTimes 1 " + std::to_string(frames + 1) + "; setAttr swing.keyValues 0 " +
        OpenQuarn::printedValue(turn * static_cast<double>(frames)) + "; setAttr warp.exportEndFrame " +
        std::to_string(frames) + "\n" + more);
}

void ExportScene::save(std::size_t frames, const std::string& more) const {
    quarn::SceneSession session;
    build(frames, more);
    session.save(scene());
}

quarn::ExportOptions ExportScene::options() const {
    quarn::ExportOptions options;
    options.scene.scene = scene();
    options.console.quiet = true;
    return options;
}

std::string ExportScene::contentOf(const std::filesystem::path& path) {
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}

std::map<std::string, std::string> ExportScene::contentsOf(const std::filesystem::path& folder) {
    std::map<std::string, std::string> contents;
    for (const auto& entry : std::filesystem::directory_iterator(folder))
        contents[entry.path().filename()] = contentOf(entry.path());
    return contents;
}
