// SPDX-License-Identifier: Apache-2.0
// What is said of models that fit, and of those that do not.
#include "quarn/info/ModelReport.h"
#include "neuralWarp/support/modelFolder.h"
#include "support/TemporaryFolder.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <numeric>

namespace {

using namespace quarn;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

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
}

} // namespace
