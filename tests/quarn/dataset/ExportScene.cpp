// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/ExportScene.h"

#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"

#include "openquarn_app/Commands.h"
#include "rig/NpyFile.h"
#include "storage/WholeFile.h"

#include <cmath>
#include <cstdlib>
#include <fstream>
#include <iterator>

namespace {

constexpr std::uint32_t columns = 6;

// controls: the axes of the joint, its angle, and a number that is set; with gaps between the lists
constexpr const char* script = R"(
createNode joint -name arm
connectAttr swing.output arm.rotateZ
connectAttr time1.outTime swing.time
createNode skinCluster -name strip_skin
connectAttr strip.outMesh strip_skin.input[0].inputGeometry
connectAttr arm.worldMatrix strip_skin.matrix[0]
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

quarn::MeshPolygons polygons() {
    quarn::MeshPolygons result;
    result.vertexCount = std::size_t{2} * columns;
    for (unsigned column = 0; column + 1 < columns; ++column) {
        result.sizes.push_back(4);
        result.corners.insert(result.corners.end(), {column, column + 1, columns + column + 1, columns + column});
    }
    return result;
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

std::vector<float> ExportScene::targetAt(std::size_t frame) {
    std::vector<float> xyz = restPoints();
    for (std::size_t i = 0; i < xyz.size(); ++i)
        xyz[i] += 0.1F * std::sin(static_cast<float>(i * 7 + frame * 3));
    return xyz;
}

void ExportScene::writeCache(const std::vector<std::vector<float>>& frames) const {
    // by hand: a writer of point caches refuses what is no finite number
    storage::WholeFile file(folder.path() / "strip.npy");
    file.stream() << rig::makeNpyHead(frames.size(), frames.front().size() / 3);
    for (const std::vector<float>& frame : frames)
        file.write(std::as_bytes(std::span(frame)));
    file.finish();
}

void ExportScene::build(std::size_t frames, const std::string& more) {
    const std::vector<float> rest = restPoints();
    const HObject strip = quarn::createNode("mesh", "strip");
    quarn::plugOf(strip, "inMesh")
        .setHObject(quarn::meshData(std::vector<double>(rest.begin(), rest.end()), polygons()));
    const HObject swing = quarn::createNode("animCurve", "swing");
    quarn::setList(quarn::plugOf(swing, "keyTimes"), {1, static_cast<double>(frames + 1)});
    quarn::setList(quarn::plugOf(swing, "keyValues"), {0, turn * static_cast<double>(frames)});
    run(script);
    for (const char* list : {"influenceCounts", "influences", "skinWeights"})
        quarn::setList(quarn::findPlug(std::string("strip_skin.skin[0].") + list),
                       std::vector<double>(vertexCount, list[2] == 'f' && list[9] == 's' ? 0 : 1));
    run("setAttr warp.exportEndFrame " + std::to_string(frames) + "\n" + more);
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

std::string ExportScene::errorOf(const quarn::ExportOptions& options) {
    try {
        quarn::exportDatasets(options);
    } catch (const std::runtime_error& error) {
        return error.what();
    }
    return "(none)";
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
