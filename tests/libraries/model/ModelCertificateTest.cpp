// SPDX-License-Identifier: Apache-2.0
// What a model says of the poses that it was trained on: ranges, representatives, errors; and what is refused of it.
#include "nw_model/ModelCertificate.h"
#include "nw_model/TrainedPoses.h"

#include <cmath>
#include <limits>
#include <optional>
#include <stdexcept>

#include <gmock/gmock.h>

#include "storage/fileSum.h"
#include "storage/npyArray.h"
#include "support.h"

using namespace neuralWarp;
using testing::HasSubstr;

namespace {

constexpr float endless = std::numeric_limits<float>::infinity();
const float noNumber = std::nanf("");

constexpr const char* figures = R"({"mean": 0.5, "p99": 1, "p9999": 2, "max": 3})";

// the metadata of a model of two controls, whose certificate has `with` in place of `what`
std::string metadata(const std::string& what = "", const std::string& with = "") {
    std::string text = R"({"controlNames": ["a.x", "b"], "certificate": {"later": 1, "trainingFrames": 80, "controls":
        {"minima": [-1, 0], "maxima": [1, 4]}, "errors": [{"frames": 20, "heldOut": "at random", "poses": "drawn",
        "mm": {"network": )" +
                       std::string(figures) + R"(, "skin": {"mean": 7, "p99": 8, "p9999": 9, "max": 10},
        "basis": null}}], "expectedError": {"distances": [1, 3], "millimetres": [0.5, 2.5]},
        "mesh": "sha256:1f", "dataSet": "sha256:2e", "trainedPoses": {"count": 2, "xxh3_128": "SUM"}}})";
    if (!what.empty())
        text.replace(text.find(what), what.size(), with);
    return text;
}

std::optional<ModelCertificate> read(const TestFolder& folder, const std::string& text) {
    return readCertificate(folder.write("metadata.json", text));
}

template <class Error, class Work>
std::string whyNot(Work work) {
    try {
        work();
    } catch (const Error& error) {
        return error.what();
    }
    return "no error";
}

} // namespace

TEST(ControlRanges, DistanceIsOfTheControlThatIsFurthestOut) {
    const ControlRanges ranges({-1, 0, 5}, {1, 4, 5}); // widths 2, 4 and 0: a tenth of their root mean square is 0.258
    const double still = std::sqrt(20.0 / 3.0) / 10.0;
    EXPECT_NEAR(ranges.unit(2), still, 1e-12);
    const struct {
        std::vector<float> controls;
        double distance;
    } cases[] = {{{-1, 4, 5}, 0},
                 {{1, 0, 5}, 0},
                 {{1.5F, 0, 5}, 0.25},
                 {{-2, 5, 5}, 0.5},
                 {{0, 5, 5.5F}, 0.5 / still},
                 {{0, 0, 5.000001F}, 0},
                 {{-2}, 0.5},
                 {{0, 0, 5, 99}, 0},
                 {{noNumber, 0, 5}, endless},
                 {{0, -endless, 5}, endless}};
    for (const auto& one : cases)
        EXPECT_DOUBLE_EQ(ranges.distance(one.controls), one.distance) << testing::PrintToString(one.controls);
    EXPECT_EQ(ranges.excess(0, -1.5F), -0.5);
    EXPECT_EQ(ranges.excess(1, 5.0F), 1.0);
    EXPECT_EQ(ControlRanges().distance({}), 0.0);
    EXPECT_EQ(ControlRanges({2}, {2}).distance(std::vector{5.0F}), 3.0);
}

TEST(ModelCertificate, ReadsWhatItKnows) {
    const TestFolder folder;
    const std::optional<ModelCertificate> certificate = read(folder, metadata());
    ASSERT_TRUE(certificate);
    EXPECT_THAT(certificate->controlNames, testing::ElementsAre("a.x", "b"));
    EXPECT_EQ(certificate->ranges.maximum(1), 4.0F);
    EXPECT_EQ(certificate->trainingFrames, 80U);
    ASSERT_EQ(certificate->errors.size(), 1U);
    const CertifiedErrors& errors = certificate->errors.front();
    EXPECT_EQ(errors.heldOut + errors.poses + std::to_string(errors.frames), "at randomdrawn20");
    EXPECT_EQ(errors.network.p9999 + errors.network.max + errors.skin.value().mean, 12.0);
    EXPECT_FALSE(errors.basis || errors.zeroDeltas);
    EXPECT_EQ(certificate->mesh + certificate->dataSet + certificate->trainedPosesSum, "sha256:1fsha256:2eSUM");
    // before the first knot, between, on, and beyond the last one; and outside of the ranges by a whole one
    const double expected[][3] = {{0, 0, 0.5}, {1, 0, 0.5}, {1.5, 0, 1}, {3, 0, 2.5}, {6, 0, 2.5}, {1.5, 1, 8}};
    for (const auto& [distance, outside, millimetres] : expected)
        EXPECT_DOUBLE_EQ(certificate->expected.at(distance, outside), millimetres) << distance;

    EXPECT_FALSE(read(folder, R"({"deltaCount": 3})"));
    EXPECT_FALSE(read(folder, R"({"certificate": null})"));
}

TEST(ModelCertificate, RefusesWhatCannotBeReliedOn) {
    const std::string cases[][3] = {
        {"[-1, 0]", "[-1]", "1 minima and 2 maxima"},
        {"[-1, 0]", "[-1, 4.5]", "control 1 ranges from 4.5"},
        {"[-1, 0]", "[-1, 1e39]", "minima[1] is too large"},
        {"[-1, 0]", R"([-1, "0"])", "minima[1] is no finite number"},
        {R"("controls")", R"("ranges")", "controls is no object"},
        {R"(["a.x", "b"])", R"(["a.x"])", "controls are 2, and controlNames 1"},
        {"80", "-80", "trainingFrames is no whole number"},
        {R"("frames": 20)", R"("frames": 2.5)", "frames is no whole number"},
        {R"("p99": 1)", R"("p99": -1)", "network.p99 is no length"},
        {R"("p9999": 2)", R"("p9998": 2)", "network.p9999 is no length"},
        {R"("network")", R"("net")", "network is no object"},
        {"[1, 3]", "[3, 1]", "distances that do not rise"},
        {"[1, 3]", "[1, 1]", "distances that do not rise"},
        {"[0.5, 2.5]", "[2.5, 0.5]", "errors that fall"},
        {"[0.5, 2.5]", "[0.5]", "2 distances and 1 errors"},
    };
    for (const auto& [what, with, why] : cases) {
        const TestFolder folder;
        const std::string text = metadata(what, with);
        const std::string found = whyNot<std::runtime_error>([&, &text = text] { read(folder, text); });
        EXPECT_THAT(found, testing::AllOf(testing::StartsWith("certificate: "), HasSubstr(why))) << text;
    }
    const TestFolder folder;
    for (const std::string text : {"", "[]", R"({"certificate": )"})
        EXPECT_NE(whyNot<std::runtime_error>([&] { read(folder, text); }), "no error") << text;
}

TEST(TrainedPoses, AreBoundToTheirModelAndMeasuredFromTheNearest) {
    const TestFolder folder;
    const auto posesOf = [&](const storage::FloatTable& table, bool isBound) {
        storage::writeFloatTable(folder / "trained_poses.npy", table);
        const std::string sum = storage::sumOfFile(folder / "trained_poses.npy", 1 << 20, 0).digits;
        return TrainedPoses::read(folder.path(), read(folder, metadata("SUM", isBound ? sum : "0")).value());
    };
    const TrainedPoses poses = posesOf({2, 2, {0, 0, 1, 4}}, true);
    EXPECT_EQ(poses.count(), 2U);
    // units 2 and 4: from the second pose half a unit and a whole one
    EXPECT_DOUBLE_EQ(poses.distance(std::vector{2.0F, 8.0F}), std::sqrt((0.25 + 1.0) / 2.0));
    EXPECT_EQ(poses.distance(std::vector{0.0F, 0.0F}), 0.0);
    EXPECT_TRUE(std::isinf(poses.distance(std::vector{noNumber, 0.0F})));

    const auto why = [&](const storage::FloatTable& table, bool isBound) {
        return whyNot<std::runtime_error>([&] { posesOf(table, isBound); });
    };
    EXPECT_THAT(why({2, 2, {0, 0, 1, 4}}, false), HasSubstr("its sum is another"));
    EXPECT_THAT(why({1, 3, {0, 0, 1}}, true), HasSubstr("shape [1, 3]"));
    EXPECT_THAT(why({1001, 2, std::vector<float>(2002)}, true), HasSubstr("shape [1001, 2]"));
    EXPECT_THAT(why({0, 2, {}}, true), HasSubstr("shape [0, 2]"));
    EXPECT_THAT(why({1, 2, {0, endless}}, true), HasSubstr("not finite"));
    std::filesystem::remove(folder / "trained_poses.npy");
    EXPECT_THAT(
        whyNot<std::runtime_error>([&] { TrainedPoses::read(folder.path(), read(folder, metadata()).value()); }),
        HasSubstr("trained_poses.npy"));
    const ModelCertificate none = read(folder, metadata(R"("trainedPoses")", R"("none")")).value();
    EXPECT_TRUE(TrainedPoses::read(folder.path(), none).isEmpty());
}
