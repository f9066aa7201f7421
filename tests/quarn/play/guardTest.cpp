// SPDX-License-Identifier: Apache-2.0
// How much of a deformer a guard leaves, by the distance of its controls from the ranges of the training.
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/Session.h"
#include "plugin/deformer/support/modelFolder.h"
#include "plugin/deformer/support/warpRig.h"
#include "quarn/scene/EnvelopeGuard.h"
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>

namespace {

using quarn::AppliedModels;
using quarn::EnvelopeGuard;
using ::testing::HasSubstr;
using warpRig::Rig;

constexpr float delta = 0.5F;
constexpr double width = 2.0;

// controls from 0 to `maximum`; `rest` of metadata.json as it was written
void certify(const std::filesystem::path& model, const std::string& maximum) {
    writeFile(model / "metadata.json",
              R"({"deltaMode": 0, "smoothingIterations": 0, "affectCount": 12, "deltaCount": 12, "fullCount": 12,
                  "subsetState": "complete", "componentTagExpression": "*", "controlNames": ["turn"],
                  "certificate": {"controls": {"minima": [0], "maxima": [)" +
                  maximum + R"(]}, "trainingFrames": 9, "errors": []}})");
}

class Guard : public ::testing::Test {
protected:
    Guard() {
        OpenQuarn::setMessageSink([](const OpenQuarn::Message&) {});
        warpRig::registerPlugin();
        for (const auto& [name, maximum] : {std::pair{"wide", "4"}, {"narrow", "1"}}) {
            ModelSpec spec;
            spec.bias.assign(36, delta);
            spec.fullCount = spec.affectCount = 12;
            spec.deltaMode = 0;
            writeModel(path(name), spec);
            certify(path(name), maximum);
        }
        rig_.emplace();
        rig_->addGeometry(0, {.mesh = grid_, .modelName = "wide"});
        rig_->addGeometry(1, {.mesh = grid_, .modelName = "narrow", .modelOn = false});
        rig_->setModelRoot(folder_.path());
    }
    void TearDown() override { OpenQuarn::setMessageSink({}); }

    std::filesystem::path path(const std::string& model) const { return folder_.path() / (model + ".nwrp"); }
    AppliedModels models() const { return AppliedModels({rig_->output(0), rig_->output(1)}); }
    EnvelopeGuard guard() const { return {models().geometries(), width}; }
    // the largest step that a vertex makes; all of them make the same, as each has the same deltas
    double moved(EnvelopeGuard* guard, double control, int frame = 1) const {
        rig_->setControls({control});
        if (guard != nullptr)
            guard->apply(frame);
        EXPECT_FALSE(OpenQuarn::evaluate(rig_->output(0)).error());
        const HPointArray from = warpRig::pointsOf(grid_);
        const HPointArray to = rig_->result(0);
        double largest = 0.0;
        for (unsigned i = 0; i < from.length(); ++i)
            largest = std::max(largest, std::abs(to[i].x - from[i].x));
        return largest;
    }

    OpenQuarn::Session session_;
    TemporaryFolder folder_;
    const HObject grid_ = warpRig::mesh(makeGrid(2, 3));
    std::optional<Rig> rig_;
};

TEST_F(Guard, TheEnvelopeFallsFromTheRangesOnAndWhatItWasStaysAFactor) {
    const Rig other("other"); // its envelope stands for any animated value
    HPlug envelope = rig_->plug("envelope");
    struct Row {
        double control, distance;
    };
    const Row rows[] = {{0, 0}, {1.7, 0}, {4, 0}, {-2, 0.5}, {6, 0.5}, {8, 1}, {-7.6, 1.9}, {12, 2}, {1e9, 1e9}};
    for (const double own : {1.0, 0.25})
        for (const bool isAnimated : {false, true}) {
            envelope.setDouble(isAnimated ? 1.0 : own);
            other.plug("envelope").setDouble(own);
            if (isAnimated)
                warpRig::connect(other.plug("envelope"), envelope);
            const double whole = moved(nullptr, 2.0);
            EXPECT_NEAR(whole, delta * own, 1e-6);
            EnvelopeGuard guard = this->guard();
            for (const auto& [control, distance] : rows) {
                const double left = std::pow(1.0 - std::pow(std::min(distance / width, 1.0), 2), 2);
                if (left == 0.0 || left == 1.0)
                    EXPECT_EQ(moved(&guard, control), left * whole) << control;
                else
                    EXPECT_NEAR(moved(&guard, control), left * whole, 1e-6) << control;
            }
            if (isAnimated) {
                other.plug("envelope").setDouble(0.0);
                EXPECT_EQ(moved(&guard, 2.0), 0.0) << "it is animated no more";
            }
        }
}

TEST_F(Guard, TheModelThatIsFurthestOutDecidesAndFramesCountOnce) {
    EnvelopeGuard guard = this->guard();
    EXPECT_EQ(moved(&guard, 2.0, 1), moved(nullptr, 2.0)) << "the narrow one is off";
    rig_->plug("models[1].modelActive").setShort(1);
    EXPECT_NEAR(moved(&guard, 2.0, 2), delta * 0.5625, 1e-6);
    moved(&guard, 2.0, 2);
    moved(&guard, 4.0, 3);
    moved(&guard, 0.5, 5);
    const std::vector<quarn::GuardReport> reports = guard.reports();
    ASSERT_EQ(reports.size(), 1U);
    const auto& [deformer, frames, lowered, off, distance, frame] = reports[0];
    EXPECT_EQ(std::tie(deformer, frames, lowered, off, distance, frame), std::tuple("warp1", 4U, 2U, 1U, 3.0, 3));
}

TEST_F(Guard, SaysWhatIsMissingAndHidesNoDamage) {
    EXPECT_THAT(failureOf([] { EnvelopeGuard({}, width); }), HasSubstr("has none"));
    EnvelopeGuard guard = this->guard();
    AppliedModels models = this->models();
    models.setGuarded();
    std::string metadata = R"({"deltaMode": 0})";
    writeFile(path("wide") / "metadata.json", metadata);
    rig_->setControls({2.0});
    EXPECT_THAT(failureOf([&] { guard.apply(7); }),
                ::testing::ContainsRegex("^frame 7: .*wide.nwrp does not say which"));
    // damaged, and found out as soon as the envelope is above 0
    certify(path("wide"), "4");
    moved(&guard, 1e6);
    std::filesystem::remove(path("wide") / "metadata.json");
    EXPECT_EQ(failureOf([&] { models.requireSound(); }), "");
    moved(&guard, 2.0);
    EXPECT_THAT(failureOf([&] { models.requireSound(); }), HasSubstr("metadata.json is missing"));
}

} // namespace
