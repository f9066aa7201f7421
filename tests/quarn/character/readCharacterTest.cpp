// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/readCharacter.h"

#include "quarn/character/characterFiles.h"
#include "quarn/import/RandomCharacter.h"
#include "support/failureOf.h"

#include <assimp/Exporter.hpp>
#include <assimp/Importer.hpp>
#include <gmock/gmock.h>

#include <set>

namespace quarn {
namespace {

using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

// at rest, a skin bound at rest stands where its points are
void expectRestPose(const Character& character) {
    const std::vector<HMatrix> worlds = plainWorlds(character, -1.0);
    for (const CharacterMesh& mesh : character.meshes)
        for (std::size_t i = 0; i < mesh.points.size(); ++i)
            EXPECT_TRUE(plainPoint(mesh, worlds, i).isEquivalent(mesh.points[i], 1e-5)) << i;
}

std::size_t edgeCount(const CharacterMesh& mesh) {
    std::set<std::pair<std::uint32_t, std::uint32_t>> edges;
    std::size_t begin = 0;
    for (const std::uint32_t size : mesh.polygonSizes) {
        for (std::size_t i = 0; i < size; ++i)
            edges.insert(std::minmax(mesh.corners[begin + i], mesh.corners[begin + (i + 1) % size]));
        begin += size;
    }
    return edges.size();
}

void expectStrip(const Character& character) {
    ASSERT_EQ(character.meshes.size(), 1U);
    const CharacterMesh& mesh = character.meshes[0];
    EXPECT_EQ(mesh.points.size(), 6U);
    EXPECT_EQ(mesh.polygonSizes.size(), 4U);
    EXPECT_EQ(edgeCount(mesh), 9U); // of two triangles each, 5 and 5, and one is the same
    EXPECT_EQ(mesh.bindings.size(), 2U);
    ASSERT_GE(character.joints.size(), 2U);
    EXPECT_EQ(character.joints.back().name, "lower");
    EXPECT_EQ(character.joints[character.joints.size() - 2].name, "upper");
    EXPECT_EQ(character.joints.back().parent, static_cast<int>(character.joints.size()) - 2);
}

TEST(ReadCharacter, JoinsTheSeam) {
    const Character character = read(Strip().write());
    expectStrip(character);
    expectRestPose(character);
    EXPECT_THAT(character.meshes[0].joinedOf, ElementsAre(0, 1, 2, 3, 1, 4, 5, 2));
    EXPECT_THAT(character.warnings, IsEmpty());
    EXPECT_EQ(character.meshes[0].name, "arm");
    EXPECT_THAT(describeCharacter(character),
                testing::HasSubstr("mesh arm: 8 vertices in the file, joined to 6; 4 polygons, 2 joints"));
}

TEST(ReadCharacter, KeepsVerticesThatMoveApart) {
    Strip strip;
    strip.seam = {0.5F, 0.625F};
    EXPECT_EQ(read(strip.write()).meshes[0].points.size(), 8U);
}

TEST(ReadCharacter, TheBinaryFormIsTheSame) {
    const Character text = read(Strip().write());
    const Character binary = readBytesAs("character.GLB", Strip().write().binary());
    EXPECT_EQ(describeCharacter(binary), describeCharacter(text));
    expectRestPose(binary);
}

// other formats index by corner, have their own units, and are written from the strip by the library that reads them
TEST(ReadCharacter, OtherFormatsGiveTheSameSurfaceOrAreRefused) {
    const std::string strip = Strip().write().text();
    Assimp::Importer importer;
    const aiScene* scene = importer.ReadFileFromMemory(strip.data(), strip.size(), 0, "gltf");
    ASSERT_NE(scene, nullptr);
    const struct {
        const char *format, *file, *what, *by, *reason;
    } damages[] = {
        {"collada", "strip.dae", "<p>0", "<p>900", "900"},
        {"collada", "strip.dae", "<node", "<nod", ""},
        {"fbxa", "text.fbx", "a: 0,1,-3", "a: 0,901,-3", ""},
        {"fbxa", "text.fbx", "a: 1,2,4,5,6,7", "a: 1,2,4,5,6,907", ""},
        {"fbxa", "text.fbx", "Geometry:", "Gometry:", "no mesh"},
    };
    for (const auto& [format, file, what, by, reason] : damages) {
        SCOPED_TRACE(std::string(file) + " " + by);
        Assimp::Exporter exporter;
        const aiExportDataBlob* blob = exporter.ExportToBlob(scene, format);
        ASSERT_NE(blob, nullptr) << exporter.GetErrorString();
        std::string text(static_cast<const char*>(blob->data), blob->size);
        const Character character = readBytesAs(file, text);
        expectStrip(character);
        expectRestPose(character);
        const std::size_t at = text.find(what);
        ASSERT_NE(at, std::string::npos);
        text.replace(at, std::string(what).size(), by);
        EXPECT_THAT(failureOf([&, name = file] { readBytesAs(name, text); }),
                    AllOf(HasSubstr(file + std::string(": ")), HasSubstr(reason)));
    }
}

TEST(ReadCharacter, ReadsAnyNumberOfInfluences) {
    Strip strip;
    strip.upper = R"({"name":"upper","children":[1,3,4,5,6,7]})";
    strip.more = [](GltfWriter& file) {
        const std::vector<float> eighths(32, 0.125F);
        std::vector<std::uint16_t> joints;
        for (int i = 0; i < 8; ++i)
            joints.insert(joints.end(), {2, 3, 4, 2});
        // vertex 0 has each of the first four once more, and the last joint moves nothing
        std::string& mesh = file.meshes[0];
        mesh.insert(mesh.find("\"JOINTS_0\""), "\"JOINTS_1\":" + std::to_string(file.shorts("VEC4", joints)) +
                                                   ",\"WEIGHTS_1\":" + std::to_string(file.floats("VEC4", eighths)) +
                                                   ",");
        for (int i = 0; i < 5; ++i)
            file.nodes.push_back(R"({"name":"finger)" + std::to_string(i) + "\"}");
        file.skins[0] = R"({"joints":[0,1,3,4,5,6,7]})";
    };
    const Character character = read(strip.write());
    const CharacterMesh& mesh = character.meshes.at(0);
    EXPECT_EQ(mesh.points.size(), 6U);
    EXPECT_EQ(mesh.bindings.size(), 7U);
    ASSERT_EQ(mesh.influences[0].size(), 4U); // upper and three fingers, one of them by two entries
    EXPECT_EQ(mesh.influences[0][1].weight, 0.25);
    ASSERT_EQ(mesh.influences[1].size(), 5U);
    EXPECT_EQ(character.joints[mesh.influences[1][4].joint].name, "finger2");
}

TEST(ReadCharacter, KeepsWhatStandsAboveTheJoints) {
    Strip strip;
    strip.upper = R"({"name":"upper","children":[1],"scale":[-1,2,0.5]})";
    strip.more = [](GltfWriter& file) {
        file.nodes.emplace_back(R"({"name":"still","children":[4]})");
        file.nodes.emplace_back(R"({"name":"offset","children":[5],"translation":[0,0,3]})");
        file.nodes.emplace_back(R"({"name":"group","children":[0,2]})");
        file.roots = "3";
    };
    const Character character = read(strip.write());
    ASSERT_EQ(character.joints.size(), 4U); // "still" does nothing
    EXPECT_EQ(character.joints[0].name, "offset");
    EXPECT_EQ(character.joints[0].restTransform.row(3), HVector(0, 0, 3));
    EXPECT_EQ(character.joints[1].name, "group");
    EXPECT_EQ(character.joints[2].restTransform.row(0), HVector(-1, 0, 0));
    EXPECT_LT(character.joints[2].restTransform.det3x3(), 0.0);
    EXPECT_EQ(plainWorlds(character, -1.0)[3].row(3), HVector(-1, 0, 3));
    EXPECT_EQ(character.meshes.at(0).parentJoint, 1);
    EXPECT_EQ(character.meshes.at(0).worldTransform.row(3), HVector(0, 0, 3));
}

TEST(ReadCharacter, ReadsAnimations) {
    Strip strip;
    strip.more = [](GltfWriter& file) {
        const std::size_t times = file.floats("SCALAR", {0, 0.5F, 2});
        const std::size_t moves = file.floats("VEC3", {1, 0, 0, 1, 2, 0, 1, 0, 4});
        const std::size_t turns = file.floats("VEC4", {0, 0, 0, 1, 0, 0, 0.6F, 0.8F, 0, 0, 0, 1});
        // of each key the tangent before it, its value, the tangent after it
        const std::size_t scales =
            file.floats("VEC3", {9, 9, 9, 1, 1, 1, 8, 8, 8, 9, 9, 9, 2, 2, 2, 8, 8, 8, 9, 9, 9, 3, 3, 3, 8, 8, 8});
        const auto sampler = [&](std::size_t output, const std::string& interpolation) {
            return "{\"input\":" + std::to_string(times) + ",\"output\":" + std::to_string(output) + interpolation +
                   "}";
        };
        file.animations = {R"({"name":"wave","samplers":[)" + sampler(moves, "") + "," +
                           sampler(turns, R"(,"interpolation":"STEP")") + "," +
                           sampler(scales, R"(,"interpolation":"CUBICSPLINE")") +
                           R"(],"channels":[{"sampler":0,"target":{"node":1,"path":"translation"}},)"
                           R"({"sampler":1,"target":{"node":1,"path":"rotation"}},)"
                           R"({"sampler":2,"target":{"node":1,"path":"scale"}}]})"};
    };
    const Character character = read(strip.write());
    EXPECT_THAT(character.warnings, ElementsAre(testing::HasSubstr("animations[0] has cubic splines")));
    ASSERT_EQ(character.animations.size(), 1U);
    const Animation& wave = character.animations[0];
    EXPECT_EQ(wave.name, "wave");
    EXPECT_EQ(wave.seconds, 2.0);
    ASSERT_EQ(wave.channels.size(), 1U);
    const JointChannel& channel = wave.channels[0];
    EXPECT_EQ(character.joints[channel.joint].name, "lower");
    ASSERT_EQ(channel.translation.keys.size(), 3U);
    EXPECT_EQ(channel.translation.interpolation, Interpolation::Linear);
    EXPECT_EQ(channel.translation.keys[1].seconds, 0.5);
    EXPECT_EQ(channel.translation.keys[1].value, HVector(1, 2, 0));
    ASSERT_EQ(channel.rotation.keys.size(), 3U);
    EXPECT_EQ(channel.rotation.interpolation, Interpolation::Step);
    EXPECT_TRUE(channel.rotation.keys[1].value.isEquivalent(HQuaternion(0, 0, 0.6, 0.8), 1e-6));
    ASSERT_EQ(channel.scale.keys.size(), 3U);
    EXPECT_EQ(channel.scale.keys[1].value, HVector(2, 2, 2));
}

} // namespace
} // namespace quarn
