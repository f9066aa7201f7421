// SPDX-License-Identifier: Apache-2.0
// What is in a data set, and what is refused.
#include "quarn/dataset/ExportScene.h"

#include "quarn/dataset/FrameSampler.h"
#include "quarn/dataset/exportControls.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"

#include "host/support/testDeformers.h"

#include <rapidjson/pointer.h>
#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include <cmath>
#include <limits>

namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::FloatNear;
using ::testing::HasSubstr;
using ::testing::Pointwise;
using ::testing::StartsWith;

class ExportTest : public ExportScene {
protected:
    /// What stands at a place of dataset.json, as text: "/controlNames/5".
    static std::string described(const std::filesystem::path& data, const char* place) {
        rapidjson::Document json;
        json.Parse(contentOf(data / "dataset.json").c_str());
        const rapidjson::Value* value = rapidjson::Pointer(place).Get(json);
        if (value == nullptr || value->IsString())
            return value == nullptr ? "(none)" : value->GetString();
        rapidjson::StringBuffer buffer;
        rapidjson::Writer<rapidjson::StringBuffer> writer(buffer);
        value->Accept(writer);
        return buffer.GetString();
    }

    static std::vector<float> sum(const std::vector<float>& a, std::span<const float> b) {
        std::vector<float> result = a;
        for (std::size_t i = 0; i < a.size(); ++i)
            result[i] += b[i];
        return result;
    }
};

// the curve ends in frame 4, the target in frame 3
TEST_F(ExportTest, RowsInWhichNothingMovesAreCounted) {
    writeTarget(3);
    save(3);
    EXPECT_EQ(quarn::exportDatasets(options()).at(0).rowsRepeated, 0U);
    quarn::ExportOptions flags = options();
    flags.frames = "1-7";
    flags.overwrite = true;
    EXPECT_EQ(quarn::exportDatasets(flags).at(0).rowsRepeated, 3U);
}

// of a strip that turns as a whole, Surface mode turns rest plus delta, and Offset mode adds the delta to the input
TEST_F(ExportTest, DeltasLeadToTheTargetInBothModes) {
    constexpr std::size_t frames = 7;
    writeTarget(frames);
    for (const std::string mode : {"Surface", "Offset"}) {
        SCOPED_TRACE(mode);
        save(frames, "setAttr warp.export[0].deltaMode " + mode);
        quarn::ExportOptions flags = options();
        flags.output = folder.path() / mode;
        const quarn::ExportAnswer answer = quarn::exportDatasets(flags).at(0);
        EXPECT_EQ(answer.rows, frames);
        const std::vector<float> deltas = numbersOf<float>(answer.folder / "deltas.npy");
        const std::vector<float> skin = numbersOf<float>(answer.folder / "skin.npy");
        ASSERT_EQ(deltas.size(), frames * vertexCount * 3);
        ASSERT_EQ(skin.size(), frames * vertexCount);
        for (std::size_t frame = 0; frame < frames; ++frame) {
            const auto row = std::span(deltas).subspan(frame * restPoints().size(), restPoints().size());
            const std::vector<float> reached =
                mode == "Surface" ? turned(sum(restPoints(), row), frame) : sum(turned(restPoints(), frame), row);
            EXPECT_THAT(reached, Pointwise(FloatNear(2e-6F), targetAt(frame)));
            for (std::size_t vertex = 0; vertex < vertexCount; ++vertex) { // the strip turns as a whole
                const auto* delta = &row[3 * vertex];
                EXPECT_NEAR(skin[frame * vertexCount + vertex], std::hypot(delta[0], delta[1], delta[2]), 2e-6);
            }
        }
        EXPECT_EQ(described(answer.folder, "/deltaType"), mode == "Surface" ? "dos" : "dbp");
    }
}

TEST_F(ExportTest, SaysWhatIsInIt) {
    writeTarget(5);
    save(5, "setAttr warp.train[0].validationRatio 0.3; setAttr warp.train[0].outputModelName arm");
    quarn::ExportOptions flags = options();
    flags.frames = "2-5x3";
    const quarn::ExportAnswer answer = quarn::exportDatasets(flags).at(0);
    EXPECT_EQ(answer.folder, std::filesystem::canonical(data()));
    EXPECT_EQ(answer.bytes, 4 * 128 + 2 * (4 + 8 * 4 + 36 * 4 + 12 * 4) + contentOf(data() / "dataset.json").size());
    EXPECT_THAT(numbersOf<int>(data() / "frames.npy"), ElementsAre(2, 5));
    const auto angle = [](int frame) { return static_cast<float>(turn * (frame - 1)); };
    const float c = std::cos(angle(5)), s = std::sin(angle(5));
    const std::vector<float> controls = numbersOf<float>(data() / "controls.npy");
    ASSERT_EQ(controls.size(), 16U);
    EXPECT_THAT(std::vector<float>(controls.begin() + 8, controls.end()),
                Pointwise(FloatNear(1e-6F), {c, s, 0.0F, -s, c, 0.0F, angle(5), 0.25F}));

    EXPECT_THAT(contentOf(data() / "controls.npy").substr(10, 100),
                HasSubstr("'<f4', 'fortran_order': False, 'shape': (2, 8)"));
    EXPECT_THAT(contentOf(data() / "deltas.npy").substr(10, 100), HasSubstr("(2, 12, 3)"));
    EXPECT_THAT(contentOf(data() / "frames.npy").substr(10, 100),
                HasSubstr("'<i4', 'fortran_order': False, 'shape': (2,)"));
    const std::map<const char*, std::string> expected = {
        {"/geometry", "strip"},
        {"/subsetState", "complete"},
        {"/affectMap", "(none)"},
        {"/controlNames/5", "arm.relativeMatrix:5"},
        {"/controlNames/6", "arm.rotateZ"},
        {"/controlNames/7", "controls.inputList[5].input[0]"},
        {"/controlRanges/6", "[0.05,0.2]"},
        {"/boundingBoxDiagonal", "5.0990195135927849"},
        {"/train/validationRatio", "0.3"},
        {"/train/activationFunction", "LeakyReLU"},
        {"/train/outputModelName", "arm"},
    };
    for (const auto& [place, text] : expected)
        EXPECT_EQ(described(data(), place), text) << place;
}

TEST_F(ExportTest, SaysWhichPosesWereDrawn) {
    writeTarget(5);
    const std::string keys = "setAttr swing.keyTimes 1 3 6; setAttr swing.keyValues 0 0.1 0.25; ";
    for (const auto& [more, drawn] : {std::pair("", "(none)"), std::pair("setAttr swing.drawnKeys 2", "[[2,3]]"),
                                      std::pair("setAttr swing.drawnKeys 9", "[[2,5]]"),
                                      std::pair("setAttr swing.drawnKeys 1", "(none)")}) { // its frame is not exported
        SCOPED_TRACE(more);
        save(5, keys + more);
        quarn::ExportOptions flags = options();
        flags.frames = "2-5";
        flags.overwrite = true;
        quarn::exportDatasets(flags);
        EXPECT_EQ(described(data(), "/drawnFrames"), drawn);
    }
}

// a target that does not go with the joint is told of before anything is written, and again by what was written anyway
TEST_F(ExportTest, TargetsAreComparedWithTheSkin) {
    constexpr std::size_t frames = 40;
    writeTarget(frames);
    save(frames);
    const std::optional<quarn::TargetFit> fit = quarn::exportDatasets(options()).at(0).fit;
    ASSERT_TRUE(fit);
    EXPECT_NEAR(fit->asItIs.mean, 0.12, 0.02);
    EXPECT_EQ(described(data(), "/targetFit/follows"), "true");
    const std::string before = contentOf(data() / "deltas.npy");

    writeTarget(frames, [](std::size_t, std::vector<float>& xyz) { xyz = restPoints(); });
    quarn::ExportOptions flags = options();
    flags.overwrite = true;
    EXPECT_THAT(errorOf(flags), AllOf(HasSubstr("the target of strip"), HasSubstr("do not belong to these poses"),
                                      HasSubstr("--anyway")));
    EXPECT_EQ(contentOf(data() / "deltas.npy"), before);
    flags.anyway = true;
    EXPECT_EQ(quarn::exportDatasets(flags).at(0).rows, frames);
    EXPECT_EQ(described(data(), "/targetFit/follows"), "false");
}

TEST_F(ExportTest, DeformedVerticesKeepTheirOrder) {
    writeTarget(2, [](std::size_t, std::vector<float>& xyz) { xyz[0] = 1000.0F; }); // of none that is deformed
    {
        quarn::SceneSession session;
        build(2, "setAttr warp.input[0].componentTagExpression tip; setAttr warp.export[0].deltaMode Offset");
        HPlug mesh = quarn::findPlug("strip.inMesh");
        mesh.setHObject(testDeformers::withTag(mesh.asHObject(), "tip", HUintArray{7, 3}));
        session.save(scene());
    }
    quarn::exportDatasets(options());
    EXPECT_EQ(described(data(), "/subsetState"), "partial");
    EXPECT_EQ(described(data(), "/affectMap"), "[7,3]");
    EXPECT_EQ(described(data(), "/fullCount"), "12");
    const std::vector<float> deltas = numbersOf<float>(data() / "deltas.npy");
    ASSERT_EQ(deltas.size(), 12U);
    EXPECT_FLOAT_EQ(deltas[0], targetAt(0)[21] - restPoints()[21]);
    EXPECT_FLOAT_EQ(deltas[3], targetAt(0)[9] - restPoints()[9]);
    EXPECT_FLOAT_EQ(numbersOf<float>(data() / "skin.npy").at(1), std::hypot(deltas[3], deltas[4], deltas[5]));
}

TEST_F(ExportTest, SeveralGeometriesHaveAFolderEach) {
    writeTarget(3);
    save(3, R"(
duplicate strip -name sleeve
connectAttr sleeve.outMesh warp.input[4].inputGeometry
connectAttr sleeve.outMesh warp.originalGeometry[4]
connectAttr strip_target.outMesh warp.targetGeometry[4]
)");
    EXPECT_EQ(quarn::exportDatasets(options()).at(1).folder.filename(), "sleeve") << "without a name of its own";
    quarn::ExportOptions flags = options();
    flags.output = folder.path() / "both";
    const std::vector<quarn::ExportAnswer> answers = quarn::exportDatasets(flags);
    ASSERT_EQ(answers.size(), 2U);
    EXPECT_EQ(contentsOf(flags.output / "strip"), contentsOf(data()));
    EXPECT_EQ(described(flags.output / "sleeve", "/geometryIndex"), "4");
    flags.geometry = "sleeve";
    flags.output = folder.path() / "one";
    quarn::exportDatasets(flags);
    EXPECT_EQ(contentsOf(flags.output), contentsOf(folder.path() / "both" / "sleeve"));

    // one without target is left out, and moves nobody
    save(3, R"(
duplicate strip -name hat
connectAttr hat.outMesh warp.input[1].inputGeometry
)");
    flags.geometry.clear();
    flags.output = folder.path() / "left";
    flags.console.quiet = false;
    testing::internal::CaptureStderr();
    EXPECT_EQ(quarn::exportDatasets(flags).size(), 1U);
    EXPECT_THAT(testing::internal::GetCapturedStderr(), HasSubstr("without target, and not exported: hat"));
    EXPECT_EQ(contentsOf(flags.output / "strip").at("deltas.npy"), contentsOf(data()).at("deltas.npy"));
    save(3, "connectAttr strip.outMesh warp.input[1].inputGeometry; disconnectAttr strip_target.outMesh "
            "warp.targetGeometry[0]");
    EXPECT_THAT(errorOf(options()), HasSubstr("none of the geometries of warp has a target (strip, strip)"));

    save(3, "connectAttr strip.outMesh warp.input[1].inputGeometry\n"
            "connectAttr strip_target.outMesh warp.targetGeometry[1]");
    EXPECT_THAT(errorOf(options()), HasSubstr("strip (0) and strip (1) would both be exported to"));
}

TEST_F(ExportTest, ErrorsNameTheFrameAndTheThing) {
    constexpr float notANumber = std::numeric_limits<float>::quiet_NaN();
    writeTarget(3);
    const auto errorAfter = [&](const std::string& change) {
        save(3, change);
        return errorOf(options());
    };
    EXPECT_THAT(errorAfter("disconnectAttr strip_target.outMesh warp.targetGeometry[0]"),
                AllOf(HasSubstr("warp.targetGeometry[0] has no target"), HasSubstr("quarn target")));
    EXPECT_THAT(errorAfter("disconnectAttr controls.output warp.controlValues"), HasSubstr("connect the controls"));
    EXPECT_THAT(errorAfter("createNode mesh -name none; connectAttr -force none.outMesh warp.targetGeometry[0]"),
                AllOf(StartsWith("frame 1: "), HasSubstr("the target none.outMesh holds no mesh")));
    EXPECT_THAT(errorAfter("setAttr warp.exportStartFrame 9"), HasSubstr("is 9, after exportEndFrame 3"));
    EXPECT_THAT(errorAfter("setAttr warp.trainingDataRoot ''"), HasSubstr("warp.trainingDataRoot is empty"));
    for (const char* place : {"trainingDataRoot ../data", "trainingDataRoot data/../..",
                              "export[0].trainingDataName ../x", "export[0].trainingDataName /x"})
        EXPECT_THAT(errorAfter(std::string("setAttr warp.") + place),
                    AllOf(HasSubstr("the scene would have strip exported to"), HasSubstr("say with -o")));
    EXPECT_THAT(errorAfter("setAttr warp.export[0].deltaMode 7"), HasSubstr("warp.export[0].deltaMode is 7"));
    EXPECT_THAT(errorAfter("setAttr arm.restMatrix 0 0 0 0 0 0 0 0 0 0 0 0 0 0 0 0"),
                AllOf(StartsWith("frame 1: "), HasSubstr("restMatrix is singular")));
    {
        quarn::SceneSession session;
        build(3, "createNode mesh -name small; connectAttr -force small.outMesh warp.targetGeometry[0]");
        quarn::findPlug("small.inMesh").setHObject(testDeformers::grid(3, 1));
        session.save(scene());
    }
    EXPECT_THAT(errorOf(options()), StartsWith("frame 1: the target small.outMesh has 3 vertices, and strip has 12"));
    EXPECT_FALSE(std::filesystem::exists(folder.path() / "data")) << "nothing was begun";

    writeTarget(3, [](std::size_t frame, std::vector<float>& xyz) {
        if (frame == 1)
            xyz[15] = notANumber;
    });
    save(3);
    EXPECT_EQ(errorOf(options()), "frame 2: the delta of vertex 5 of strip is no finite number");
    EXPECT_FALSE(std::filesystem::exists(data()));
    writeTarget(3);
    save(3, "setAttr swing.keyTimes 1 2 3; setAttr swing.keyValues 0 0 1e300");
    quarn::ExportOptions flags = options();
    flags.overwrite = flags.anyway = true;
    EXPECT_THAT(errorOf(flags), AllOf(StartsWith("frame 3: "), HasSubstr("controlValues[6] (arm.rotateZ) is ")));
}

TEST_F(ExportTest, ExportModeEndsAlsoAfterAFailure) {
    writeTarget(2);
    save(2, "connectAttr strip_target.outMesh warp.targetMorphGeometry[0]; setAttr warp.targetMorphEnabled on");
    quarn::SceneSession session(options().scene);
    const quarn::Warp warp = quarn::Warp::find();
    const quarn::WarpGeometry& geometry = warp.geometry("");
    std::vector<float> points;
    {
        quarn::FrameSampler sampler(session.host(), warp, geometry, 1);
        sampler.sample(1);
        quarn::readPoints(geometry.output, points);
        EXPECT_EQ(points, restPoints()) << "in export mode";
        writeCache({std::vector<float>(15)});
        const auto failing = [&] { sampler.sample(2); };
        EXPECT_THAT(failing, ::testing::ThrowsMessage<std::runtime_error>(
                                 AllOf(StartsWith("frame 2: "), HasSubstr("has 5 vertices"), HasSubstr("has 12"))));
    }
    const auto expectMorph = [&] {
        writeTarget(2);
        session.host().setTime(1);
        quarn::readPoints(geometry.output, points);
        EXPECT_THAT(points, Pointwise(FloatNear(1e-6F), targetAt(0)));
    };
    expectMorph();
    writeTarget(2, [](std::size_t, std::vector<float>& xyz) { xyz[15] = std::numeric_limits<float>::quiet_NaN(); });
    EXPECT_THAT(failureOf([&] { quarn::FrameSampler(session.host(), warp, geometry, 2); }), HasSubstr("vertex 5"));
    expectMorph();
}

// what a model would get is known before there is a target
TEST_F(ExportTest, ControlsAloneAreThoseOfTheDataSet) {
    writeTarget(4);
    save(4);
    quarn::exportDatasets(options());
    save(4, "disconnectAttr strip_target.outMesh warp.targetGeometry[0]");
    quarn::ExportOptions controls = options();
    controls.output = folder.path() / "controls";
    EXPECT_EQ(quarn::exportControls(controls).rows, 4U);
    for (const char* file : {"controls.npy", "frames.npy"})
        EXPECT_EQ(contentOf(controls.output / file), contentOf(data() / file)) << file;
    EXPECT_THAT(contentOf(controls.output / "controls.json"), HasSubstr("\"arm.relativeMatrix:0\""));
    EXPECT_THAT(failureOf([&] { quarn::exportControls(controls); }), HasSubstr("--overwrite replaces them"));
    controls.output = data();
    controls.overwrite = true;
    EXPECT_THAT(failureOf([&] { quarn::exportControls(controls); }), HasSubstr("holds a data set"));
}

} // namespace
