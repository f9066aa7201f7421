// SPDX-License-Identifier: Apache-2.0
// From files to files.
#include "quarn/import/importCharacter.h"

#include "openquarn_app/SceneFile.h"
#include "quarn/character/characterFiles.h"
#include "quarn/import/ImportTest.h"
#include "quarn/import/jsonFiles.h"
#include "quarn/pose/samplePoses.h"
#include "quarn/pose/writePoses.h"
#include "quarn/scene/ControlReader.h"
#include "quarn/scene/PoseControls.h"
#include "quarn/scene/Warp.h"
#include "quarn/scene/vertexMap.h"
#include "storage/npyArray.h"
#include "support/TemporaryFolder.h"

#include <fstream>
#include <sstream>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class ImportCharacter : public testing::Test {
protected:
    ImportCharacter() {
        findDeformer();
        options_.file = write("strip.gltf", Strip().write().text());
        options_.output = path("scene.json");
    }

    fs::path path(const std::string& name) const { return folder_.path() / name; }
    fs::path write(const std::string& name, const std::string& text) const {
        std::ofstream(path(name), std::ios::binary) << text;
        return path(name);
    }

    ImportOptions options_;

private:
    TemporaryFolder folder_;
};

// of the poses, by name and range; each is one that the network sees, too
std::string controlsOf(const fs::path& scene) {
    const SceneSession session(SceneOptions{scene, {}, 0});
    std::ostringstream text;
    const Warp warp = Warp::find();
    for (const PoseControl& control : poseControls(poseCollector(warp)))
        text << (text.str().empty() ? "" : ", ") << controlName(control.plug) << ' ' << control.limits.least << ' '
             << control.limits.most;
    ControlReader seen(warp);
    seen.read();
    seen.readNames();
    EXPECT_EQ(text.str().find("arm_sliders.high") != std::string::npos, seen.names().back() == "arm_sliders.high");
    return text.str();
}

// "lower" turns by a right angle about z within a second
void turnLower(GltfWriter& file) {
    const std::size_t times = file.floats("SCALAR", {0, 1});
    const std::size_t turns = file.floats("VEC4", {0, 0, 0, 1, 0, 0, 0.70710678F, 0.70710678F});
    file.animations = {R"({"name":"wave","samplers":[{"input":)" + std::to_string(times) +
                       ",\"output\":" + std::to_string(turns) +
                       R"(}],"channels":[{"sampler":0,"target":{"node":1,"path":"rotation"}}]})"};
}

TEST_F(ImportCharacter, AFolderWithTheSceneCanBeMoved) {
    Strip strip;
    strip.more = turnLower;
    fs::create_directory(path("before"));
    options_.file = write("before/arm.gltf", strip.write().text());
    options_.output = path("before/arm.json");
    options_.framesPerSecond = 10.0;
    options_.neuralWarp = true;
    options_.withRoots = true;
    const ImportReport report = importCharacter(options_);
    EXPECT_THAT(report.warnings, IsEmpty());
    EXPECT_EQ(report.curves, 1U);
    EXPECT_EQ(report.poseInputs, 1U);
    options_.noAnimation = true;
    options_.output = path("before/still.json");
    EXPECT_EQ(importCharacter(options_).curves, 0U);
    EXPECT_EQ(report.meshes.at(0).fileVertices, 8U);
    EXPECT_EQ(report.meshes.at(0).vertices, 6U);
    fs::rename(path("before"), path("after"));

    SceneSession session(SceneOptions{path("after/arm.json"), {}, 0});
    EXPECT_THAT(OpenQuarn::filesToArchive(),
                testing::IsSupersetOf({path("after/arm.gltf").string(), path("after/arm.vertices.npy").string()}));
    session.host().setTime(11.0);
    // the far end is at 2, 0 and 2, 1 at rest, and turns about 1, 0
    EXPECT_THAT(pointsOf(findPlug("arm_skin.outputGeom[0]")),
                testing::Pointwise(testing::DoubleNear(1e-6),
                                   {0., 0., 0., 1., 0., 0., .5, .5, 0., 0., 1., 0., 1., 1., 0., 0., 1., 0.}));
    EXPECT_EQ(textOf(findPlug("character.sourceFile")), "arm.gltf");
    EXPECT_EQ(numberOf(findPlug("character.framesPerSecond")), 10.0);
    EXPECT_THAT(readVertexMap("arm"), ElementsAre(0, 1, 2, 3, 1, 4, 5, 2)) << "and the digest is that of the map";
    EXPECT_EQ(numberOf(findPlug("warp.exportEndFrame")), 11.0) << "a second";
    for (const auto& [attribute, value] : {std::pair("principalShapesLimit", 200.0),
                                           {"batchSize", 32.0},
                                           {"principalShapesAccuracy", static_cast<double>(0.99999F)},
                                           {"learningRate", 0.003},
                                           {"validationRatio", static_cast<double>(0.1F)}})
        EXPECT_EQ(numberOf(findPlug(std::string("warp.train[0].") + attribute)), value) << attribute;

    // all of it in another folder, the pattern that stands for the maps of several meshes as well
    setText(findPlug("character.vertexMapFile"), "arm.{mesh}.npy");
    fs::create_directory(path("third"));
    session.save(path("third/arm.json"));
    EXPECT_EQ(textOf(findPlug("character.sourceFile")), path("after/arm.gltf"));
    EXPECT_EQ(textOf(findPlug("character.vertexMapFile")), path("after/arm.{mesh}.npy"));
    EXPECT_EQ(textOf(findPlug("warp.modelRoot")), "models") << "there is none";
}

TEST_F(ImportCharacter, SetsADeformerUp) {
    options_.neuralWarp = true;
    options_.limits = write("limits.json", R"({"lower": {"rotateY": [-180, 90], "rotateZ": [0, 45.0]}, "upper": {}})");
    options_.warp.samples = 77;
    options_.warp.deltaMode = "offset";
    options_.warp.smoothing = 4;
    const double c = std::cos(0.5), s = std::sin(0.5); // of what the joint is turned by about z
    const std::vector<double> axes{c, s, 0.0, -s, c, 0.0};
    const std::pair<const char*, std::vector<double>> rows[] = {
        {"double-axis", axes},
        {"ortho", axes},
        {"quaternion", {0.0, 0.0, std::sin(0.25), std::cos(0.25)}},
        {"euler", {0.0, 0.0, 0.5}},
    };
    for (const auto& [controls, wanted] : rows) {
        SCOPED_TRACE(controls);
        options_.warp.controls = controls;
        EXPECT_EQ(importCharacter(options_).poseInputs, 2U);

        const SceneSession session(SceneOptions{options_.output, {}, 0});
        const Warp warp = Warp::find();
        EXPECT_EQ(warp.name, "warp");
        ASSERT_EQ(warp.geometries.size(), 1U);
        EXPECT_EQ(warp.geometries[0].name, "arm");
        EXPECT_STREQ(warp.geometries[0].input.name().asChar(), "arm_skin.outputGeom[0]");
        EXPECT_EQ(textOf(warp.plug("models[0].modelName")), "arm");
        EXPECT_EQ(textOf(warp.plug("modelRoot")), "models");
        EXPECT_EQ(numberOf(warp.plug("export[0].deltaMode")), 0.0);
        EXPECT_EQ(numberOf(warp.plug("export[0].smoothingIterations")), 4.0);
        EXPECT_EQ(nodeName(warp.plug("poseGenerator").source().node()), "poses");
        EXPECT_EQ(numberOf(findPlug("poses.samples")), 77.0);
        EXPECT_EQ(findPlug("poses.inputList[0].input[1]").source(), findPlug("lower.rotateZ"));
        EXPECT_NEAR(numberOf(findPlug("poses.limitsList[0].limits[0].minValue")), -3.14159265, 1e-8);

        setNumber(findPlug("lower.rotateZ"), 0.5);
        EXPECT_THAT(numbersOf(findPlug("warp.controlValues")),
                    testing::ElementsAreArray(numbersOf(findPlug("controls.output"))));
        EXPECT_THAT(numbersOf(findPlug("controls.output")), testing::Pointwise(testing::DoubleNear(1e-12), wanted));
    }
}

// names of the file that the scene's own nodes have, or that no node may have, and a mesh that stays where it is
TEST_F(ImportCharacter, SeveralMeshesAndOddNames) {
    Strip strip;
    strip.upper = R"({"name":"warp","children":[1]})";
    strip.lower = R"({"translation":[1,0,0]})";
    strip.mesh = R"({"name":"1 arm/é","mesh":0,"skin":0})";
    strip.more = [](GltfWriter& file) {
        file.nodes.emplace_back(R"({"name":"controls","mesh":0,"skin":0})");
        file.nodes.emplace_back(R"({"name":"table","mesh":1,"translation":[0,3,0]})");
        file.meshes.emplace_back(R"({"primitives":[{"attributes":{"POSITION":0},"indices":1}]})");
        file.roots = "0,2,3,4";
    };
    options_.file = write("odd.gltf", strip.write().text());
    options_.neuralWarp = true;
    const ImportReport report = importCharacter(options_);
    EXPECT_THAT(
        report.notes,
        testing::Contains("the mesh \"table\" follows no joint and no weight, and is no geometry of the deformer"));
    EXPECT_EQ(report.joints.at(0).node, "warp1");
    EXPECT_EQ(report.meshes.at(0).node, "_1_arm___");
    EXPECT_EQ(report.meshes.at(1).node, "controls1");
    EXPECT_THAT(storage::readIntegers(path("scene.table.vertices.npy")), ElementsAre(0, 1, 2, 3, 1, 4, 5, 2));

    const SceneSession session(SceneOptions{options_.output, {}, 0});
    EXPECT_EQ(textOf(findPlug("character.vertexMapFile")), "scene.{mesh}.vertices.npy");
    EXPECT_THAT(OpenQuarn::filesToArchive(),
                testing::AllOf(testing::Contains(path("scene.table.vertices.npy").string()),
                               testing::Not(testing::Contains(HasSubstr("{mesh}")))));
    EXPECT_EQ(Warp::find().geometries.at(1).name, "controls1");
    EXPECT_EQ(pointsOf(findPlug("table.outMesh"))[1], 3.0);
    EXPECT_EQ(pointsOf(findPlug("_1_arm____skin.outputGeom[0]")), pointsOf(findPlug("_1_arm___.outMesh")));
}

TEST_F(ImportCharacter, ParentsMendASkeletonInPieces) {
    Strip strip;
    strip.upper = R"({"name":"upper"})";
    strip.more = [](GltfWriter& file) { file.roots = "0,1,2"; };
    options_.file = write("flat.gltf", strip.write().text());
    EXPECT_THAT(importCharacter(options_).warnings, ElementsAre(HasSubstr("2 roots")));
    options_.parents = write("parents.json", R"({"lower": "upper"})");
    EXPECT_THAT(importCharacter(options_).warnings, IsEmpty());
    const SceneSession session(SceneOptions{options_.output, {}, 0});
    EXPECT_EQ(numberOf(findPlug("lower.translateX")), 1.0);
    EXPECT_STREQ(findPlug("lower.parentMatrix").source().name().asChar(), "upper.worldMatrix");
}

// "lower" turns, then jumps up; one end of the strip rises in the second only, which is not a whole number of frames
// long
void turnAndRise(GltfWriter& file) {
    turnLower(file);
    const std::size_t times = file.floats("SCALAR", {0, 0.55F});
    const std::size_t moves = file.floats("VEC3", {1, 0, 0, 1, 4, 0});
    const std::size_t weights = file.floats("SCALAR", {0.5F, 1.5F});
    file.animations.push_back(R"({"name":"rise","samplers":[{"interpolation":"STEP","input":)" + std::to_string(times) +
                              ",\"output\":" + std::to_string(moves) + "},{\"input\":" + std::to_string(times) +
                              ",\"output\":" + std::to_string(weights) +
                              R"(}],"channels":[{"sampler":0,"target":{"node":1,"path":"translation"}},)"
                              R"({"sampler":1,"target":{"node":2,"path":"weights"}}]})");
    // the skin makes the mesh twice as high, and with it what rises
    file.skins[0] = R"({"joints":[0,1],"inverseBindMatrices":)" +
                    std::to_string(file.floats("MAT4", {1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 2, 0, 0,  0, 0, 1, //
                                                        1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 2, 0, -1, 0, 0, 1})) +
                    "}";
    std::vector<float> deltas(24, 0.0F);
    deltas[2] = 0.5F;
    std::string& mesh = file.meshes[0];
    mesh.insert(mesh.find("\"indices\""),
                R"("targets":[{"POSITION":)" + std::to_string(file.floats("VEC3", deltas)) + "}],");
    mesh.insert(1, R"("weights":[0.25],"extras":{"targetNames":["high"]},)");
}

TEST_F(ImportCharacter, ClipsLieOneAfterAnotherAndShapesBeforeTheSkin) {
    Strip strip;
    strip.more = turnAndRise;
    options_.file = write("clips.gltf", strip.write().text());
    options_.framesPerSecond = 10.0;
    options_.neuralWarp = true;
    options_.withRoots = true;
    options_.animations = {"all"};
    const ImportReport report = importCharacter(options_);
    EXPECT_EQ(report.curves, 3U);
    EXPECT_EQ(report.meshes.at(0).morphTargets, 1U);
    EXPECT_EQ(report.animations.at(1).firstFrame, 13);
    EXPECT_EQ(report.animations.at(1).lastFrame, 18);

    SceneSession session(SceneOptions{options_.output, {}, 0});
    EXPECT_EQ(textOf(findPlug("character.clips")),
              R"([{"name":"wave","first":1,"last":11},{"name":"rise","first":13,"last":18}])");
    EXPECT_EQ(numberOf(findPlug("warp.exportEndFrame")), 18.0);
    const struct {
        double frame, angle, height, weight;
    } wanted[] = {
        {1, 0, 0, 0.25},
        {6, 0.25, 0, 0.25},
        {11, 0.5, 0, 0.25},
        {12, 0.5, 0, 0.25},
        {13, 0, 0, 0.5},
        {18, 0, 0, 0.5 + 10.0 / 11},
        {18.4, 0, 0, 0.5 + 10.8 / 11},
        {19, 0, 4, 1.5},
    };
    for (const auto& at : wanted) {
        SCOPED_TRACE(at.frame);
        session.host().setTime(at.frame);
        EXPECT_NEAR(numberOf(findPlug("lower.rotateZ")), at.angle * 3.14159265, 1e-5);
        EXPECT_NEAR(numberOf(findPlug("lower.translateY")), at.height, 1e-5);
        EXPECT_NEAR(numberOf(findPlug("arm_sliders.output[0]")), at.weight, 1e-5);
        EXPECT_NEAR(pointsOf(findPlug("arm_skin.outputGeom[0]"))[2], at.weight, 1e-5);
    }
    EXPECT_NEAR(numberOf(findPlug("arm_sliders.slider[0].maxValue")), 1.5, 1e-6);
}

// in the order in which they are named; what the second does not know of goes back to rest
TEST_F(ImportCharacter, ClipsEndAtAWholeFrame) {
    Strip strip;
    strip.more = turnAndRise;
    options_.file = write("clips.gltf", strip.write().text());
    options_.framesPerSecond = 10.0;
    options_.animations = {"rise", "wave"};
    importCharacter(options_);
    SceneSession session(SceneOptions{options_.output, {}, 0});
    EXPECT_EQ(textOf(findPlug("character.clips")),
              R"([{"name":"rise","first":1,"last":6},{"name":"wave","first":9,"last":19}])");
    const std::pair<double, double> weights[] = {{6.5, 1.5}, {8, 1.5}, {9, 0.25}, {19, 0.25}};
    for (const auto& [frame, weight] : weights) {
        session.host().setTime(frame);
        EXPECT_NEAR(numberOf(findPlug("arm_sliders.output[0]")), weight, 1e-5) << frame;
    }
}

// the strip without its joints
void onlyRise(GltfWriter& file) {
    turnAndRise(file);
    file.nodes = {R"({"name":"arm","mesh":0})"};
    file.roots = "0";
    file.skins.clear();
    std::string& rise = file.animations[1];
    rise.replace(rise.find(R"({"sampler":0)"), rise.find(R"({"sampler":1)") - rise.find(R"({"sampler":0)"), "");
    rise.replace(rise.find("\"node\":2"), 8, "\"node\":0");
    file.animations.erase(file.animations.begin());
}

struct Controls {
    const char* name;
    std::function<void(ImportOptions&)> change;
    std::string limits; ///< a file of them; without, it is what the import writes that counts
    const char* wanted; ///< name and range of each control
};

TEST_F(ImportCharacter, WeightsOfMorphTargetsAreControlsAsAnglesAre) {
    const std::vector<Controls> rows = {
        {"all", [](ImportOptions& o) { o.animations = {"all"}; }, "", "lower.rotateZ 0 1.5708, arm_sliders.high 0 1.5"},
        {"what the animation leaves alone", [](ImportOptions& o) { o.animations = {"rise"}; }, "",
         "arm_sliders.high 0 1.5"},
        {"another animation", [](ImportOptions& o) { o.animations = {"wave"}; }, "",
         "lower.rotateZ 0 1.5708, arm_sliders.high 0 1"},
        {"no animation",
         [](ImportOptions& o) { o.noAnimation = true, o.withRoots = false, o.limitsFrom = LimitsFrom::none; }, "",
         "lower.rotateX -0.523599 0.523599, lower.rotateY -0.523599 0.523599, lower.rotateZ -0.523599 0.523599, "
         "arm_sliders.high 0 1"},
        {"no weights", [](ImportOptions& o) { o.morphControls = false; }, "", "lower.rotateZ 0 1.5708"},
        {"limits of a slider", [](ImportOptions&) {}, R"({"arm_sliders.high": [0.25, 0.5]})",
         "arm_sliders.high 0.25 0.5"},
        {"limits of a joint", [](ImportOptions&) {}, R"({"lower": {"rotateZ": [0, 45]}})", "lower.rotateZ 0 0.785398"},
        {"no joints", [&](ImportOptions& o) { o.file = path("face.gltf"); }, "", "arm_sliders.high 0 1.5"}};
    Strip strip;
    strip.more = turnAndRise;
    write("arm.gltf", strip.write().text());
    strip.more = onlyRise;
    write("face.gltf", strip.write().text());
    options_.neuralWarp = true;
    options_.withRoots = true;
    for (const Controls& row : rows) {
        SCOPED_TRACE(row.name);
        ImportOptions options = options_;
        options.file = path("arm.gltf");
        row.change(options);
        if (!row.limits.empty())
            options.limits = write("limits.json", row.limits);
        else
            options.writtenLimits = path(std::string(row.name) + ".json");
        const ImportReport report = importCharacter(options);
        EXPECT_EQ(controlsOf(options.output), row.wanted);
        if (row.limits.empty()) { // and the same comes of what it has written
            options.limits = std::exchange(options.writtenLimits, {});
            importCharacter(options);
            EXPECT_EQ(controlsOf(options.output), row.wanted);
        }
        EXPECT_EQ(report.meshes.at(0).skin, options.file == path("face.gltf") ? "arm_shapes" : "arm_skin");
    }
    options_.file = path("arm.gltf");
    options_.limits = write("limits.json", R"({"arm_sliders.low": [0, 1]})");
    EXPECT_THAT(failureOf([&] { importCharacter(options_); }),
                HasSubstr("a slider \"arm_sliders.low\" that there is not; there is arm_sliders.high"));
    options_.morphControls = false;
    EXPECT_THAT(failureOf([&] { importCharacter(options_); }), HasSubstr("--no-morph-controls leaves it out"));
    options_.limits.clear();
    options_.file = path("face.gltf");
    EXPECT_THAT(failureOf([&] { importCharacter(options_); }), HasSubstr("no morph targets that are controls"));
}

// sampled, written as an animation of the character, and imported once more
TEST_F(ImportCharacter, PosesComeBackWithTheirWeights) {
    for (const auto& [name, more, mover] :
         {std::tuple("arm", &turnAndRise, "arm_skin"), std::tuple("face", &onlyRise, "arm_shapes")}) {
        SCOPED_TRACE(name);
        Strip strip;
        strip.more = more;
        options_.file = write(std::string(name) + ".gltf", strip.write().text());
        options_.neuralWarp = true;
        options_.metersPerUnit = 0.01;
        importCharacter(options_);
        const auto shapesOf = [mover = std::string(mover)](SceneSession& session, std::size_t frames) {
            std::vector<std::vector<double>> shapes;
            for (std::size_t frame = 1; frame <= frames; ++frame) {
                session.host().setTime(static_cast<double>(frame));
                shapes.push_back(pointsOf(findPlug(mover + ".outputGeom[0]")));
            }
            return shapes;
        };
        constexpr std::size_t frames = 6;
        std::vector<std::vector<double>> sampled;
        {
            Console console;
            console.quiet = true;
            SceneSession session(SceneOptions{options_.output, {}, 0});
            SampleOptions sampling;
            sampling.samples = frames;
            sampling.activationRate = 1.0;
            samplePoses(Warp::find(), sampling, console);
            sampled = shapesOf(session, frames);
            EXPECT_NE(sampled.at(1), sampled.at(2));
            EXPECT_EQ(writePoses({path("poses.glb"), 0}, Warp::find(), {1, frames, 1}, console).meshes, 1U);
        }
        ImportOptions back = options_;
        back.file = path("poses.glb");
        back.output = path("back.json");
        back.metersPerUnit.reset();
        importCharacter(back);
        SceneSession session(SceneOptions{back.output, {}, 0});
        const double unit = numberOf(findPlug("character.metersPerUnit"));
        const std::vector<std::vector<double>> read = shapesOf(session, frames);
        for (std::size_t frame = 0; frame < frames; ++frame)
            for (std::size_t i = 0; i < read[frame].size(); ++i)
                EXPECT_NEAR(read[frame][i] * unit / 0.01, sampled[frame].at(i), 1e-5) << frame << ' ' << i;
    }
}

TEST_F(ImportCharacter, WhatCannotBeDoneLeavesNoScene) {
    const auto refused = [&](const std::string& why, const std::function<void(ImportOptions&)>& change) {
        ImportOptions options = options_;
        change(options);
        EXPECT_THAT(failureOf([&] { importCharacter(options); }), HasSubstr(why));
        EXPECT_FALSE(fs::exists(path("scene.json")));
    };
    refused("strip.gltf has no animation \"run\"", [](ImportOptions& options) { options.animations = {"run"}; });
    refused("--animation wave is given twice", [&](ImportOptions& options) {
        Strip strip;
        strip.more = turnLower;
        options.file = write("wave.gltf", strip.write().text());
        options.animations = {"wave", "wave"};
    });
    refused("does not exist", [&](ImportOptions& options) { options.file = path("none.glb"); });
    refused("is the character itself", [&](ImportOptions& options) { options.output = options.file; });
    refused("is a folder", [&](ImportOptions& options) { options.output = path("."); });
    refused("table.gltf has meshes (table of 6 vertices), 0 joints, 0 animations, and no skin",
            [&](ImportOptions& options) {
                options.file = write("table.gltf", [] {
                    GltfWriter file = Strip().write();
                    file.nodes = {R"({"name":"table","mesh":0})"};
                    file.roots = "0";
                    file.skins.clear();
                    return file.text();
                }());
                options.neuralWarp = true;
            });
}

TEST_F(ImportCharacter, DamagedJsonFilesAreRefusedByName) {
    const auto parents = [&](const std::string& text) {
        return failureOf([&] { readParents(write("p.json", text)); });
    };
    const auto limits = [&](const std::string& text) { return failureOf([&] { readLimits(write("l.json", text)); }); };
    EXPECT_THAT(parents("{\n\"a\": \"b\",\n}"), HasSubstr("p.json: line 3, column 1: "));
    EXPECT_THAT(parents("[]"), HasSubstr("holds no JSON object"));
    EXPECT_THAT(parents(""), HasSubstr("line 1"));
    EXPECT_THAT(parents(R"({"a": 1})"), HasSubstr("\"a\": its parent is not a text"));
    EXPECT_THAT(parents(R"({"a": "b", "a": "c"})"), HasSubstr("\"a\": it stands twice"));
    EXPECT_THAT(failureOf([&] { readParents(path("none.json")); }), HasSubstr("none.json does not exist"));
    EXPECT_THAT(failureOf([] { readLimits("/dev/zero"); }), HasSubstr("/dev/zero is no regular file"));
    EXPECT_THAT(limits(R"({"a": 1})"), HasSubstr("\"a\": neither an object of axes"));
    EXPECT_THAT(limits(R"({"a": [0]})"), HasSubstr("\"a\": not [least, largest]"));
    EXPECT_THAT(limits(R"({"a": {"rotatex": [0, 1]}})"), HasSubstr("\"rotatex\" is not one of"));
    EXPECT_THAT(limits(R"({"a": {"rotateX": [0, 1, 2]}})"), HasSubstr("rotateX: not [least, largest] in degrees"));
    EXPECT_THAT(limits(R"({"a": {"rotateX": [10, 10]}})"), HasSubstr("rotateX: the first of the two"));
    EXPECT_THAT(limits(R"({"a": {"rotateX": [0, NaN]}})"), HasSubstr("line 1"));
}

} // namespace
} // namespace quarn
