// SPDX-License-Identifier: Apache-2.0
// Frames outside of what a model was trained on, and what error is to be expected of them.
#include "quarn/scene/PoseCounter.h"
#include "quarn/scene/poseTexts.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>

namespace {

using namespace quarn;
using ::testing::HasSubstr;

// three controls, of which the last one never moved; half a millimetre on a trained pose, and two at a distance of 1
PoseCounter counter(bool hasPoses = true) {
    neuralWarp::ModelCertificate certificate;
    certificate.controlNames = {"a", "b", "still"};
    certificate.ranges = neuralWarp::ControlRanges({0, 0, 1}, {1, 10, 1});
    certificate.expected = neuralWarp::ExpectedError({0, 1}, {0.5, 2});
    const std::vector<float> pose = {0, 0, 1};
    return {certificate, hasPoses ? neuralWarp::TrainedPoses(certificate.ranges, pose) : neuralWarp::TrainedPoses()};
}

TEST(PoseCounter, NamesControlsAndWeighsFrames) {
    PoseCounter frames = counter();
    frames.add(1, std::vector<float>{0, 0, 1});
    frames.add(2, std::vector<float>{1, 10, 1});
    frames.add(3, std::vector<float>{-0.5F, 15, 1});
    frames.add(4, std::vector<float>{-0.25F, 0, 1, 7});
    frames.add(5, std::vector<float>{0, 0}); // too few: the network does not run
    PoseCounts counts = frames.counts();
    EXPECT_EQ(counts.frames, 4U);
    EXPECT_EQ(counts.outside, 2U);
    EXPECT_EQ(counts.distance, 0.5);
    ASSERT_EQ(counts.controls.size(), 2U);
    // equally far in their ranges: in the controls' order
    EXPECT_EQ(counts.controls[0].name + std::to_string(counts.controls[0].frames), "a2");
    EXPECT_EQ(counts.controls[0].excess, -0.5);
    EXPECT_EQ(counts.controls[0].frame, 3);
    EXPECT_EQ(counts.controls[1].name, "b");
    EXPECT_DOUBLE_EQ(counts.controls[1].part.value(), 0.5);

    ASSERT_TRUE(counts.expected);
    const auto& [mean, beyond, worst] = *counts.expected;
    EXPECT_EQ(beyond, 2U);
    ASSERT_EQ(worst.size(), 4U);
    EXPECT_EQ(worst[0].frame, 3);
    EXPECT_EQ(worst.back().frame, 1);
    EXPECT_EQ(worst.back().millimetres, 0.5);
    double sum = 0.0;
    for (const FrameError& error : worst)
        sum += error.millimetres;
    EXPECT_DOUBLE_EQ(mean, sum / 4.0);

    frames.add(6, std::vector<float>{0, 0, 9});
    const OutsideControl first = frames.counts().controls.at(0);
    EXPECT_EQ(first.name, "still");
    EXPECT_FALSE(first.part);
    EXPECT_THAT(posesText({{"warp", "body", "m", "", true, frames.counts()}}),
                HasSubstr("still: 1 frame, at most 8 above (it never moved in the training) in frame 6\n"));
}

TEST(PoseCounter, WithoutPosesThereAreRangesAlone) {
    PoseCounter frames = counter(false);
    frames.add(1, std::vector<float>{0, std::numeric_limits<float>::quiet_NaN(), 1});
    EXPECT_EQ(frames.counts().outside, 1U);
    EXPECT_FALSE(frames.counts().expected);
    rapidjson::StringBuffer buffer;
    JsonWriter json(buffer);
    json.StartObject();
    writePoses(json, {{"warp", "body", "m", "", true, frames.counts()}});
    json.EndObject();
    EXPECT_TRUE(json.IsComplete());
    EXPECT_THAT(buffer.GetString(), HasSubstr("\"largestDistance\": null")) << "of what is no number";
}

} // namespace
