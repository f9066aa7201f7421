// SPDX-License-Identifier: Apache-2.0
// quarn pose with poses from limits and from the scene's animation.
#include "PoseTest.h"

#include "openquarn/HFnData.h"

#include <rapidjson/document.h>

#include <algorithm>

namespace {

using stripScene::sampled;
using ::testing::AllOf;
using ::testing::Contains;
using ::testing::Each;
using ::testing::Ge;
using ::testing::Gt;
using ::testing::HasSubstr;
using ::testing::Le;
using ::testing::Lt;

class SamplePosesTest : public PoseTest {
protected:
    static std::vector<double> keysOf(const std::string& plug) {
        const HObject curve = quarn::findPlug(plug).source().node();
        return HFnDoubleArrayData(quarn::plugOf(curve, "keyValues").asHObject()).values();
    }
};

TEST_F(SamplePosesTest, TheSameSeedGivesTheSameSceneAndPosingAgainReplaces) {
    stripScene::write(scene());
    pose({"--samples", "50"});
    const std::string first = bytes(path("posed.json"));
    pose({"--samples", "50", "--seed", "1"});
    EXPECT_EQ(bytes(path("posed.json")), first);
    pose({"--samples", "50", "--seed", "2"});
    EXPECT_NE(bytes(path("posed.json")), first);
    // on top of other poses, and with the settings that the scene keeps
    stripScene::quarn({"pose", path("posed.json"), "-o", path("again.json")});
    EXPECT_EQ(bytes(path("again.json")), first);
}

TEST_F(SamplePosesTest, PosesPlayBackWithinTheLimitsAfterTheDefaultOne) {
    stripScene::write(scene());
    const std::string answer = pose({"--samples=40", "--activation-rate=0.5", "--start=-5", "--json"});
    rapidjson::Document json;
    json.Parse(answer.c_str());
    ASSERT_FALSE(json.HasParseError()) << answer;
    EXPECT_EQ(json["poses"].GetInt(), 40);
    EXPECT_EQ(json["values"].GetInt(), 4);
    EXPECT_TRUE(json["complete"].GetBool());

    const auto session = open();
    const std::pair<const char*, double> settings[] = {{"warp.exportStartFrame", -5},
                                                       {"warp.exportEndFrame", 34},
                                                       {"poses.samplesStartFrame", -5},
                                                       {"poses.samples", 40},
                                                       {"poses.activationRate", 0.5}};
    for (const auto& [plug, value] : settings)
        EXPECT_EQ(quarn::numberOf(quarn::findPlug(plug)), value) << plug;
    for (const auto& [plug, place, least, most, rest] : sampled) {
        const std::vector<double> keys = keysOf(plug);
        ASSERT_EQ(keys.size(), 40U);
        EXPECT_EQ(keys.front(), rest);
        for (std::size_t frame = 0; frame < keys.size(); ++frame) {
            EXPECT_EQ(at(*session, double(frame) - 5.0, plug), keys[frame]);
            EXPECT_EQ(at(*session, double(frame) - 4.5, plug), keys[frame]); // steps
            EXPECT_GE(keys[frame], least);
            EXPECT_LE(keys[frame], most);
        }
    }
}

TEST_F(SamplePosesTest, FewerPosesThanAskedAreKept) {
    stripScene::write(scene());
    EXPECT_THAT(pose({"--samples", "100", "--activation-rate", "0", "--json"}),
                AllOf(HasSubstr("\"poses\": 1,"), HasSubstr("\"complete\": false")));
    const auto session = open();
    EXPECT_EQ(quarn::numberOf(quarn::findPlug("warp.exportEndFrame")), 1.0);
    EXPECT_EQ(at(*session, 50.0, "tip.rotateZ"), 0.5);
}

const char* const face = R"(
createNode sliders -name face
setAttr face.slider[1].sliderName browUp; setAttr face.slider[1].minValue -0.5; setAttr face.slider[1].value 0.1
setAttr face.slider[4].sliderName jawOpen; setAttr face.slider[4].maxValue 3; setAttr face.slider[4].defaultValue 2
)";

TEST_F(SamplePosesTest, SlidersAreSampledBetweenTheirRanges) {
    // as the collector themselves, and beside joints in one that has limits for one of them
    const char* const ways[] = {
        "connectAttr -force face.message warp.poseGenerator",
        "disconnectAttr poses.message warp.poseGenerator; connectAttr -force face.output warp.controlValues",
        "connectAttr face.output[1] poses.inputList[3].input[0]; "
        "connectAttr face.slider[4].value poses.inputList[3].input[1]; setAttr poses.limitsList[3].limits[1].minValue "
        "1; "
        "setAttr poses.limitsList[3].limits[1].maxValue 3; setAttr poses.limitsList[3].limits[1].defaultValue 2"};
    for (const std::string way : ways) {
        SCOPED_TRACE(way);
        const bool isCollected = way.find("limitsList") != std::string::npos;
        stripScene::write(scene(), face + way);
        EXPECT_THAT(pose({"--samples=40", "--activation-rate=0.5", "--json"}),
                    HasSubstr(isCollected ? "\"values\": 6," : "\"values\": 2,"));
        const auto session = open();
        EXPECT_EQ(quarn::numberOf(quarn::findPlug(isCollected ? "poses.samples" : "face.samples")), 40);
        const auto brow = keysOf("face.slider[1].value");
        const auto jaw = keysOf("face.slider[4].value");
        ASSERT_EQ(brow.size(), 40U);
        EXPECT_EQ(brow.front(), 0.0); // the default, not what the slider was left at
        EXPECT_EQ(jaw.front(), 2.0);
        EXPECT_THAT(brow, AllOf(Each(AllOf(Ge(-0.5), Le(1.0))), Contains(Lt(0.0)), Contains(Gt(0.0))));
        EXPECT_THAT(jaw, AllOf(Each(AllOf(Ge(isCollected ? 1.0 : 0.0), Le(3.0))), Contains(Gt(2.0))));
        EXPECT_EQ(*std::min_element(jaw.begin(), jaw.end()) < 1.0, !isCollected);
        EXPECT_EQ(at(*session, 7.5, "face.output[4]"), jaw[6]);
    }
}

// a quaternion curve on the whole rotation of "middle", and a curve on "tip" from frame 3 to 13
const char* const animation = R"(
setAttr middle.jointOrientZ 0.25
setAttr middle.restMatrix 0.955336489125606 0.29552020666133955 0 0 -0.29552020666133955 0.955336489125606 0 0 0 0 1 0 1 0 0 1
createNode animCurveQuaternion -name turn
setAttr turn.keyTimes 1 11
setAttr turn.keyValues 0 0 0 1 0.3826834323650898 0 0 0.9238795325112867
connectAttr time1.outTime turn.time
connectAttr turn.outputRotate middle.rotate
createNode animCurve -name bend
setAttr bend.keyTimes 3 13
setAttr bend.keyValues 0.5 2
connectAttr time1.outTime bend.time
connectAttr bend.output tip.rotateZ
)";

TEST_F(SamplePosesTest, PosesOfTheAnimationTakeItsPlace) {
    stripScene::write(scene(), animation);
    pose({"--from", "animation"}); // frames 1 to 13, behind the default pose; the first frame is near that
    const auto session = open();
    EXPECT_EQ(quarn::numberOf(quarn::findPlug("warp.exportEndFrame")), 13.0);
    for (int frame = 2; frame <= 13; ++frame) {
        const double angle = 0.7853981633974483 * std::min(frame - 1, 10) / 10.0;
        EXPECT_NEAR(at(*session, frame, "middle.rotateX"), angle, 1e-12);
        EXPECT_NEAR(at(*session, frame, "tip.rotateZ"), 0.5 + 0.15 * std::max(0, frame - 3), 1e-12);
    }
    EXPECT_TRUE(quarn::findPlug("middle.rotate").source().isNull());
}

TEST_F(SamplePosesTest, AxesThatAreNotSampledGoToTheRestPose) {
    stripScene::write(scene(), std::string(animation) + "disconnectAttr middle.rotateY poses.inputList[0].input[1]\n"
                                                        "disconnectAttr middle.rotateZ poses.inputList[0].input[2]\n"
                                                        "currentTime 11\n");
    pose({"--samples", "5"});
    const auto session = open();
    EXPECT_EQ(at(*session, 3, "middle.rotateY"), 0.0);
    EXPECT_NEAR(at(*session, 3, "middle.rotateZ"), 0.05, 1e-12); // the rest pose is turned by 0.3, jointOrient by 0.25
}

TEST_F(SamplePosesTest, FramesOfTheAnimationFollowDrawnPoses) {
    stripScene::write(scene(), animation);
    EXPECT_THAT(pose({"--from", "both", "--samples", "6", "--frames", "3-13x5", "--json"}),
                AllOf(HasSubstr("\"poses\": 9,"), HasSubstr("\"fromLimits\": 6,"), HasSubstr("\"fromAnimation\": 3,")));
    EXPECT_NEAR(at(*open(), 8, "tip.rotateZ"), 1.25, 1e-12);
    EXPECT_EQ(at(*open(), 1, "tip_rotateZ_pose.drawnKeys"), 6.0);
    std::filesystem::rename(path("posed.json"), scene());
    EXPECT_THAT(poseFailure({"--from", "animation"}), HasSubstr("earlier quarn pose"));
}

// each row: what is done to the scene, flags, and what the failure says
TEST_F(SamplePosesTest, WhatCannotBeSampledIsRefusedByName) {
    const std::string limit = "setAttr poses.limitsList[0].limits[1].";
    const std::string sliders = face + std::string("connectAttr -force face.message warp.poseGenerator; ");
    const struct {
        std::string script;
        std::vector<std::string> flags;
        std::vector<const char*> says;
    } rows[] = {
        {limit + "minValue 3", {}, {"poses.limitsList[0].limits[1]", "3 to 0.75"}},
        {limit + "minValue -1e308; " + limit + "maxValue 1e308", {}, {"limits[1]", "too far apart"}},
        {"setAttr poses.inputList[1].input[4] 1", {}, {"poses.inputList[1].input[4] has no source"}},
        {"setAttr -lock on tip.rotateZ", {}, {"tip.rotateZ", "locked"}},
        {"setAttr -lock on middle.rotate", {}, {"middle.rotateX", "locked"}},
        {"connectAttr axes.outputList[0].output[1] poses.inputList[1].input[1]",
         {},
         {"outputList[0].output[1]", "output"}},
        {"connectAttr tip.rotateZ poses.inputList[1].input[1]", {}, {"tip.rotateZ is the source of both"}},
        {"disconnectAttr poses.message warp.poseGenerator", {}, {"axes.outputList[0].output[0]", "is an output"}},
        {"disconnectAttr poses.message warp.poseGenerator; connectAttr axes.message warp.poseGenerator",
         {},
         {"axes.message"}},
        {"deleteNode poses controls", {}, {"warp.poseGenerator"}},
        {sliders + "setAttr face.slider[4].sliderName browUp",
         {},
         {"face.browUp is the name of both face.slider[1].value and face.slider[4].value"}},
        {sliders + "setAttr face.slider[4].minValue 4", {}, {"face.slider[4] are in the wrong order: 4 to 3"}},
        {sliders + "setAttr -lock on face.slider[4].value", {}, {"face.slider[4].value", "is locked"}},
        {"createNode sliders -name none; connectAttr -force none.message warp.poseGenerator",
         {},
         {"none has no sliders", "none.slider[0].sliderName"}},
        {"deleteNode warp", {}, {"no neuralWarp"}},
        {"", {"--from", "animation"}, {"no animation"}},
        {"", {"--from", "animation", "--frames", "9-1"}, {"9-1"}},
        {"", {"--frames", "1-9"}, {"--from animation"}},
        {"", {"--samples", "0"}, {"0"}},
        {"", {"--samples", "2000000000"}, {"2000000000"}},
        {"", {"--activation-rate", "nan"}, {"nan"}},
        {"", {"--activation-rate", "1.5"}, {"1.5"}},
        {"", {"--tolerance", "-1"}, {"--tolerance"}},
        {"", {"--start", "2000000000"}, {"2000000000"}},
    };
    for (const auto& row : rows) {
        stripScene::write(scene(), row.script);
        const std::string failure = poseFailure(row.flags);
        for (const char* part : row.says)
            EXPECT_THAT(failure, HasSubstr(part)) << row.script;
        EXPECT_FALSE(std::filesystem::exists(path("posed.json"))) << row.script;
    }
}

} // namespace
