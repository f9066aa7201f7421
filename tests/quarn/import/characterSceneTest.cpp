// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/ImportTest.h"

namespace quarn {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;

TEST(CharacterScene, MovesAsTheFileSays) {
    for (const bool boundAtRest : {true, false})
        for (unsigned seed = 1; seed <= 6; ++seed) {
            SCOPED_TRACE(testing::Message() << "seed " << seed << ", bound at rest " << boundAtRest);
            const Character character = randomCharacter(seed, {8, false, boundAtRest, false});
            {
                TestScene rest(character, nullptr);
                rest.expectPlain(-1.0);
                if (boundAtRest)
                    rest.expectStill();
                EXPECT_THAT(rest.scene().notes.size(), boundAtRest ? 0U : 2U);
                EXPECT_THAT(rest.scene().notes, testing::Each(HasSubstr("(joint \"joint1\")"))) << "the first of all";
            }
            TestScene moving(character, &character.animations[0]);
            for (const double seconds : {0.0, 0.1, 0.25, 0.55, 1.0, 2.0})
                moving.expectPlain(seconds);
        }
}

// the joints of the scene are as at rest when nothing has been done to them, whatever their scales
TEST(CharacterScene, RelativeMatricesAreTheIdentityAtRest) {
    const Character character = randomCharacter(3, {});
    TestScene scene(character, nullptr);
    for (const HObject& joint : scene.scene().joints) {
        EXPECT_TRUE(plugOf(joint, "relativeMatrix").asMatrix().isEquivalent(HMatrix(), 1e-14));
        EXPECT_EQ(numberOf(plugOf(joint, "rotateY")), 0.0);
    }
}

TEST(CharacterScene, ShearIsToldAndKeptAtRest) {
    Character character = randomCharacter(5, {});
    character.joints[1].restTransform(0, 1) += 0.5;
    TestScene scene(character, nullptr);
    EXPECT_THAT(scene.scene().notes, testing::Contains(HasSubstr("the joint \"joint1\" is sheared")));
    scene.expectPlain(-1.0);
}

TEST(CharacterScene, MeshesWithoutSkinFollowTheirJoint) {
    Character character = randomCharacter(9, {});
    for (CharacterMesh& mesh : character.meshes) {
        mesh.bindings.clear();
        mesh.influences.assign(mesh.points.size(), {});
        mesh.worldTransform.setRow(3, {0, 5, 0});
    }
    character.meshes[0].parentJoint = 1;
    const std::vector<HMatrix> before = plainWorlds(character, -1.0);
    TestScene scene(character, nullptr);
    EXPECT_TRUE(scene.scene().meshes[1].skin.isNull());
    setNumber(plugOf(scene.scene().joints[1], "translateX"), 10.0);
    setNumber(plugOf(scene.scene().joints[1], "rotateZ"), 1.0);
    const HMatrix moved = plugOf(scene.scene().joints[1], "worldMatrix").asMatrix();
    expectNear(pointsOf(plugOf(scene.scene().meshes[0].skin, "outputGeom[0]")), 4,
               character.meshes[0].points[4] * character.meshes[0].worldTransform * before[1].inverse() * moved);
}

// of a mesh in metres that its joints bring to centimetres: what single precision leaves is no other pose
TEST(CharacterScene, ABindingThatMissesByRoundingIsNoOtherPose) {
    for (const auto& [error, notes] : {std::pair(2e-5, 0U), std::pair(0.5, 1U)}) {
        Character character = randomCharacter(3, {8, false, true, false});
        character.meshes.resize(1);
        CharacterMesh& mesh = character.meshes.front();
        HMatrix bigger;
        for (unsigned axis = 0; axis < 3; ++axis)
            bigger(axis, axis) = 100.0;
        for (HPoint& point : mesh.points)
            point = HPoint(point.x / 100.0, point.y / 100.0, point.z / 100.0);
        for (Binding& binding : mesh.bindings)
            binding.inverseBind = bigger * binding.inverseBind;
        bigger(0, 0) += error;
        bigger(0, 0) /= 100.0;
        bigger(1, 1) = bigger(2, 2) = 1.0;
        mesh.bindings.back().inverseBind = bigger * mesh.bindings.back().inverseBind;
        EXPECT_EQ(TestScene(character, nullptr).scene().notes.size(), notes) << error;
    }
}

// a mirrored space must not turn faces inside out
TEST(CharacterScene, PolygonsGoRoundTheSameWayInAMirroredSpace) {
    Character character = randomCharacter(2, {});
    for (CharacterMesh& mesh : character.meshes)
        mesh.bindings.clear();
    for (CharacterMesh& mesh : character.meshes) {
        mesh.uvs = {0, 0.5F, 1, 0.25F};
        mesh.cornerUvs = {0, 1, 1, 0, 1, 0, 0};
    }
    character.meshes[1].worldTransform(0, 0) = -1.0;
    TestScene scene(character, nullptr);
    EXPECT_THAT(polygonsOf(plugOf(scene.scene().meshes[0].mesh, "outMesh")).corners, ElementsAre(0, 1, 2, 3, 4, 5, 6));
    const MeshPolygons mirrored = polygonsOf(plugOf(scene.scene().meshes[1].mesh, "outMesh"));
    EXPECT_THAT(mirrored.corners, ElementsAre(2, 1, 0, 6, 5, 4, 3));
    EXPECT_THAT(mirrored.uvCorners, ElementsAre(1, 1, 0, 0, 0, 1, 0));
    EXPECT_THAT(mirrored.uvs, ElementsAre(0, 0.5F, 1, 0.25F));
}

TEST(CharacterScene, JumpsOfAnimationStayJumps) {
    Character character = randomCharacter(4, {});
    JointChannel& channel = character.animations[0].channels[0];
    channel.translation.keys = {
        {0.0, {0, 0, 0}}, {0.5, {1, 0, 0}}, {0.5, {7, 0, 0}}, {0.5, {3, 0, 0}}, {1.0, {3, 0, 0}}};
    TestScene scene(character, &character.animations[0]);
    const HObject& joint = scene.scene().joints[channel.joint];
    EXPECT_THAT(plugOf(joint, "translateX").source().name().asStdString(), "joint0_translateX.output");
    scene.setSeconds(0.4995);
    EXPECT_NEAR(numberOf(plugOf(joint, "translateX")), 0.999, 1e-5);
    scene.setSeconds(0.5);
    EXPECT_EQ(numberOf(plugOf(joint, "translateX")), 3.0);
}

} // namespace
} // namespace quarn
