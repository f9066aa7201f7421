// SPDX-License-Identifier: Apache-2.0
// The same numbers for people and for programs, in their units.
#include "quarn/play/playReport.h"
#include "quarn/play/playing.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <rapidjson/document.h>

namespace {

using namespace quarn;
using ::testing::HasSubstr;
using ::testing::Not;

// two vertices of a mesh in centimetres, whose box is 2 long
PlayResult centimetres() {
    PlayResult result;
    result.vertexCount = 2;
    for (const double seconds : {0.002, 0.004, 0.004, 0.006})
        result.times.add(7, seconds);
    result.times.add(8, 0.024);
    const std::vector<float> target(6);
    result.mesh.emplace();
    result.mesh->distances.add(7, std::vector<float>{0, 0, 0, 0, 0.5F, 0}, target);
    result.before.emplace();
    result.before->distances.add(7, std::vector<float>{0, 0, 0, 0, 0, 1}, target);
    for (const float x : {0.0F, 0.0F, 0.25F})
        result.mesh->jitter.add(std::vector<float>{x, 0, 0});
    result.boxDiagonal = 2.0;
    return result;
}

TEST(PlayReport, SaysLengthsInMillimetresAndPartsOfTheBox) {
    PlayPlan plan;
    plan.frames = {7, 15, 2};
    plan.model = {"arm", "only one that fits", "arm was taken"};
    PlayResult result = centimetres();
    const std::string text = playText(result, plan, 0.01);
    for (const char* part :
         {"played frames 7 to 15, 2 vertices, model arm\narm was taken\n5 frames timed: 125 frames a second, ",
          "a second, median 4 ms, p99 24 ms, worst 24 ms in frame 8\n",
          "rest mesh's box, 20 mm\ndistance: mean 2.5 mm (12.5 %),", "max 5 mm (25 %) at vertex 1 in frame 7\n",
          "distance before the deformer: mean 5 mm (25 %),", "jitter: 2.5 mm, before the deformer 0 mm, of the other"})
        EXPECT_THAT(text, HasSubstr(part));
    EXPECT_THAT(text, Not(HasSubstr("GPU")));
    result.gpu = GpuUse{"", 0, 3, 2};
    EXPECT_THAT(playText(result, plan, 0.01), HasSubstr("GPU: 0 deformations on no device, 3 on the CPU, 2 of them"));

    rapidjson::Document json;
    ASSERT_FALSE(json.Parse(playJson(result, plan, 0.01).c_str()).HasParseError());
    EXPECT_EQ(json["step"].GetInt(), 2);
    EXPECT_STREQ(json["model"]["from"].GetString(), "only one that fits");
    EXPECT_DOUBLE_EQ(json["framesPerSecond"].GetDouble(), 125.0);
    EXPECT_DOUBLE_EQ(json["distance"]["mm"]["max"].GetDouble(), 5.0);
    EXPECT_DOUBLE_EQ(json["before"]["percent"]["mean"].GetDouble(), 25.0);
    EXPECT_DOUBLE_EQ(json["distance"]["jitterMm"].GetDouble(), 2.5);
    EXPECT_EQ(json["gpu"]["fallbacks"].GetInt(), 2);
}

TEST(PlayReport, LeavesOutWhatWasNotMeasured) {
    PlayResult result;
    result.times.add(1, 0.0); // nothing depended on the time
    const std::string text = playText(result, PlayPlan(), 1.0);
    EXPECT_THAT(text, HasSubstr("0 vertices\n1 frames timed: 0 frames a second"));
    EXPECT_THAT(text, Not(HasSubstr("distance")));
    rapidjson::Document json;
    ASSERT_FALSE(json.Parse(playJson(result, PlayPlan(), 1.0).c_str()).HasParseError());
    for (const char* key : {"model", "gpu", "distance", "before"})
        EXPECT_TRUE(json[key].IsNull()) << key;
}

} // namespace
