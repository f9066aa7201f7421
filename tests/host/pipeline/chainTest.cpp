// SPDX-License-Identifier: Apache-2.0
// Deformers one after the other: positions stay on the device in between.
#include "host/pipeline/PipelineTest.h"

#include <map>

namespace {

using namespace testNodes;
using OpenQuarn::Gpu;
using OpenQuarn::GpuCounts;
using testDeformers::grid;
using testDeformers::meshNode;
using ::testing::Each;

class ChainTest : public PipelineTest {
protected:
    void SetUp() override {
        PipelineTest::SetUp();
        meshNode("m", mesh);
        makePusher("a", "m.outMesh");
        makePusher("b", output("a", 0));
        makePusher("c", output("b", 0));
        EXPECT_EQ(evaluatedOn("c"), "cpu");
    }
    /// What the pushes of the deformers are set to adds up.
    void push(double a, double b, double c) {
        animate("a", a), animate("b", b), animate("c", c);
        sum_ = a + b + c;
    }
    void expectSumAtEnd() const { EXPECT_THAT(pushedBy("c", mesh), Each(sum_)); }

    const HObject mesh = grid(4, 3);

private:
    double sum_ = 0.0;
};

TEST_F(ChainTest, PositionsGoUpOnceAndComeDownOnce) {
    push(1, 10, 100);
    EXPECT_EQ(evaluatedOn("c"), "gpu");
    const GpuCounts counts = Gpu::counts();
    EXPECT_EQ(counts.gpuEvaluations, 3U);
    EXPECT_EQ(counts.launches.at("push"), 3U);
    EXPECT_EQ(counts.uploads.at("positions"), 1U);
    EXPECT_EQ(counts.downloads, 1U);
    EXPECT_EQ(counts.bytesUp, 12U * 12U);
    EXPECT_EQ(counts.bytesDown, 12U * 12U);
    expectSumAtEnd();
}

TEST_F(ChainTest, WhatWasPassedOverIsThereWhenItIsAskedFor) {
    push(1, 10, 100);
    EXPECT_EQ(evaluatedOn("c"), "gpu");
    EXPECT_THAT(pushedBy("b", mesh), Each(11.0));
    EXPECT_THAT(pushedBy("a", mesh), Each(1.0));
    expectSumAtEnd();
    EXPECT_EQ(evaluatedOn("c"), "nowhere") << "reading what is before it changes nothing";
}

TEST_F(ChainTest, ChangesReachTheEndThroughWhatWasPassedOver) {
    push(1, 10, 100);
    EXPECT_EQ(evaluatedOn("c"), "gpu");
    for (int i = 2; i < 6; ++i) {
        push(i, 10, 100);
        EXPECT_EQ(evaluatedOn("c"), "gpu");
        expectSumAtEnd();
    }
    push(5, 10, 200); // what comes before stays as it is
    EXPECT_EQ(evaluatedOn("c"), "gpu");
    expectSumAtEnd();
    plug("a.weightList[0].weights[0]").setDouble(1.0); // the first has to go to the CPU, the others need not
    EXPECT_EQ(evaluatedOn("c"), "both");
    EXPECT_EQ(Gpu::counts().cpuEvaluations, 1U);
    EXPECT_EQ(Gpu::counts().gpuEvaluations, 2U);
    expectSumAtEnd();
    plug("b.weightList[0].weights[0]").setDouble(1.0); // the second: the first is at its end a chain of its own
    EXPECT_EQ(evaluatedOn("c"), "both");
    EXPECT_EQ(Gpu::counts().cpuEvaluations, 1U);
    expectSumAtEnd();
    set("m.inMesh", grid(4, 3, 3.0));
    EXPECT_EQ(evaluatedOn("c"), "gpu");
    EXPECT_EQ(testDeformers::points(plug(output("c", 0))).front(), HPoint(215, 0, 3));
}

TEST_F(ChainTest, AnOutputThatOthersReadIsBroughtDown) {
    create("mesh", "reader");
    connect(output("b", 0), "reader.inMesh");
    push(1, 10, 100);
    EXPECT_EQ(evaluatedOn("c"), "gpu");
    EXPECT_EQ(Gpu::counts().downloads, 2U) << "once for both, and at the end";
    EXPECT_THAT(pushed("reader.outMesh", mesh), Each(11.0));
    expectSumAtEnd();
    EXPECT_EQ(Gpu::counts().downloads, 2U);
}

TEST_F(ChainTest, OneThatPassesThroughHandsOnWhatItGot) {
    plug("b.envelope").setDouble(0.0);
    EXPECT_EQ(evaluatedOn("c"), "both");
    push(1, 10, 100);
    EXPECT_EQ(evaluatedOn("c"), "gpu");
    EXPECT_EQ(Gpu::counts().launches.at("push"), 2U);
    EXPECT_THAT(pushedBy("c", mesh), Each(101.0));
    for (const char* name : {"a.envelope", "c.envelope"})
        plug(name).setDouble(0.0);
    EXPECT_EQ(evaluatedOn("c"), "both");
    push(2, 20, 200);
    EXPECT_EQ(evaluatedOn("c"), "gpu");
    EXPECT_EQ(Gpu::counts().downloads, 0U) << "the mesh that came in";
    EXPECT_THAT(pushedBy("c", mesh), Each(0.0));
}

TEST_F(ChainTest, LongChainsNeedNoDeepStack) {
    std::string last = "c";
    for (int i = 0; i < 300; ++i) {
        const std::string name = "link" + std::to_string(i);
        makePusher(name, output(last, 0));
        last = name;
    }
    EXPECT_EQ(evaluatedOn(last), "cpu");
    push(1, 2, 3);
    EXPECT_EQ(evaluatedOn(last), "gpu");
    EXPECT_EQ(Gpu::counts().gpuEvaluations, 303U);
    EXPECT_THAT(pushedBy(last, mesh), Each(6.0));
}

} // namespace
