// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/posedJoints.h"

#include "quarn/import/ImportTest.h"

namespace quarn {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;

constexpr double degree = 3.14159265358979323846 / 180.0;

// root > hip > knee > toe, of which the knee moves a vertex, and root > prop, with a scale of 0
Character leg() {
    Character character;
    const auto add = [&](const char* name, int parent) { character.joints.push_back({name, parent, HMatrix()}); };
    add("root", -1);
    add("hip", 0);
    add("knee", 1);
    add("toe", 2);
    add("prop", 0);
    character.joints[4].restTransform(1, 1) = 0.0;
    CharacterMesh mesh;
    mesh.name = "skin";
    mesh.points = {HPoint(0, 0, 0), HPoint(1, 0, 0)};
    mesh.influences = {{{2, 1.0}}, {{4, 1.0}}};
    mesh.bindings = {{2, HMatrix()}, {4, HMatrix()}};
    character.meshes.push_back(mesh);
    return character;
}

Animation bending() {
    JointChannel hip;
    hip.joint = 1;
    hip.rotation.keys = {
        {0.0, HQuaternion()}, {1.0, HQuaternion(150 * degree, {0, 0, 1})}, {2.0, HQuaternion(260 * degree, {0, 0, 1})}};
    JointChannel knee;
    knee.joint = 2;
    knee.rotation.keys = {{0.0, HQuaternion(10 * degree, {1, 0, 0})}, {1.0, HQuaternion(40 * degree, {1, 0, 0})}};
    return {"bend", 2.0, {hip, knee}};
}

// "hip x-30..30 y-30..30" and so on
std::vector<std::string> described(const PosedJoints& posed, const Character& character) {
    std::vector<std::string> texts;
    for (const PosedJoint& joint : posed.joints) {
        std::string text = character.joints[joint.joint].name;
        for (std::size_t axis = 0; axis < 3; ++axis)
            if (const auto& range = joint.limits.at(axis))
                text += std::string(" ") + "xyz"[axis] + std::to_string(std::lround(range->first / degree)) + ".." +
                        std::to_string(std::lround(range->second / degree));
        texts.push_back(text);
    }
    return texts;
}

std::vector<std::string> chosen(const PoseChoice& choice) {
    const Character character = leg();
    return described(choosePosedJoints(character, splitRests(character, nullptr), choice), character);
}

TEST(PosedJoints, ThoseThatTellTheDeformerSomething) {
    EXPECT_THAT(chosen({}), ElementsAre("hip x-30..30 y-30..30 z-30..30", "knee x-30..30 y-30..30 z-30..30"));
    EXPECT_THAT(chosen({nullptr, {}, 24.0, true}).front(), HasSubstr("root x-30..30"));

    const Animation animation = bending();
    EXPECT_THAT(chosen({nullptr, {&animation}, 24.0, false}), ElementsAre("hip z0..260", "knee x0..40"));
    Animation other = bending();
    other.channels[0].rotation.keys = {{0.0, HQuaternion(-20 * degree, {0, 0, 1})}};
    EXPECT_THAT(chosen({nullptr, {&animation, &other}, 24.0, false, 0.5}),
                ElementsAre("hip z-160..400", "knee x-20..60"));

    JointLimits limits;
    limits[1] = {-1.0 * degree, 20.0 * degree};
    const LimitMap map{{"root", limits}, {"knee", limits}, {"toe", limits}};
    EXPECT_THAT(chosen({&map, {&animation}, 24.0, false}), ElementsAre("root y-1..20", "knee y-1..20"));
    const LimitMap unknown{{"kneee", limits}};
    EXPECT_THAT(failureOf([&] { chosen({&unknown, {}, 24.0, false}); }), HasSubstr("no joint \"kneee\""));
    const LimitMap still{{"toe", limits}};
    EXPECT_THAT(chosen({&still, {}, 24.0, false}), ElementsAre());
}

TEST(PosedJoints, ThoseLeftOutAreTold) {
    const Character character = leg();
    const Animation animation = bending();
    EXPECT_THAT(choosePosedJoints(character, splitRests(character, nullptr), {}).notes,
                ElementsAre(HasSubstr("30 degrees"), "no controls of joints that move no vertex: toe",
                            HasSubstr("--with-roots keeps them): root"),
                            "no controls of joints with a scale of 0 at rest: prop"));
    EXPECT_THAT(choosePosedJoints(character, splitRests(character, nullptr), {nullptr, {&animation}, 24.0, true}).notes,
                testing::IsSupersetOf({"limits of the poses: the range of the animation \"bend\"",
                                       "no controls of joints that the animation does not turn: root, prop"}));
}

// 0.3 radians are 17.18873 degrees: what is written takes in what was meant
TEST(PosedJoints, LimitsAreWrittenWithoutGettingSmaller) {
    JointLimits limits;
    limits[0] = {-0.3, 0.3};
    limits[2] = {-30.0 * degree, 0.0};
    std::string text = limitsText({{"a \"b\"", limits}}, {{"face.smile", {-0.25, 1.00001}}});
    text.erase(std::remove_if(text.begin(), text.end(), [](char c) { return c == ' ' || c == '\n'; }), text.end());
    EXPECT_EQ(text, R"({"a\"b\"":{"rotateX":[-17.1888,17.1888],"rotateZ":[-30.0,0.0]},"face.smile":[-0.25,1.0001]})");
}

} // namespace
} // namespace quarn
