// SPDX-License-Identifier: Apache-2.0
// quarn pose --write: poses as files, read back by quarn itself and by another reader.
#include "PoseTest.h"

#include "quarn/import/importCharacter.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/skins.h"

#include <assimp/Importer.hpp>
#include <assimp/postprocess.h>
#include <assimp/scene.h>

#include <array>
#include <cmath>
#include <map>
#include <set>
#include <sstream>

namespace {

using ::testing::HasSubstr;
using ::testing::StartsWith;

// by joint, its worldMatrix in every frame, and the points of the skinned mesh
struct Recording {
    std::map<std::string, std::vector<HMatrix>> worlds;
    std::vector<std::vector<double>> points;
};

class WritePosesTest : public PoseTest {
protected:
    Recording record(const std::string& file, int first, int last) const {
        const auto session = open(file);
        Recording recording;
        for (int frame = first; frame <= last; ++frame) {
            session->host().setTime(frame);
            for (const quarn::SceneJoint& joint : quarn::sceneJoints())
                recording.worlds[joint.name].push_back(quarn::plugOf(joint.node, "worldMatrix").asMatrix());
            recording.points.emplace_back();
            quarn::readPoints(quarn::findPlug("strip_skin.outputGeom[0]"), recording.points.back());
        }
        return recording;
    }

    // `unit`: lengths of `read` are those of `written` times this
    static void expectSame(const Recording& read, const Recording& written, double unit, double error) {
        for (const auto& [joint, worlds] : written.worlds) {
            ASSERT_EQ(read.worlds.count(joint), 1U) << joint;
            for (std::size_t frame = 0; frame < worlds.size(); ++frame)
                EXPECT_TRUE(read.worlds.at(joint)[frame].isEquivalent(scaled(worlds[frame], unit), error))
                    << joint << ", frame " << frame;
        }
        for (std::size_t frame = 0; frame < written.points.size(); ++frame)
            for (std::size_t i = 0; i < written.points[frame].size(); ++i)
                ASSERT_NEAR(read.points[frame][i], written.points[frame][i] * unit, 2.0 * error) << frame;
    }

    static HMatrix scaled(const HMatrix& matrix, double unit) {
        HMatrix scale;
        for (unsigned axis = 0; axis < 3; ++axis)
            scale(axis, axis) = unit;
        return matrix * scale;
    }

    // vertex, u and v of all corners
    std::set<std::array<float, 3>> uvsOf(const std::string& file) const {
        const auto session = open(file);
        const quarn::MeshPolygons polygons = quarn::polygonsOf(quarn::findPlug("strip.outMesh"));
        std::set<std::array<float, 3>> uvs;
        for (std::size_t i = 0; i < polygons.uvCorners.size(); ++i) {
            const float* uv = polygons.uvs.data() + std::size_t{2} * polygons.uvCorners[i];
            uvs.insert({static_cast<float>(polygons.corners[i]), uv[0], uv[1]});
        }
        return uvs;
    }

    void import(const std::string& file, const std::string& scene) const {
        quarn::ImportOptions options;
        options.file = path(file);
        options.output = path(scene);
        quarn::importCharacter(options);
    }
};

const char* const odd = R"(
setAttr middle.rotateOrder zxy; setAttr middle.jointOrientY 0.7
setAttr middle.restMatrix 1 0 0 0 0 1 0 0 0 0 1 0 1 0 0 1
setAttr tip.scaleY -1.5; setAttr tip.scaleX 0.5
setAttr root.parentMatrix 0 1 0 0 -1 0 0 0 0 0 1 0 3 4 5 1
createNode animCurve -name slide; setAttr slide.keyTimes 1 40; setAttr slide.keyValues 0 3
connectAttr time1.outTime slide.time; connectAttr slide.output root.translateZ; connectAttr slide.output tip.scaleZ
createNode blendShape -name shapes; connectAttr strip.outMesh shapes.input[0].inputGeometry
connectAttr -force shapes.outputGeom[0] strip_skin.input[0].inputGeometry
)";
const char* const inCentimetres = "createNode character -name character; setAttr character.metersPerUnit 0.01\n"
                                  "setAttr character.framesPerSecond 30\n";

TEST_F(WritePosesTest, WhatIsReadBackMovesAsTheSceneDoes) {
    const struct {
        const char* script;
        double unit, rate;
    } rows[] = {{"", 1.0, 24.0}, {odd, 1.0, 24.0}, {inCentimetres, 0.01, 30.0}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.script);
        stripScene::write(scene(), row.script);
        EXPECT_THAT(pose({"--samples", "40", "--write", path("poses.glb")}), HasSubstr("is at second 0"));
        pose({"--samples", "40", "--write", path("poses.json")});
        const Recording written = record("posed.json", 1, 40);

        quarn::ImportOptions options;
        options.file = path("poses.glb");
        options.output = path("back.json");
        options.framesPerSecond = row.rate;
        const quarn::ImportReport report = quarn::importCharacter(options);
        EXPECT_EQ(report.joints.size(), row.unit == 1.0 && *row.script == '\0' ? 3U : 4U);
        EXPECT_EQ(report.meshes.front().name, "strip"); // whatever moves it before its skin
        expectSame(record("back.json", 1, 40), written, row.unit, 1e-6);
        EXPECT_EQ(uvsOf("posed.json").size(), 4 * 8U);
        EXPECT_EQ(uvsOf("back.json"), uvsOf("posed.json"));

        stripScene::quarn({"pose", scene(), "-o", path("keyed.json"), "--keys", path("poses.json")});
        expectSame(record("keyed.json", 1, 40), written, 1.0, 1e-12);
    }
}

// a long set, whose times in single precision are a hair beside their frames
TEST_F(WritePosesTest, KeysStayOnTheirFrames) {
    stripScene::write(scene());
    pose({"--samples", "3000", "--start", "4001", "--write", path("poses.glb")});
    import("poses.glb", "back.json");
    expectSame(record("back.json", 6900, 7000), record("posed.json", 6900, 7000), 1.0, 1e-6);
}

TEST_F(WritePosesTest, AnotherReaderFindsTheSameSkeleton) {
    stripScene::write(scene());
    pose({"--samples", "25", "--write", path("poses.glb")});
    Assimp::Importer importer;
    const aiScene* file = importer.ReadFile(path("poses.glb"), aiProcess_ValidateDataStructure);
    ASSERT_NE(file, nullptr) << importer.GetErrorString();
    ASSERT_EQ(file->mNumAnimations, 1U);
    ASSERT_EQ(file->mNumMeshes, 1U);
    EXPECT_EQ(file->mMeshes[0]->mNumVertices, stripScene::vertexCount + stripScene::seamCopies);
    EXPECT_EQ(file->mMeshes[0]->mNumBones, 3U);
    EXPECT_STREQ(file->mRootNode->FindNode("tip")->mParent->mName.C_Str(), "middle");
    {
        const auto session = open();
        const std::vector<quarn::SceneJoint> joints = quarn::sceneJoints();
        EXPECT_THAT(quarn::movedVertices(quarn::sceneSkins(joints), 3), testing::ElementsAre(8, 4, 6));
    }
    const Recording written = record("posed.json", 1, 25);
    std::size_t channels = 0;
    for (unsigned c = 0; c < file->mAnimations[0]->mNumChannels; ++c) {
        const aiNodeAnim& channel = *file->mAnimations[0]->mChannels[c];
        if (std::string(channel.mNodeName.C_Str()) != "middle")
            continue;
        ++channels;
        ASSERT_EQ(channel.mNumRotationKeys, 25U);
        for (unsigned key = 0; key < 25; ++key) { // root is at rest: the rotation is that of the world
            EXPECT_NEAR(channel.mRotationKeys[key].mTime / file->mAnimations[0]->mTicksPerSecond, key / 24.0, 1e-6);
            const aiMatrix3x3 turn = channel.mRotationKeys[key].mValue.GetMatrix();
            for (unsigned row = 0; row < 3; ++row)
                for (unsigned column = 0; column < 3; ++column)
                    EXPECT_NEAR(turn[column][row], written.worlds.at("middle")[key](row, column), 1e-6);
        }
    }
    EXPECT_EQ(channels, 1U);
}

TEST_F(WritePosesTest, FramesKeepTheirNumbersUnlessTheyAreMoved) {
    stripScene::write(scene(), "createNode animCurve -name wag; setAttr wag.keyTimes 1 9; setAttr wag.keyValues 0 1\n"
                               "connectAttr time1.outTime wag.time; connectAttr wag.output root.translateY\n"
                               "createNode sliders -name face; setAttr face.slider[2].sliderName jaw\n"
                               "connectAttr wag.output face.slider[2].value\n");
    EXPECT_THAT(poseFailure({"--samples", "3", "--start", "-4", "--write", path("p.glb")}),
                HasSubstr("frame -4 would lie at second -0.208333"));
    EXPECT_FALSE(std::filesystem::exists(path("posed.json")));
    EXPECT_THAT(pose({"--samples", "3", "--start", "-4", "--write", path("p.glb"), "--frame-offset", "5"}),
                HasSubstr("frame -4 of the scene is at second 0"));
    // what the scene does by itself, with nothing sampled
    const std::string before = bytes(scene());
    stripScene::quarn({"pose", scene(), "--write", path("p.csv"), "--frame-offset", "-1", "--frames", "2-8x3"});
    EXPECT_EQ(bytes(scene()), before);
    EXPECT_THAT(
        bytes(path("p.csv")),
        StartsWith("frame,root.translateX,root.translateY,root.translateZ,face.jaw,middle.rotateX,middle.rotateY,"
                   "middle.rotateZ,tip.rotateZ\n1,0,0.125,0,0.125,0,0,0,0\n4,0,0.5,0,0.5,"));
    stripScene::quarn({"pose", scene(), "--write", path("p.json")}); // from the first key to the last
    EXPECT_THAT(bytes(path("p.json")), HasSubstr("\"root.translateY\": [[1, 0], [2, 0.125], "));
    EXPECT_THAT(bytes(path("p.json")), HasSubstr("\"tip.rotateZ\": [[1, 0], [9, 0]]"));
    stripScene::quarn({"pose", scene(), "-o", path("keyed.json"), "--keys", path("p.json")});
    EXPECT_EQ(at(*open("keyed.json"), 5, "face.slider[2].value"), 0.5); // by its name
}

// the plain formula: positions and Rz * Rx * Ry of every joint, down the hierarchy as it stands in the file
TEST_F(WritePosesTest, ABvhMovesAsTheSceneDoes) {
    stripScene::write(scene(), "setAttr middle.rotateOrder zxy; setAttr middle.jointOrientY 0.7\n"
                               "setAttr middle.restMatrix 1 0 0 0 0 1 0 0 0 0 1 0 1 0 0 1\n");
    EXPECT_THAT(pose({"--samples", "9", "--write", path("p.bvh")}), HasSubstr("first line of motion"));
    const Recording written = record("posed.json", 1, 9);
    std::istringstream file(bytes(path("p.bvh")));
    std::string line;
    std::vector<std::string> names;
    while (std::getline(file, line) && !line.starts_with("Frame Time"))
        if (const auto name = line.find(" ", line.find_first_not_of(' '));
            line.find("ROOT") != std::string::npos || line.find("JOINT") != std::string::npos)
            names.push_back(line.substr(name + 1));
    EXPECT_THAT(names, testing::ElementsAre("root", "middle", "tip")); // each the child of the one before
    EXPECT_THAT(line, StartsWith("Frame Time: 0.041666"));
    const double radians = std::acos(-1.0) / 180.0;
    for (std::size_t frame = 0; frame < 9; ++frame) {
        HMatrix world;
        for (const std::string& name : names) {
            double v[6];
            for (double& value : v)
                file >> value;
            const auto about = [&](double angle, const HVector& axis) {
                return HQuaternion(angle * radians, axis).asMatrix();
            };
            HMatrix local = about(v[5], {0, 1, 0}) * about(v[4], {1, 0, 0}) * about(v[3], {0, 0, 1});
            local.setRow(3, {v[0], v[1], v[2]});
            world = local * world;
            EXPECT_TRUE(world.isEquivalent(written.worlds.at(name)[frame], 1e-9)) << name << ", frame " << frame;
        }
    }
}

TEST_F(WritePosesTest, WhatCannotBeWrittenIsRefusedByName) {
    const struct {
        std::string script;
        std::vector<std::string> flags;
        const char* says;
    } rows[] = {
        {"", {"--write", path("p.fbx")}, "p.fbx: poses are written as .glb"},
        {"", {"--write", scene()}, "would replace the scene"},
        {"", {"--write", path("posed.json")}, "would replace the scene"},
        {"", {"--write", path("posed.json/p.glb")}, "posed.json"},
        {"createNode joint -name far; connectAttr far.matrix root.parentMatrix",
         {"--write", path("p.glb")},
         "far.matrix"},
        {"", {"--frame-offset", "1"}, "--write"},
        {"", {"--write", path("p.bvh"), "--frame-offset", "1"}, "no numbers in"},
        {"setAttr tip.scaleY 2", {"--write", path("p.bvh")}, "the joint tip has a scale of 2 in frame 1"},
        {"createNode joint -name other", {"--write", path("p.bvh")}, "2 roots"},
    };
    for (const auto& row : rows) {
        stripScene::write(scene(), row.script);
        const std::string before = bytes(scene());
        std::vector<std::string> flags = row.flags;
        flags.insert(flags.end(), {"--samples", "2"});
        EXPECT_THAT(poseFailure(flags), HasSubstr(row.says));
        EXPECT_EQ(bytes(scene()), before);
        EXPECT_FALSE(std::filesystem::exists(path("p.glb")) || std::filesystem::exists(path("p.bvh")));
    }
    EXPECT_THAT(failureOf([&] { stripScene::quarn({"pose", scene()}); }), HasSubstr("--output is required"));
    EXPECT_THAT(failureOf([&] {
                    stripScene::quarn({"pose", scene(), "--write", path("p.csv"), "--samples", "3"});
                }),
                HasSubstr("--output"));
    EXPECT_FALSE(std::filesystem::exists(path("p.csv")));
}

// a motion made by hand is an animation to take poses from; poses that were sampled are not
TEST_F(WritePosesTest, PosesAreTakenFromAMotionMadeByHand) {
    stripScene::write(scene());
    pose({"--keys", write("k.json", R"({"keys": {"tip.rotateZ": [[1, 0.5], [11, 1.5]]}})")});
    std::filesystem::rename(path("posed.json"), scene());
    EXPECT_THAT(pose({"--from", "both", "--samples", "6", "--json"}), HasSubstr("\"fromAnimation\": 10,"));
    const auto session = open();
    EXPECT_NEAR(at(*session, 16, "tip.rotateZ"), 1.5, 1e-12);
    EXPECT_EQ(quarn::findPlug("tip.rotateZ").source().name(), "tip_rotateZ_pose.output");
}

} // namespace
