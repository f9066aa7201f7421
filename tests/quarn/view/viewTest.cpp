// SPDX-License-Identifier: Apache-2.0
// Pages against the scenes that they are of: the points of their own native core, frame by frame and slider by slider.
#include "quarn/view/ViewScene.h"

#include "quarn/scene/SceneSession.h"
#include "quarn/scene/Warp.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"
#include "quarn/view/PageContent.h"

#include <cmath>
#include <random>

namespace {

using namespace quarn;
using ::testing::ContainsRegex;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::Not;

// of the deformed mesh, in mm
double farthest(std::span<const float> points, const HPlug& mesh) {
    std::vector<float> expected;
    readPoints(mesh, expected);
    EXPECT_EQ(points.size(), expected.size());
    double largest = 0.0;
    for (std::size_t i = 0; i < expected.size(); ++i)
        largest =
            std::max(largest, 1000.0 * std::abs(static_cast<double>(points[i]) - static_cast<double>(expected[i])));
    return largest;
}

void expectSamePage(const Page& page, SceneSession& session, double limit) {
    viewer::Character character = page.character();
    const WarpGeometry geometry = Warp::find().geometry("");
    const auto& frames = page.manifest["frames"];
    ASSERT_EQ(frames.Size(), character.frameCount());
    double largest = 0.0;
    for (unsigned i = 0; i < frames.Size(); ++i) {
        session.host().setTime(frames[i].GetInt());
        character.showFrame(i);
        EXPECT_LE(farthest(character.points(viewer::Shape::skin), geometry.input), 1e-4) << "frame " << i;
        const double off = farthest(character.points(viewer::Shape::neural), geometry.output);
        EXPECT_LE(off, limit) << "frame " << i;
        largest = std::max(largest, off);
    }
    const double said = page.manifest["difference"]["largestMm"].GetDouble(); // of points, and not of coordinates
    EXPECT_LE(largest, 1.0001 * said);
    EXPECT_LE(said, 2.0 * largest);
    for (std::size_t i = 0; i < character.checkCount(); ++i)
        EXPECT_TRUE(character.check(i)) << i;
}

// what comes into a plug is taken away, so that it can be set
void set(const std::string& name, double value) {
    HPlug plug = findPlug(name);
    if (!plug.source().isNull())
        disconnectSource(plug);
    setNumber(plug, value);
}

struct Kind {
    const char* name;
    std::size_t shapes;
    std::uint32_t deltaMode;
    std::vector<std::string> words;
    double limit; ///< mm, of the packed basis too
};
constexpr double rounding = 5e-4; // of single precision, on a mesh of a metre
const Kind kinds[] = {
    {"surface, whole numbers", 3, 1, {}, 2e-3},
    {"surface, floats", 3, 1, {"--basis", "f32"}, rounding},
    {"offset, a preview", 3, 0, {"--basis", "i8"}, 1.0},
    {"surface, deltas", 0, 1, {}, rounding},
    {"offset, deltas", 0, 0, {"--target", "errors"}, rounding},
};

TEST_F(ViewScene, PagesShowWhatPlayShowsFrameByFrameAndSliderBySlider) {
    std::minstd_rand dice(3);
    for (const Kind& kind : kinds) {
        SCOPED_TRACE(kind.name);
        save("", spec(kind.shapes, kind.deltaMode));
        view(kind.words);
        const Page page = this->page();
        EXPECT_LE(page.manifest["difference"]["largestMm"].GetDouble(), kind.limit);
        EXPECT_GE(page.manifest["basisErrorMm"].GetDouble() + rounding,
                  page.manifest["difference"]["largestMm"].GetDouble());
        SceneSession session;
        session.open(scene());
        expectSamePage(page, session, kind.limit);

        viewer::Character character = page.character();
        ASSERT_EQ(character.sliderCount(), 4U) << page.manifest["whyNoSliders"].GetString();
        constexpr unsigned frame = 4; // of which the shoulder stays
        session.host().setTime(page.manifest["frames"][frame].GetInt());
        for (int pose = 0; pose < 5; ++pose) {
            std::vector<double> values;
            for (const auto& slider : page.manifest["sliders"].GetArray())
                values.push_back(std::uniform_real_distribution<double>(slider["least"].GetDouble(),
                                                                        slider["most"].GetDouble())(dice));
            const char* plugs[] = {"elbow.rotateZ", "elbow.rotateY", "face.slider[0].value", "face.slider[1].value"};
            for (std::size_t i = 0; i < values.size(); ++i)
                set(plugs[i], values[i]);
            character.showSliders(frame, values);
            const WarpGeometry geometry = Warp::find().geometry("");
            EXPECT_LE(farthest(character.points(viewer::Shape::skin), geometry.input), 1e-4) << "pose " << pose;
            EXPECT_LE(farthest(character.points(viewer::Shape::neural), geometry.output), kind.limit) << pose;
        }
    }
}

TEST_F(ViewScene, WhatIsSaidOfSlidersFramesAndTarget) {
    save("connectAttr turn.output warp.envelope; setAttr warp.weightList[0].weights[7] 0.5; "
         "setAttr warp.weightList[0].weights[9] 0");
    const std::string answer =
        view({"--frames", "1-6x2", "--title", "An arm", "--view", "-30,12.5", "--up", "z", "--json"});
    const Page page = this->page();
    SceneSession session;
    session.open(scene());
    expectSamePage(page, session, 2e-3);
    EXPECT_EQ(page.blocks.array<float>("frames.envelope").size(), 3U);
    EXPECT_EQ(page.blocks.array<float>("weights")[7], 0.5F);

    const auto& manifest = page.manifest;
    std::vector<int> frames;
    for (const auto& frame : manifest["frames"].GetArray())
        frames.push_back(frame.GetInt());
    EXPECT_THAT(frames, ElementsAre(1, 3, 5));
    std::vector<std::string> sliders;
    for (const auto& slider : manifest["sliders"].GetArray())
        sliders.push_back(std::string(slider["name"].GetString()) + (slider["isAngle"].GetBool() ? " turns" : ""));
    EXPECT_THAT(sliders, ElementsAre("elbow.rotateZ turns", "elbow.rotateY turns", "face.up", "face.side"));
    EXPECT_EQ(manifest["sliders"][3]["least"].GetDouble(), -0.5);
    EXPECT_EQ(manifest["title"].GetString(), std::string("An arm"));
    EXPECT_EQ(manifest["view"]["azimuth"].GetDouble(), -30.0);
    EXPECT_EQ(manifest["view"]["up"].GetString(), std::string("z"));
    EXPECT_EQ(manifest["model"]["shapes"].GetUint(), 3U);
    EXPECT_EQ(page.blocks.array<std::uint32_t>("check.frames").size(), 3U) << "no frame twice";

    // before and after, as the core has them of the packed target
    viewer::Character character = page.character();
    for (const char* when : {"before", "after"}) {
        const auto& errors = manifest["errors"][when];
        const unsigned worst = errors["worstFrame"].GetUint();
        character.showFrame(worst);
        const auto shape = when == std::string("before") ? viewer::Shape::skin : viewer::Shape::neural;
        EXPECT_NEAR(static_cast<double>(character.errors(shape)[errors["worstVertex"].GetUint()]),
                    errors["maxMm"].GetDouble(), manifest["targetErrorMm"].GetDouble() + 2e-3);
        EXPECT_EQ(manifest["frameErrors"][when][worst]["max"].GetFloat(),
                  static_cast<float>(errors["maxMm"].GetDouble()));
    }
    const storage::JsonDocument said = storage::parseJson(answer, storage::jsonRules::recipe);
    EXPECT_EQ(said["bytes"].GetUint64(), std::filesystem::file_size(file()));
    EXPECT_EQ(said["sliders"].GetUint(), 4U);
    EXPECT_EQ(said["errors"]["after"]["worstFrame"].GetInt(),
              frames[manifest["errors"]["after"]["worstFrame"].GetUint()]);
}

// such a page plays all the same
TEST_F(ViewScene, WithoutSlidersThePageSaysWhyAndNamesThePlug) {
    constexpr const char* alone = "disconnectAttr poses.message warp.poseGenerator; "
                                  "disconnectAttr controls.output warp.controlValues; ";
    struct Row {
        std::string more;
        const char* expected;
        bool isChainComputed;
    };
    const Row rows[] = {
        {"setAttr bend.envelope 0.5", "not computed on the page: bend.envelope is 0.5", false},
        {"connectAttr lift.output bend.envelope", "lift.output is connected into bend.envelope", false},
        {"setAttr bend.weightList[0].weights[3] 0.5", "bend.weightList.0. has weights of points", false},
        {"setAttr shapes.envelope 0.5", "shapes.envelope is 0.5", false},
        {"createNode pointCache -name cache; connectAttr bend.outputGeom[0] cache.inMesh; "
         "disconnectAttr bend.outputGeom[0] warp.input[0].inputGeometry; "
         "connectAttr cache.outMesh warp.input[0].inputGeometry",
         "cache.outMesh is of a node of type pointCache", false},
        {"disconnectAttr skin.outMesh warp.originalGeometry[0]; connectAttr goal.outMesh warp.originalGeometry[0]; "
         "connectAttr lift.output skin.width",
         "what blend shapes and skin make there is .* mm off in frame", false},
        {std::string(alone) + "connectAttr controls.output warp.controlValues; connectAttr lift.output "
                              "controls.inputList[7].input[0]",
         "the controls of controls cannot be sampled", true},
        {"connectAttr lift.output poses.inputList[4].input[0]", "lift.output .* is an output", true},
        {"createNode joint -name other; connectAttr other.matrix shoulder.parentMatrix",
         "the joint shoulder hangs on other.matrix", true},
        {"disconnectAttr lift.output shoulder.rotateX; connectAttr elbow.rotateZ shoulder.rotateX",
         "shoulder.*rotateX follows elbow", true},
        {"createNode joint -name other; disconnectAttr elbow.worldMatrix bend.matrix[3]; "
         "connectAttr other.matrix bend.matrix[3]",
         "the skin follows other.matrix, which is no joint's", true},
        {"disconnectAttr elbow.relativeMatrix axes.input[0]; connectAttr elbow.parentMatrix axes.input[0]",
         "a control comes from the matrix elbow.parentMatrix", true},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.expected);
        save(row.more);
        EXPECT_THAT(view(), HasSubstr("no sliders: "));
        const Page page = this->page();
        EXPECT_THAT(page.manifest["whyNoSliders"].GetString(), ContainsRegex(row.expected));
        EXPECT_EQ(page.character().sliderCount(), 0U);
        EXPECT_EQ(page.blocks.has("skin.points"), row.isChainComputed);
        EXPECT_EQ(page.blocks.has("frames.points"), !row.isChainComputed);
        SceneSession session;
        session.open(scene());
        expectSamePage(page, session, 2e-3);
    }
}

TEST_F(ViewScene, WhatCannotBeShownIsRefusedAndNothingIsWritten) {
    struct Row {
        std::string more;
        std::vector<std::string> words;
        const char* expected;
    };
    const Row rows[] = {
        {"setAttr warp.input[0].componentTagExpression hand", {}, "warp deforms only the component hand of skin"},
        {"setAttr warp.targetMorphEnabled 1; connectAttr goal.outMesh warp.targetMorphGeometry[0]",
         {},
         "frame 1: the target morph of warp is on"},
        {"setAttr warp.models[0].modelActive 0; setAttr warp.modelRoot elsewhere", {}, "the model of warp is off"},
        {"createNode animCurve -name on; setAttr on.keyTimes 1 4; setAttr on.keyValues 1 0; setAttr on.interpolation "
         "0; connectAttr time1.outTime on.time; connectAttr on.output warp.models[0].modelActive",
         {},
         "frame 4: the model of warp is off"},
        {"setAttr warp.models[0].modelName foot", {}, "there is no model .*foot.nwrp"},
        {"setAttr elbow.translateX 1e300", {}, "frame 1: vertex 1 of bend.outputGeom.0. has a .* no finite number"},
        {"connectAttr lift.output skin.width", {}, "not what quarn play shows: it is .* mm off"},
        {"disconnectAttr goal.outMesh warp.targetGeometry[0]", {"--target", "errors"}, "skin has no target"},
        {"setAttr goal.subdivisionsWidth 9", {}, "goal.outMesh has 50 vertices, and the deformed mesh has 45"},
        {"",
         {"--limit", "1e-9", "--basis", "f32"},
         "not what quarn play shows: it is .* mm off in frame [1-7], at vertex"},
        {"", {"--frames", "1-900000"}, "would have .* MB, and a page has at most 256 MB: give fewer frames .*--target"},
        {"", {"--view", "12"}, "\"12\" is no view"},
        {"", {"--view", "12,91"}, "\"12,91\" is no view"},
        {"", {"--geometry", "foot"}, "warp deforms no geometry foot"},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.expected);
        save(row.more);
        EXPECT_THAT(failure(row.words), ContainsRegex(row.expected));
        EXPECT_FALSE(std::filesystem::exists(file()));
    }
    save();
    const std::filesystem::path network = folder.path() / "models" / "arm.nwrp" / "model.onnx";
    std::filesystem::remove(network);
    EXPECT_THAT(failure(), HasSubstr("model.onnx"));
    save();
    const std::filesystem::path page = folder.path() / "viewer.html";
    for (const char* text : {"<html></html>", "<!-- neuralWarp: scene --> <!-- neuralWarp: scene -->"}) {
        writeFile(page, text);
        EXPECT_THAT(failure(), HasSubstr("viewer.html is no page of the viewer"));
    }
    std::filesystem::remove(page);
    EXPECT_THAT(failure(), ContainsRegex("viewer.html, was not found; looked at: .*viewer.html. A build without"));
    EXPECT_FALSE(std::filesystem::exists(file()));
}

// nothing that a scene says ends the script that it stands in, and nothing is lost of it
TEST_F(ViewScene, HostileNamesStayTexts) {
    const std::string name = "</script><script>alert(1)</script><!--";
    save("setAttr face.slider[0].sliderName \"" + name + "\"");
    view({"--title", name + "\xff\x1b"});
    const Page page = this->page();
    EXPECT_EQ(page.manifest["sliders"][2]["name"].GetString(), "face." + name);
    EXPECT_THAT(page.manifest["title"].GetString(), HasSubstr(name));
    EXPECT_THAT(page.text, Not(HasSubstr("alert(1)</script>")));
    EXPECT_THAT(page.text, Not(HasSubstr("<!--"))) << "and the line of the template is gone";
    EXPECT_THAT(page.text, ContainsRegex("begin\n<script[^>]*id=\"manifest\">"));
}

TEST_F(ViewScene, APageWithoutJointsMovesShapesByItsSliders) {
    save("disconnectAttr bend.outputGeom[0] warp.input[0].inputGeometry; connectAttr shapes.outputGeom[0] "
         "warp.input[0].inputGeometry; disconnectAttr controls.output warp.controlValues; "
         "disconnectAttr poses.message warp.poseGenerator; connectAttr face.output warp.controlValues; "
         "connectAttr face.message warp.poseGenerator",
         [] {
             ModelSpec two = spec(0, 0);
             two.controls = 2;
             two.weights.resize(2 * two.bias.size());
             return two;
         }());
    view({"--target", "none"});
    const Page page = this->page();
    EXPECT_FALSE(page.manifest["hasTarget"].GetBool());
    EXPECT_TRUE(page.manifest["errors"].IsNull());
    viewer::Character character = page.character();
    ASSERT_EQ(character.sliderCount(), 2U);
    SceneSession session;
    session.open(scene());
    expectSamePage(page, session, 1e-4);
    set("face.slider[1].value", -0.5); // where a ramp would give 0
    set("face.slider[0].value", 0.75);
    character.showSliders(0, std::vector{0.75, -0.5});
    EXPECT_LE(farthest(character.points(viewer::Shape::neural), Warp::find().geometry("").output), 1e-4);
}

// each texture coordinate of a vertex is drawn by a vertex of its own, and moves with it
TEST_F(ViewScene, VerticesAreSplitWhereTheirTextureCoordinatesAreOthers) {
    save();
    view();
    PageContent content;
    content.polygons = {.vertexCount = vertexCount,
                        .sizes = {4, 3},
                        .corners = {0, 1, 10, 9, 1, 2, 10},
                        .uvs = {0, 0, 0.5, 0, 0.5, 1, 0, 1, 0.75, 0},
                        .uvCorners = {0, 1, 2, 3, 4, 0, 2}};
    content.rest.resize(3 * vertexCount);
    content.model = readPageModel(folder.path() / "models" / "arm.nwrp", vertexCount, BasisKind::f32);
    content.frames.vertexCount = vertexCount;
    content.frames.numbers = {1};
    for (std::size_t i = 0; i < 3 * vertexCount; ++i)
        content.frames.input.push_back(static_cast<float>(i));
    content.frames.controls.resize(controlCount);
    content.frames.envelope = {0.0F};
    content.textures.materials.resize(1);
    viewer::Character character(blocksOf(content).opened());
    character.showFrame(0);
    EXPECT_THAT(std::vector(character.triangles().begin(), character.triangles().end()),
                ElementsAre(0, 1, 2, 0, 2, 3, 4, 5, 2));
    const std::span<const float> drawn = character.drawPoints(viewer::Shape::skin);
    std::vector<int> vertices;
    for (std::size_t i = 0; i < drawn.size(); i += 3)
        vertices.push_back(static_cast<int>(drawn[i]) / 3);
    EXPECT_THAT(vertices, ElementsAre(0, 1, 10, 9, 1, 2));
    const auto uvs = blocksOf(content).opened();
    EXPECT_THAT(uvs.array<float>("draw.uvs"), ElementsAre(0, 0, 0.5, 0, 0.5, 1, 0, 1, 0.75, 0, 0, 0));
}

} // namespace
