// SPDX-License-Identifier: Apache-2.0
#include "nw_model/ModelSession.h"

#include <limits>
#include <string>
#include <thread>
#include <vector>

#include <gmock/gmock.h>

#include "support.h"

using namespace neuralWarp;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

/// The linear map of make_models.py; exact for dyadic inputs.
std::vector<float> linear(const std::vector<float>& inputs, std::size_t outputs) {
    std::vector<float> result;
    for (std::size_t j = 0; j < outputs; ++j) {
        float sum = static_cast<float>(j) / 2;
        for (std::size_t i = 0; i < inputs.size(); ++i) {
            sum += inputs[i] * (static_cast<float>(i + 1) / 8 - static_cast<float>(j) / 4);
        }
        result.push_back(sum);
    }
    return result;
}

void load(ModelSession& session, const std::string& name) {
    ASSERT_EQ(session.load(testModel(name), true), LoadResult::Loaded);
    ASSERT_TRUE(session.isLoaded()) << name << ": " << session.errorText();
}

const std::vector<float> sevenInputs = {1, -2, 0.5f, 0, 4, -0.25f, 3};

} // namespace

TEST(ModelSessionRun, GivesTheFirstOutputInRowMajorOrder) {
    struct Case {
        const char* model;
        std::vector<float> inputs;
        std::vector<float> outputs;
    };
    const std::vector<Case> cases = {
        {"direct", sevenInputs, linear(sevenInputs, 6)},
        {"matrix_output", sevenInputs, linear(sevenInputs, 6)},
        {"two_outputs", sevenInputs, linear(sevenInputs, 6)},
        {"inferred_output", sevenInputs, linear(sevenInputs, 6)},
        {"coefficients", {8, -4}, linear({8, -4}, 1)},
        {"wide", {2.5f}, std::vector<float>(3000, 2.5f)},
        {"identity", {4, 5, 6}, {4, 5, 6}},
        {"constant", {4, 5, 6}, {1, 2, 3}},
        {"initializer", {4, 5, 6}, {1, 2, 3}},
        {"data_dependent", {4, 5, 6}, {4, 5, 6}},
        {"loop", {4, 5, 6}, {12, 15, 18}},
    };
    ModelSession session; // one for all: each load replaces the model before
    for (const Case& c : cases) {
        load(session, c.model);
        EXPECT_EQ(session.inputCount(), static_cast<std::int32_t>(c.inputs.size())) << c.model;
        EXPECT_EQ(session.run(c.inputs), c.outputs) << c.model;
        EXPECT_EQ(session.errorText(), "") << c.model;
    }
}

TEST(ModelSessionRun, NeedsAllInputsAndIgnoresFurtherOnes) {
    ModelSession session;
    load(session, "identity");
    EXPECT_THAT(session.run({}), IsEmpty());
    EXPECT_THAT(session.run(std::vector<float>{1, 2}), IsEmpty());
    EXPECT_EQ(session.errorText(), "fewer control values than the model takes");
    const float nan = std::numeric_limits<float>::quiet_NaN();
    EXPECT_THAT(session.run(std::vector<float>{1, 2, 3, 4, nan}), ElementsAre(1.f, 2.f, 3.f));
    EXPECT_EQ(session.errorText(), "");
}

TEST(ModelSessionRun, RefusesNonFiniteInputs) {
    ModelSession session;
    load(session, "constant"); // whose output would not show them
    using Limits = std::numeric_limits<float>;
    for (const float bad : {Limits::quiet_NaN(), Limits::infinity(), -Limits::infinity()}) {
        EXPECT_THAT(session.run(std::vector<float>{0, 0, bad}), IsEmpty()) << bad;
        EXPECT_EQ(session.errorText(), "a control value is not finite");
    }
    EXPECT_THAT(session.run(std::vector<float>{Limits::max(), Limits::denorm_min(), -0.f}), ElementsAre(1.f, 2.f, 3.f));
}

TEST(ModelSessionRun, FailureInTheRuntimeGivesNothingAndIsOver) {
    ModelSession session;
    load(session, "data_dependent"); // two positive values make two outputs where three are declared
    StdoutCapture out;
    EXPECT_THAT(session.run(std::vector<float>{1, -1, 2}), IsEmpty());
    EXPECT_EQ(out.take(), "");
    EXPECT_THAT(session.errorText(), testing::Not(IsEmpty()));
    EXPECT_TRUE(session.isLoaded());
    EXPECT_THAT(session.run(std::vector<float>{1, 3, 2}), ElementsAre(1.f, 3.f, 2.f));
}

TEST(ModelSessionRun, SessionsRunSideBySide) {
    const auto work = [](const char* model, std::size_t outputs) {
        for (int round = 0; round < 5; ++round) {
            ModelSession session;
            load(session, model);
            for (int i = 0; i < 200; ++i) {
                const std::vector<float> inputs(static_cast<std::size_t>(session.inputCount()), static_cast<float>(i));
                ASSERT_EQ(session.run(inputs), linear(inputs, outputs));
            }
        }
    };
    std::thread other(work, "direct", 6);
    work("coefficients", 1);
    other.join();
}
