// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/reparent.h"

#include "quarn/import/ImportTest.h"

namespace quarn {
namespace {

using testing::AllOf;
using testing::HasSubstr;

HPoint plainOf(const Character& character, std::size_t mesh, std::size_t vertex, double seconds) {
    return plainPoint(character.meshes[mesh], plainWorlds(character, seconds), vertex);
}

void expectSame(const Character& before, const Character& after, double seconds) {
    for (std::size_t m = 0; m < before.meshes.size(); ++m)
        for (std::size_t v = 0; v < before.meshes[m].points.size(); ++v)
            if (!before.meshes[m].influences[v].empty()) {
                const HPoint a = plainOf(before, m, v, seconds);
                const HPoint b = plainOf(after, m, v, seconds);
                EXPECT_LT((HVector(a.x, a.y, a.z) - HVector(b.x, b.y, b.z)).length(), 1e-9) << m << ' ' << v;
            }
}

// parents that the file has after their children, and a joint that has children itself
const ParentMap chain{{"joint0", "joint4"}, {"joint1", "joint0"}, {"joint5", "joint1"}};

TEST(Reparent, NothingMovesAtRestOrAtFrames) {
    for (unsigned seed = 1; seed <= 4; ++seed) {
        SCOPED_TRACE(seed);
        const Character before = randomCharacter(seed, {6, true, true, true});
        Character after = before;
        after.meshes[1].parentJoint = 5;
        reparent(after, chain, testFrameRate);

        for (std::size_t joint = 0; joint < after.joints.size(); ++joint) {
            EXPECT_LT(after.joints[joint].parent, static_cast<int>(joint));
            const auto asked = chain.find(after.joints[joint].name);
            const int parent = after.joints[joint].parent;
            EXPECT_EQ(parent < 0 ? "" : after.joints[static_cast<std::size_t>(parent)].name,
                      asked == chain.end() ? "" : asked->second);
        }
        EXPECT_EQ(after.joints[static_cast<std::size_t>(after.meshes[1].parentJoint)].name, "joint5");
        expectSame(before, after, -1.0);
        for (const double seconds : {0.1, 0.25, 0.4, 0.75, 1.0}) // frames of testFrameRate, and keys
            expectSame(before, after, seconds);
        TestScene(after, &after.animations[0]).expectPlain(0.55);
    }
}

TEST(Reparent, UnevenScalesAreKeptAtRest) {
    const Character before = randomCharacter(7, {6, false, true, true});
    Character after = before;
    reparent(after, chain, testFrameRate);
    expectSame(before, after, -1.0);
    TestScene scene(after, nullptr);
    scene.expectStill();
    EXPECT_THAT(scene.scene().notes, testing::Not(testing::IsEmpty()));
}

TEST(Reparent, WhatCannotBeIsRefusedByName) {
    const auto refused = [](const ParentMap& parents, const testing::Matcher<std::string>& why) {
        Character character = randomCharacter(1, {6, true, true, true});
        character.joints[3].restTransform = HMatrix() * 0.0;
        EXPECT_THAT(failureOf([&] { reparent(character, parents, testFrameRate); }), why);
    };
    refused({{"none", "joint1"}}, AllOf(HasSubstr("no joint \"none\""), HasSubstr("joint0, joint1")));
    refused({{"joint1", "none"}}, HasSubstr("no joint \"none\""));
    refused({{"joint1", "joint1"}}, HasSubstr("\"joint1\" would hang below itself"));
    refused({{"joint1", "joint2"}, {"joint2", "joint4"}, {"joint4", "joint1"}}, HasSubstr("would hang below itself"));
    Character endless = randomCharacter(1, {6, true, true, true});
    endless.animations[0].seconds = 1e12;
    EXPECT_THAT(failureOf([&] { reparent(endless, chain, testFrameRate); }), HasSubstr("\"dance\" is more than"));
    refused({{"joint1", "joint3"}}, HasSubstr("nothing can hang below the joint \"joint3\""));
}

} // namespace
} // namespace quarn
