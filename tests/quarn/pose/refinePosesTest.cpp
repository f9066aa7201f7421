// SPDX-License-Identifier: Apache-2.0
// quarn pose --refine: poses where models disagree.
#include "PoseTest.h"

#include "plugin/deformer/support/modelFolder.h"
#include "quarn/pose/ModelEnsemble.h"
#include "quarn/pose/farthestPoses.h"
#include "quarn/pose/rigPoses.h"
#include "quarn/scene/plugs.h"

#include <rapidjson/document.h>

#include <algorithm>
#include <cmath>
#include <numeric>
#include <random>

namespace {

using quarn::ChosenPose;
using quarn::ModelEnsemble;
using quarn::ValueLimits;
using stripScene::sampled;
using ::testing::HasSubstr;

// each chosen one has the largest product of those that were left, told by comparing all with all
TEST(FarthestPosesTest, AgreesWithComparingAll) {
    std::mt19937 random(5); // NOLINT(cert-msc51-cpp): the same cases every time
    const std::vector<ValueLimits> limits{{-1.0, 1.0, 0.0}, {0.0, 50.0, 0.0}, {3.0, 3.0, 3.0}};
    const auto someOf = [&](std::size_t count) {
        std::vector<double> values(3 * count, 3.0);
        for (std::size_t i = 0; i < count; ++i) {
            values[3 * i] = static_cast<double>(random() % 9) / 4.0 - 1.0;
            values[3 * i + 1] = static_cast<double>(random() % 51);
        }
        return values;
    };
    for (const std::size_t knownCount : {0U, 1U, 20U}) {
        const std::vector<double> known = someOf(knownCount);
        const std::vector<double> candidates = someOf(40);
        std::vector<double> worth(40);
        std::generate(worth.begin(), worth.end(), [&] { return static_cast<double>(random() % 7) / 3.0; });
        const std::vector<ChosenPose> chosen = farthestPoses(limits, known, candidates, worth, 25, [] {});
        ASSERT_EQ(chosen.size(), 25U);
        std::vector<double> met = known;
        std::vector<bool> isTaken(40);
        for (const ChosenPose& one : chosen) {
            const auto distance = [&](std::size_t i) {
                double least = 1e6;
                for (std::size_t j = 0; j < met.size(); j += 3)
                    least = std::min(least, std::sqrt((std::pow((candidates[3 * i] - met[j]) / 2.0, 2) +
                                                       std::pow((candidates[3 * i + 1] - met[j + 1]) / 50.0, 2)) /
                                                      3.0));
                return least;
            };
            double best = -1.0;
            for (std::size_t i = 0; i < 40; ++i)
                best = isTaken[i] ? best : std::max(best, worth[i] * distance(i));
            ASSERT_FALSE(isTaken[one.candidate]);
            EXPECT_NEAR(worth[one.candidate] * distance(one.candidate), best, 1e-9 * (1.0 + best));
            if (!met.empty()) {
                EXPECT_NEAR(one.distance, distance(one.candidate), 1e-12);
            }
            isTaken[one.candidate] = true;
            met.insert(met.end(), candidates.begin() + std::ptrdiff_t(3 * one.candidate),
                       candidates.begin() + std::ptrdiff_t(3 * one.candidate + 3));
        }
    }
    EXPECT_EQ(farthestPoses(limits, {}, someOf(4), std::vector<double>(4, 1.0), 9, [] {}).size(), 4U);
}

class RefinePosesTest : public PoseTest {
protected:
    static constexpr std::size_t controls = 12; // two axes of two joints
    static constexpr std::size_t angle = 7;     // the second: sine of tip.rotateZ

    void SetUp() override {
        stripScene::write(scene());
        pose({"--samples", "30", "--start", "5"});
    }
    // deltas of 0, and in x `slope` times the sine of tip.rotateZ
    std::string model(const std::string& name, float slope, std::size_t vertices = stripScene::vertexCount) const {
        ModelSpec spec;
        spec.controls = controls;
        spec.fullCount = spec.affectCount = static_cast<std::uint32_t>(vertices);
        spec.bias.assign(3 * vertices, 0.0F);
        spec.weights.assign(controls * 3 * vertices, 0.0F);
        for (std::size_t vertex = 0; vertex < vertices; ++vertex)
            spec.weights[angle * 3 * vertices + 3 * vertex] = slope;
        writeModel(path(name), spec);
        return path(name);
    }
    std::string refine(std::vector<std::string> arguments) const {
        arguments.insert(arguments.begin(), {"pose", path("posed.json"), "-o", path("refined.json")});
        return stripScene::quarn(arguments);
    }
    std::string refusal(const std::vector<std::string>& arguments) const {
        return failureOf([&] { refine(arguments); });
    }
};

TEST_F(RefinePosesTest, AddsPosesWhereModelsDisagreeAndKeepsThoseThatAreThere) {
    const std::vector<std::string> arguments{"--refine",
                                             model("a.nwrp", 0.0F),
                                             model("b.nwrp", 0.5F),
                                             "--add",
                                             "20",
                                             "--candidates",
                                             "300",
                                             "--activation-rate=0.8",
                                             "--json"};
    const std::string answer = refine(arguments);
    const std::string first = bytes(path("refined.json"));
    rapidjson::Document json;
    json.Parse(answer.c_str());
    ASSERT_FALSE(json.HasParseError()) << answer;
    EXPECT_EQ(json["known"].GetInt(), 30);
    EXPECT_EQ(json["firstFrame"].GetInt(), 5);
    EXPECT_EQ(json["lastFrame"].GetInt(), 54);
    EXPECT_EQ(json["candidates"]["count"].GetInt(), 300);

    std::vector<std::vector<double>> before;
    {
        const auto session = open();
        for (int frame = 5; frame < 35; ++frame)
            for (const auto& one : sampled)
                before.push_back({at(*session, frame, one.plug)});
    }
    auto session = open("refined.json");
    EXPECT_EQ(quarn::drawnPoses(quarn::poseControls(quarn::findNode("poses"))), 50U); // the new ones are drawn as well
    std::size_t i = 0;
    for (int frame = 5; frame < 35; ++frame)
        for (const auto& one : sampled)
            ASSERT_EQ(at(*session, frame, one.plug), before[i++][0]) << one.plug << " in frame " << frame;
    EXPECT_EQ(quarn::numberOf(quarn::findPlug("warp.exportStartFrame")), 5.0);
    EXPECT_EQ(quarn::numberOf(quarn::findPlug("warp.exportEndFrame")), 54.0);
    ASSERT_EQ(json["added"].Size(), 20U);
    double mean = 0.0;
    int corners = 0;
    for (const auto& added : json["added"].GetArray()) {
        const int frame = added["frame"].GetInt();
        const double sine = std::sin(at(*session, frame, "tip.rotateZ"));
        // the standard deviation of two numbers is their distance by the root of 2
        EXPECT_NEAR(added["disagreementMm"].GetDouble(), 1000.0 * 0.5 * std::abs(sine) / std::sqrt(2.0), 1e-2) << frame;
        EXPECT_GT(added["distance"].GetDouble(), 1e-3 / 4.0);
        mean += sine / 20.0;
        int atLimits = 0;
        for (const auto& [plug, place, least, most, rest] : sampled) {
            const double value = at(*session, frame, plug);
            EXPECT_TRUE(value == rest || (value >= least && value <= most)) << plug;
            atLimits += value == least || value == most ? 1 : 0;
        }
        EXPECT_EQ(added["atLimits"].GetInt(), atLimits);
        corners += atLimits == 4 ? 1 : 0;
    }
    EXPECT_GT(mean, 0.85); // over all candidates it is 0.6
    EXPECT_GT(corners, 0);

    session.reset();
    refine(arguments);
    EXPECT_EQ(bytes(path("refined.json")), first);
    std::vector<std::string> others = arguments;
    others.insert(others.end(), {"--seed", "2"});
    refine(others);
    EXPECT_NE(bytes(path("refined.json")), first);
}

TEST_F(RefinePosesTest, WhatCannotBeRefinedIsSaid) {
    const std::string a = model("a.nwrp", 0.0F);
    const std::string b = model("b.nwrp", 0.5F);
    std::filesystem::copy(b, path("broken.nwrp"));
    write("broken.nwrp/principal_shapes.json", "{");
    ModelSpec wide;
    wide.controls = controls + 1;
    wide.fullCount = wide.affectCount = stripScene::vertexCount;
    wide.bias.assign(3 * stripScene::vertexCount, 0.0F);
    writeModel(path("wide.nwrp"), wide);
    const struct {
        std::vector<std::string> arguments;
        const char* sentence;
    } rows[] = {
        {{"--refine", a, "--add", "5"}, "a.nwrp is the only model of \""},
        {{"--refine", a, path("none.nwrp"), "--add", "5"}, "none.nwrp is no model directory"},
        {{"--refine", a, model("large.nwrp", 0.1F, 20), "--add", "5"}, "do not move the same vertices"},
        {{"--refine", a, path("broken.nwrp"), "--add", "5"}, "broken.nwrp is damaged: its principal_shapes.json"},
        {{"--refine", a, path("wide.nwrp"), "--add", "5"}, "takes 13 control values, and the deformer has 12"},
        {{"--refine", a, b}, "--refine needs --add N"},
        {{"--refine", a, b, "--add", "5", "--samples", "7"}, "--samples, --start, --from and --limit-rate are for"},
        {{"--refine", a, b, "--add", "5", "--activation-rate", "0"},
         "0 poses to add were found, not 5, that differ by 0.001"},
        {{"--refine", a, b, "--add", "999999"}, "poses of 4 values are too many"},
    };
    for (const auto& [arguments, sentence] : rows)
        EXPECT_THAT(refusal(arguments), HasSubstr(sentence));
    EXPECT_THAT(failureOf([&] {
                    stripScene::quarn({"pose", scene(), "-o", path("x.json"), "--refine", a, b, "--add", "5"});
                }),
                HasSubstr("has no sampled poses"));
    EXPECT_FALSE(std::filesystem::exists(path("refined.json")));
}

// principal shapes or deltas, all vertices or every so many: the same mean
TEST_F(RefinePosesTest, TheDisagreementIsThatOfTheDeltas) {
    for (const std::size_t vertices : {1U, 100U, 2 * static_cast<unsigned>(ModelEnsemble::mostVertices)}) {
        std::vector<float> offsets(3 * vertices);
        for (std::size_t vertex = 0; vertex < vertices; ++vertex) // in y
            offsets[3 * vertex + 1] = static_cast<float>((vertex * 37) % vertices) / static_cast<float>(vertices);
        std::vector<std::filesystem::path> direct, shaped;
        for (const float factor : {1.0F, 3.0F, -1.0F}) {
            ModelSpec spec;
            spec.fullCount = spec.affectCount = static_cast<std::uint32_t>(vertices);
            spec.bias = offsets;
            std::for_each(spec.bias.begin(), spec.bias.end(), [&](float& value) { value *= factor; });
            direct.emplace_back(path("direct" + std::to_string(factor)));
            writeModel(direct.back(), spec);
            spec.shapes = {offsets, std::vector<float>(3 * vertices, 7.0F)};
            spec.bias = {factor, 2.0F};
            shaped.emplace_back(path("shaped" + std::to_string(factor)));
            writeModel(shaped.back(), spec);
        }
        const float control = 0.0F;
        const double found = ModelEnsemble(direct).disagreement({&control, 1});
        EXPECT_NEAR(found, vertices == 1 ? 0.0 : 1.0, 0.02) << vertices; // 1, 3, -1 deviate by 2
        EXPECT_NEAR(ModelEnsemble(shaped).disagreement({&control, 1}), found, 1e-5) << vertices;
    }
}

} // namespace
