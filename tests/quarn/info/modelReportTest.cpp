// SPDX-License-Identifier: Apache-2.0
// What is said of models that fit, and of those that do not.
#include "quarn/info/ModelReport.h"
#include "plugin/deformer/support/modelFolder.h"
#include "quarn/console/printable.h"
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>
#include <numeric>
#include <utility>

namespace {

using namespace quarn;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;

ModelSpec fourVertices() {
    ModelSpec spec;
    spec.controls = 2;
    spec.bias.assign(12, 0.5F);
    spec.fullCount = spec.affectCount = 4;
    return spec;
}

class ModelReports : public ::testing::Test {
protected:
    ModelReport read(const ModelSpec& spec) const {
        writeModel(folder_.path() / "m.nwrp", spec);
        neuralWarp::ModelSession session;
        return readModel(folder_.path() / "m.nwrp", session);
    }
    TemporaryFolder folder_;
};

TEST_F(ModelReports, NameWhatIsWrongInTheModelItself) {
    EXPECT_THAT(read(fourVertices()).problems, IsEmpty());
    EXPECT_EQ(read(fourVertices()).outputs, 12U);
    ModelSpec few = fourVertices();
    few.bias.resize(11);
    EXPECT_THAT(read(few).problems, ElementsAre(HasSubstr("values: 11, and three for each driven vertex are: 12")));
    ModelSpec shapes = fourVertices();
    shapes.bias.resize(1);
    shapes.shapes = {std::vector<float>(9), std::vector<float>(9)};
    EXPECT_THAT(read(shapes).problems, ElementsAre(HasSubstr("coefficients: 1, and there are principal shapes: 2"),
                                                   HasSubstr("cover vertices: 3, and the model drives: 4")));
    ModelSpec beyond = fourVertices();
    beyond.subsetState = "partial";
    beyond.affectMap = {1, 4};
    EXPECT_THAT(read(beyond).problems, ElementsAre(HasSubstr("drives vertex 4, and its mesh has 4")));
}

TEST_F(ModelReports, SayWhatDoesNotFitAGeometry) {
    const ModelReport model = read(fourVertices());
    const Fit good = fitOf(model, {"body", 4, {0, 1, 2, 3}, 2});
    EXPECT_THAT(good.errors, IsEmpty());
    EXPECT_THAT(good.warnings, IsEmpty());
    EXPECT_THAT(fitOf(model, {"body", 5, {0, 1, 2, 3, 4}, 1}).errors,
                ElementsAre(HasSubstr("body has vertices: 5, and the model was trained on: 4"),
                            HasSubstr("elements: 1, and the network takes: 2")));
    EXPECT_THAT(fitOf(model, {"body", 4, {0, 1, 2, 3}, 3}).warnings, ElementsAre(HasSubstr("the first: 2")));
    ModelSpec partial = fourVertices();
    partial.subsetState = "partial";
    partial.affectMap = {0, 1};
    partial.affectCount = 2;
    const ModelReport part = read(partial);
    EXPECT_THAT(fitOf(part, {"body", 4, {1, 2}, 2}).warnings, ElementsAre(HasSubstr("1, and the deformer affects 2")));
    EXPECT_THAT(fitOf(part, {"body", 4, {2, 3}, 2}).errors, ElementsAre(HasSubstr("none of the vertices")));
    const Fit turned = fitOf(part, {"body", 4, {1, 0}, 2}); // the same vertices in another order
    EXPECT_THAT(turned.errors, IsEmpty());
    EXPECT_THAT(turned.warnings, IsEmpty());
}

TEST_F(ModelReports, DamageIsNoFit) {
    ModelSpec few = fourVertices();
    few.bias.resize(11);
    few.smoothingIterations = 1000;
    ModelReport damaged = read(few);
    const GeometryFacts geometry{"body", 4, {0, 1, 2, 3}, 2};
    EXPECT_THAT(fitOf(damaged, geometry).errors, IsEmpty());
    EXPECT_THAT(modelText(damaged, fitOf(damaged, geometry)), Not(HasSubstr("fits\n")));
    EXPECT_THAT(modelText(damaged, {}), HasSubstr("warning: so many smoothing passes"));
    EXPECT_THAT(modelJson(damaged, fitOf(damaged, geometry)), HasSubstr("\"fits\": false"));
    EXPECT_THAT(modelJson(damaged, {}), Not(HasSubstr("\"fits\"")));
    damaged.metadata.smoothingIterations = 999;
    damaged.problems.clear();
    EXPECT_THAT(modelText(damaged, fitOf(damaged, geometry)), HasSubstr("\nfits\n"));
    EXPECT_THAT(modelText(damaged, {}), Not(HasSubstr("warning")));

    writeFile(damaged.directory / "model.onnx", "no network");
    neuralWarp::ModelSession session;
    const ModelReport silent = readModel(damaged.directory, session);
    EXPECT_THAT(silent.problems, ElementsAre(HasSubstr("model.onnx cannot be used")));
    EXPECT_THAT(fitOf(silent, geometry).warnings, IsEmpty()) << "nobody knows how many controls it takes";
}

TEST_F(ModelReports, SayWhereTheShapesAreRead) {
    ModelSpec spec = fourVertices();
    spec.bias.resize(1);
    spec.shapes = {std::vector<float>(12)};
    EXPECT_THAT(modelText(read(spec), {}),
                HasSubstr("1 principal shapes of 4 vertices, read from principal_shapes.json"));
    EXPECT_THAT(modelText(read(spec), {}), Not(HasSubstr("note: principal")));
    writeFile(folder_.path() / "m.nwrp/principal_shapes.npz", "no archive");
    const ModelAnswer damaged = readModelApart(folder_.path() / "m.nwrp", {});
    EXPECT_THAT(damaged.model.problems, IsEmpty());
    EXPECT_THAT(
        modelText(damaged.model, {}),
        HasSubstr("note: principal_shapes.npz is not used, and principal_shapes.json is read instead, which takes "
                  "longer: it is no archive of NumPy"));
    EXPECT_THAT(modelJson(damaged.model, {}), HasSubstr("\"principalShapesFile\": \"principal_shapes.json\""));
    EXPECT_THAT(modelJson(damaged.model, {}), HasSubstr("\"notes\": [\n"));
}

TEST_F(ModelReports, ComeFromAnotherProcessAsTheyAre) {
    ModelSpec spec = fourVertices();
    spec.subsetState = "partial";
    spec.affectMap = {3, 0, 9};
    spec.componentTagExpression = "part";
    spec.smoothingIterations = 5;
    spec.shapes = {std::vector<float>(6)};
    spec.weights = std::vector<float>(24, 2.0F);
    const ModelReport here = read(spec);
    const storage::FloatTable controls{3, 2, {0, 0, 1, 0, 0.5F, 1}};
    const ModelAnswer apart = readModelApart(here.directory, controls);
    const auto textOf = [](const ModelReport& model) { return modelJson(model, fitOf(model, {"body", 4, {0, 3}, 1})); };
    EXPECT_EQ(textOf(apart.model), textOf(here));
    EXPECT_EQ(apart.model.metadata.affectMap, here.metadata.affectMap);
    EXPECT_EQ(apart.printed, "");
    std::vector<float> expected(12, 0.5F);
    expected.insert(expected.end(), 12, 2.5F);
    expected.insert(expected.end(), 12, 3.5F);
    EXPECT_EQ(apart.outputs, expected);

    writeFile(here.directory / "principal_shapes.json", "[");
    EXPECT_EQ(readModelApart(here.directory, {}).printed, "Parse error\n");
    const auto refusal = [&](const storage::FloatTable& table) {
        return failureOf([&] { readModelApart(here.directory, table); });
    };
    EXPECT_THAT(refusal({1, 3, {0, 0, 0}}), HasSubstr("has 3 numbers, and the network takes 2"));
    EXPECT_THAT(refusal({2, 2, {0, 0, 0, std::numeric_limits<float>::infinity()}}),
                HasSubstr("row 1: a control value"));
}

TEST(Printable, LeavesTextAndEscapesTheRest) {
    const std::pair<std::string, std::string> rows[] = {
        {"plain \t\n\xc3\xa9 \xe6\x89\x8b \xf0\x9f\x96\x90 \xc2\xa0 \\u001b", ""},
        {"\x1b[2J", "\\u001b[2J"},
        {std::string("a\0b\r\x7f", 5), "a\\u0000b\\u000d\\u007f"},
        {"\xc2\x9b"
         "31m",
         "\\u009b31m"}, // the same as ESC [ in one character, and in one byte:
        {"\x9b"
         "31m",
         "\\u009b31m"},
        {"\xe6\x89", "\\u00e6\\u0089"}, // the end is missing
        {"\xff\xfe\xc0\x80", "\\u00ff\\u00fe\\u00c0\\u0080"},
        {"\xe6\x1b\x89", "\\u00e6\\u001b\\u0089"},
    };
    for (const auto& [text, expected] : rows)
        EXPECT_EQ(printable(text), expected.empty() ? text : expected);
}

} // namespace
