// SPDX-License-Identifier: Apache-2.0
#include "quarn/view/ViewScene.h"

#include "openquarn_app/Commands.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/view/commands.h"
#include "storage/Fnv64.h"
#include "storage/encodings.h"
#include "storage/readWholeFile.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <span>
#include <sstream>

namespace {

// the lower half follows the elbow; the shoulder turns by itself, and the face's sliders move shapes
constexpr const char* script = R"(
createNode polyGrid -name skin
setAttr skin.subdivisionsWidth 8
setAttr skin.subdivisionsDepth 4
createNode polyGrid -name goal
setAttr goal.subdivisionsWidth 8
setAttr goal.subdivisionsDepth 4
createNode animCurve -name turn
setAttr turn.keyTimes 1 7
setAttr turn.keyValues -0.3 0.9
connectAttr time1.outTime turn.time
createNode animCurve -name lift
setAttr lift.keyTimes 1 7
setAttr lift.keyValues 0.2 0.6
connectAttr time1.outTime lift.time
createNode joint -name shoulder
createNode joint -name elbow
connectAttr shoulder.worldMatrix elbow.parentMatrix
setAttr elbow.translateX 0.1
setAttr elbow.jointOrientY 0.3
setAttr elbow.rotateOrder 2
setAttr elbow.restMatrix 1 0 0 0 0 1 0 0 0 0 1 0 0.1 0 0 1
connectAttr turn.output elbow.rotateZ
connectAttr lift.output shoulder.rotateX
createNode sliders -name face
setAttr face.slider[0].sliderName up
setAttr face.slider[1].sliderName side
setAttr face.slider[1].minValue -0.5
connectAttr lift.output face.slider[1].value
createNode blendShape -name shapes
connectAttr skin.outMesh shapes.input[0].inputGeometry
setAttr shapes.shapes[0].shape[0].vertices 10 11 12
setAttr shapes.shapes[0].shape[0].deltas 0 0.05 0 0 0.1 0.02 0 0.05 0
setAttr shapes.shapes[0].shape[1].vertices 20 34
setAttr shapes.shapes[0].shape[1].deltas 0.02 0 0 0.01 0.1 0
setAttr shapes.combination[2].factors 0 1
setAttr shapes.shapes[0].shape[2].vertices 11
setAttr shapes.shapes[0].shape[2].deltas 0 0 0.2
setAttr shapes.combination[3].factors 0
setAttr shapes.combination[3].ramps 0 0.5 1
setAttr shapes.shapes[0].shape[3].vertices 30
setAttr shapes.shapes[0].shape[3].deltas 0 0.3 0
connectAttr face.output shapes.weight
createNode skinCluster -name bend
connectAttr shapes.outputGeom[0] bend.input[0].inputGeometry
connectAttr shoulder.worldMatrix bend.matrix[0]
connectAttr elbow.worldMatrix bend.matrix[3]
setAttr bend.bindPreMatrix[3] 1 0 0 0 0 1 0 0 0 0 1 0 -0.1 0 0 1
createNode orthoAxisFromMatrixArray -name axes
connectAttr elbow.relativeMatrix axes.input[0]
createNode matrixConverter -name angles
setAttr angles.extractScale 0
setAttr angles.rotationY 0
connectAttr shoulder.worldMatrix angles.input[0]
createNode controlCollector -name controls
connectAttr axes.outputList[0].output controls.inputList[0].input
connectAttr angles.flatOutput[1] controls.inputList[1].input[0]
connectAttr angles.flatOutput[0] controls.inputList[1].input[1]
connectAttr elbow.rotateZ controls.inputList[2].input[0]
setAttr controls.inputList[2].input[1] 0.25
connectAttr face.output controls.inputList[3].input
createNode controlCollector -name poses
connectAttr elbow.rotateZ poses.inputList[0].input[0]
setAttr poses.limitsList[0].limits[0].minValue -0.5
connectAttr elbow.rotateY poses.inputList[0].input[1]
connectAttr face.output poses.inputList[1].input
createNode neuralWarp -name warp
connectAttr bend.outputGeom[0] warp.input[0].inputGeometry
connectAttr skin.outMesh warp.originalGeometry[0]
connectAttr goal.outMesh warp.targetGeometry[0]
connectAttr controls.output warp.controlValues
connectAttr poses.message warp.poseGenerator
setAttr warp.modelRoot models
setAttr warp.models[0].modelName arm
setAttr warp.models[0].modelActive 1
setAttr warp.exportEndFrame 7
)";

void run(const std::string& text) {
    const OpenQuarn::CommandOutcome outcome = OpenQuarn::runScript(text, "scene");
    ASSERT_TRUE(outcome) << outcome.error;
}

// every vertex on both joints, by its column
std::string skinLists(std::size_t vertices) {
    std::ostringstream counts, influences, weights;
    for (std::size_t vertex = 0; vertex < vertices; ++vertex) {
        const double elbow = 0.125 * static_cast<double>(vertex % 9);
        counts << " 2";
        influences << " 3 0";
        weights << ' ' << elbow << ' ' << 1.0 - elbow;
    }
    return "setAttr bend.skin[0].influenceCounts" + counts.str() + "\nsetAttr bend.skin[0].influences" +
           influences.str() + "\nsetAttr bend.skin[0].skinWeights" + weights.str() + "\n";
}

std::vector<float> someNumbers(std::size_t count, double size, double step) {
    std::vector<float> numbers(count);
    for (std::size_t i = 0; i < count; ++i)
        numbers[i] = static_cast<float>(size * std::sin(step * static_cast<double>(i + 1)));
    return numbers;
}

std::string between(const std::string& text, const std::string& begin) {
    const std::size_t at = text.find(begin);
    if (at == std::string::npos)
        throw std::runtime_error("the page has no " + begin);
    const std::size_t first = at + begin.size();
    return text.substr(first, text.find("</script>", first) - first);
}

} // namespace

// every block has the bytes, the sum and the type that the manifest says
Page::Page(const std::filesystem::path& file)
    : text(storage::readWholeFile(file, 1 << 28))
    , manifest(storage::parseJson(between(text, "<script type=\"application/json\" id=\"manifest\">"),
                                  storage::jsonRules::recipe)) {
    for (const auto& block : manifest["blocks"].GetArray()) {
        const std::string name = block["name"].GetString(), type = block["type"].GetString();
        const std::string bytes =
            storage::fromBase64(between(text, "<script type=\"text/plain\" id=\"block-" + name + "\">")).value();
        EXPECT_EQ(bytes.size(), block["bytes"].GetUint64()) << name;
        const std::uint64_t each = type == "bytes" ? 1 : std::stoul(type.substr(1)) / 8;
        EXPECT_EQ(bytes.size(), each * block["count"].GetUint64()) << name;
        const auto all = std::as_bytes(std::span(bytes));
        std::vector<std::byte> raw(all.begin(), all.end());
        storage::Fnv64 sum;
        sum.add(raw);
        EXPECT_EQ(sum.text(), block["sum"].GetString()) << name;
        blocks.add(name, std::move(raw));
    }
}

ViewScene::ViewScene() {
    ::setenv("NEURALWARP_PLUGIN", NW_PLUGIN, 1);
    writeFile(folder.path() / "viewer.html", "<html>begin\n<!-- neuralWarp: scene -->\nend</html>\n");
    ::setenv("NEURALWARP_VIEWER", (folder.path() / "viewer.html").c_str(), 1);
}

void ViewScene::save(const std::string& more, const ModelSpec& model) const {
    std::filesystem::create_directories(folder.path() / "models");
    writeModel(folder.path() / "models" / "arm.nwrp", model);
    quarn::SceneSession session;
    run(script + skinLists(vertexCount) + more);
    session.save(scene());
}

ModelSpec ViewScene::spec(std::size_t shapes, std::uint32_t deltaMode) {
    constexpr double size = 0.02, step = 1.3;
    ModelSpec spec;
    spec.controls = controlCount;
    spec.deltaMode = deltaMode;
    spec.smoothingIterations = 2;
    spec.fullCount = spec.affectCount = vertexCount;
    spec.bias = someNumbers(shapes > 0 ? shapes : 3 * vertexCount, shapes > 0 ? 1.0 : size, step);
    spec.weights = someNumbers(spec.controls * spec.bias.size(), shapes > 0 ? 1.0 : size, 0.7);
    for (std::size_t shape = 0; shape < shapes; ++shape)
        spec.shapes.push_back(someNumbers(3 * vertexCount, size, 0.1 + static_cast<double>(shape)));
    return spec;
}

std::string ViewScene::view(const std::vector<std::string>& words) const {
    CLI::App app;
    quarn::addViewCommand(app);
    std::vector<std::string> line = words;
    line.insert(line.begin(), {"view", scene().string(), "-o", file().string(), "--quiet"});
    std::reverse(line.begin(), line.end()); // as CLI11 wants them
    testing::internal::CaptureStdout();
    try {
        app.parse(line);
    } catch (...) {
        testing::internal::GetCapturedStdout();
        throw;
    }
    return testing::internal::GetCapturedStdout();
}
