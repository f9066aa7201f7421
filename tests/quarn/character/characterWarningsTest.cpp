// SPDX-License-Identifier: Apache-2.0
// Oddities that do not keep a character from being read.
#include "quarn/character/characterFiles.h"

#include <gmock/gmock.h>

namespace quarn {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;

std::vector<std::string> jointNames(const Character& character) {
    std::vector<std::string> names;
    for (const Joint& joint : character.joints)
        names.push_back(joint.name);
    return names;
}

TEST(CharacterWarnings, NamesAreMadeUnique) {
    Strip strip;
    strip.upper = R"({"name":"bone","children":[1]})";
    strip.lower = R"({"name":"bone","translation":[1,0,0]})";
    const Character character = read(strip.write());
    EXPECT_THAT(jointNames(character), ElementsAre("bone", "bone1"));
    EXPECT_THAT(character.warnings, ElementsAre(HasSubstr("several joints are named \"bone\"")));
    // the skin still means the right ones
    ASSERT_EQ(character.meshes[0].bindings.size(), 2U);
    EXPECT_EQ(character.meshes[0].bindings[1].inverseBind.row(3), HVector(-1, 0, 0));

    strip.upper = R"({"children":[1]})";
    strip.lower = R"({"translation":[1,0,0]})";
    EXPECT_THAT(jointNames(read(strip.write())), ElementsAre("joint0", "joint1"));
}

void addMesh(GltfWriter& file, const std::string& attributes) {
    const std::size_t points = file.floats("VEC3", stripPoints());
    const std::size_t triangles = file.shorts("SCALAR", stripTriangles());
    file.meshes.push_back(R"({"primitives":[{"attributes":{"POSITION":)" + std::to_string(points) + attributes +
                          "},\"indices\":" + std::to_string(triangles) + "}]}");
    file.roots += ",3";
}

struct Oddity {
    const char* warning;
    std::function<void(GltfWriter&)> make;
};

TEST(CharacterWarnings, EachIsOneSentence) {
    const std::vector<Oddity> oddities{
        {"the skeleton has 2 roots: \"upper\", \"lower\"",
         [](GltfWriter& file) {
             file.nodes[0] = R"({"name":"upper"})";
             file.roots = "0,1,2";
         }},
        {"the mesh \"prop\" has no skin",
         [](GltfWriter& file) {
             file.nodes.emplace_back(R"({"name":"prop","mesh":1})");
             addMesh(file, "");
         }},
        {"the mesh \"arm\" has 2 vertices without influence, of 6",
         [](GltfWriter& file) {
             std::vector<float> weights(32);
             for (const std::size_t vertex : {0U, 1U, 2U, 3U, 4U, 7U})
                 weights[4 * vertex] = 1.0F;
             file.replace("WEIGHTS_0", file.floats("VEC4", weights));
         }},
        {"several skins: the meshes are not all bound to \"lower\" by the same matrix",
         [](GltfWriter& file) {
             file.nodes.emplace_back(R"({"name":"glove","mesh":1,"skin":1})");
             file.skins.emplace_back(R"({"joints":[0,1]})");
             addMesh(file, R"(,"JOINTS_0":2,"WEIGHTS_0":3)");
         }},
        {"the mesh \"arm\" has 1 polygons with less than three different corners, which are left out",
         [](GltfWriter& file) {
             auto triangles = stripTriangles();
             triangles.insert(triangles.end(), {1, 4, 0});
             file.replace("indices", file.shorts("SCALAR", triangles));
         }},
        {"the importer says: Some faces had out-of-range indices. Those faces were dropped",
         [](GltfWriter& file) {
             auto triangles = stripTriangles();
             triangles.insert(triangles.end(), {0, 1, 8});
             file.replace("indices", file.shorts("SCALAR", triangles));
         }},
        // a joint that the skin does not have moves nothing
        {"the mesh \"arm\" has 6 vertices without influence, of 6",
         [](GltfWriter& file) { file.replace("JOINTS_0", file.shorts("VEC4", std::vector<std::uint16_t>(32, 9))); }},
    };
    for (const Oddity& oddity : oddities) {
        Strip strip;
        strip.more = oddity.make;
        EXPECT_THAT(read(strip.write()).warnings, ElementsAre(oddity.warning));
    }
}

} // namespace
} // namespace quarn
