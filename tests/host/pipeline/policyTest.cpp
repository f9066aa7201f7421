// SPDX-License-Identifier: Apache-2.0
// Which evaluations run on the device, and which on the CPU.
#include "host/pipeline/PipelineTest.h"

#include "openquarn/HFnMesh.h"
#include "openquarn_app/Commands.h"

namespace {

using namespace testNodes;
using gpuDeformers::Seen;
using OpenQuarn::Gpu;
using testDeformers::grid;
using testDeformers::meshNode;
using testDeformers::withTag;
using ::testing::Contains;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

TEST_F(PipelineTest, TheDeviceTakesOverAfterOneEvaluationOnTheCpu) {
    const HObject mesh = grid(3, 2);
    meshNode("m", mesh);
    makePusher("d", "m.outMesh");
    animate("d", 2.0);
    EXPECT_EQ(evaluatedOn("d"), "cpu");
    EXPECT_THAT(pushedBy("d", mesh), Each(2.0));
    EXPECT_EQ(evaluatedOn("d"), "nowhere") << "nothing has changed";
    for (const double push : {-1.5, 0.25, 7.0}) {
        animate("d", push);
        EXPECT_EQ(evaluatedOn("d"), "gpu");
        EXPECT_THAT(pushedBy("d", mesh), Each(push));
    }
    EXPECT_EQ(Gpu::counts().launches.at("push"), 1U);
    EXPECT_EQ(Gpu::counts().uploads.count("positions"), 0U) << "the same mesh as in the frame before";
    set("m.inMesh", grid(3, 2, 4.0));
    EXPECT_EQ(evaluatedOn("d"), "gpu");
    EXPECT_EQ(Gpu::counts().uploads.at("positions"), 1U);
    EXPECT_EQ(testDeformers::points(plug(output("d", 0))).back(), HPoint(9.0, 1.0, 4.0));
    Gpu::setEnabled(false);
    EXPECT_EQ(Seen::alive, 0);
    animate("d", 1.0);
    EXPECT_EQ(evaluatedOn("d"), "nowhere") << "nobody counts while the pipeline is off";
    EXPECT_THAT(pushedBy("d", grid(3, 2, 4.0)), Each(1.0));
}

TEST_F(PipelineTest, WhatDoesNotComeAlongAConnectionIsEvaluatedOnTheCpuOnce) {
    const HObject mesh = withTag(withTag(grid(3, 2), "some", {4, 1}), "others", {0});
    meshNode("m", mesh);
    meshNode("n", mesh);
    makePusher("d", "m.outMesh");
    create("testCase", "envelope");
    plug("envelope.in").setDouble(1.0);
    connect("envelope.out", "d.envelope");
    prime("d");
    const std::vector<std::pair<const char*, std::function<void()>>> changes = {
        {"an envelope that is animated", [] { plug("envelope.in").setDouble(0.5); }},
        {"weights", [] { plug("d.weightList[0].weights[2]").setDouble(0.5); }},
        {"a component tag", [] { plug("d.input[0].componentTagExpression").setString("some"); }},
        {"a rest shape", [&] { set("d.originalGeometry[0]", grid(3, 2)); }},
        {"other polygons",
         [] {
             set("m.inMesh", withTag(grid(2, 3), "some", {4, 1}));
         }},
        {"another list of vertices",
         [] {
             set("m.inMesh", withTag(grid(2, 3), "some", {1, 4}));
         }},
        {"another connection", [] { disconnect("m.outMesh", input("d", 0)), connect("n.outMesh", input("d", 0)); }},
        {"a plug that somebody makes dirty", [] { OpenQuarn::makeDirty(plug(output("d", 0))); }},
        {"a node further up that is made dirty", [] { OpenQuarn::makeDirty(plug("d_push.out").node()); }},
        {"the command for it", [] { EXPECT_TRUE(OpenQuarn::runCommand("dgdirty d")); }},
        {"a connection broken", [] { disconnect("d_push.out", "d.push"); }},
        {"a value set", [] { plug("d.push").setDouble(3.0); }},
        {"a connection made", [] { connect("d_push.out", "d.push"); }},
    };
    double push = 2.0;
    for (const auto& [name, change] : changes) {
        change();
        EXPECT_EQ(evaluatedOn("d"), "cpu") << name;
        if (plug("d.push").source().isNull())
            continue;
        animate("d", ++push);
        EXPECT_EQ(evaluatedOn("d"), "gpu") << name;
        EXPECT_THAT(pushedBy("d", plug(input("d", 0)).asHObject()), Contains(push / 2)) << name;
    }
    EXPECT_THAT(pushedBy("d", mesh), ElementsAre(0, push / 2, 0, 0, push / 2, 0));
}

TEST_F(PipelineTest, AnEditOfOneGeometryLeavesTheOthersOnTheDevice) {
    create("testCase", "push");
    create("testDeformer", "d");
    connect("push.out", "d.push");
    for (const unsigned index : {0U, 5U}) {
        meshNode("m" + std::to_string(index), grid(2, 2));
        connect("m" + std::to_string(index) + ".outMesh", input("d", index));
        EXPECT_EQ(evaluatedOn("d", index), "cpu");
    }
    plug("d.weightList[5].weights[0]").setDouble(0.5);
    plug("push.in").setDouble(4.0);
    EXPECT_EQ(evaluatedOn("d", 0), "gpu");
    EXPECT_EQ(evaluatedOn("d", 5), "cpu");
    EXPECT_THAT(pushed(output("d", 0), grid(2, 2)), Each(4.0));
    EXPECT_THAT(pushed(output("d", 5), grid(2, 2)), ElementsAre(2.0, 4.0, 4.0, 4.0));
}

TEST_F(PipelineTest, MapsAndWeightsAreUploadedWhenTheyChangeOnly) {
    const HObject mesh = withTag(grid(3, 2), "some", {4, 1, 5});
    meshNode("m", mesh);
    makePusher("d", "m.outMesh");
    plug("d.input[0].componentTagExpression").setString("some");
    plug("d.weightList[0].weights[5]").setDouble(0.25);
    prime("d");
    EXPECT_EQ(Gpu::counts().uploads,
              (std::map<std::string, std::uint64_t>{{"affectMap", 1}, {"positions", 1}, {"weights", 1}}));
    animate("d", 8.0);
    EXPECT_EQ(evaluatedOn("d"), "gpu");
    EXPECT_THAT(Gpu::counts().uploads, IsEmpty());
    EXPECT_THAT(pushedBy("d", mesh), ElementsAre(0, 8, 0, 0, 8, 2));
}

TEST_F(PipelineTest, OtherContextsAndFailedEvaluationsStayOnTheCpu) {
    meshNode("m", grid(2, 2));
    makePusher("d", "m.outMesh");
    prime("d");
    animate("d", 3.0);
    Gpu::resetCounts();
    {
        OpenQuarn::EvaluationContext context(5.0);
        EXPECT_FALSE(context.evaluateAt(plug(output("d", 0))).asMesh().isNull());
        EXPECT_EQ(Gpu::counts().gpuEvaluations, 0U);
    }
    EXPECT_EQ(evaluatedOn("d"), "gpu");
    testDeformers::Hooks::deform = [](HPxDeformerNode& node, HDataBlock& block, HItGeometry& iterator, unsigned i) {
        testDeformers::pushPoints(node, block, iterator, i);
        return HStatus(HStatus::kFailure, "broken");
    };
    gpuDeformers::hooks.deform = [](auto&&...) { return HPxGPUDeformer::kDeformerFailure; };
    animate("d", 3.5);
    EXPECT_THAT(evaluate(output("d", 0)), HasSubstr("broken")) << "first there, then on the CPU";
    gpuDeformers::hooks.deform = nullptr;
    animate("d", 4.0);
    EXPECT_THAT(evaluate(output("d", 0)), HasSubstr("broken")) << "on the CPU until it succeeds there";
    takeMessages();
    testDeformers::Hooks::deform = testDeformers::pushPoints;
    animate("d", 5.0);
    EXPECT_EQ(evaluatedOn("d"), "cpu");
    animate("d", 6.0);
    EXPECT_EQ(evaluatedOn("d"), "gpu");
}

TEST_F(PipelineTest, GeometriesAreEvaluatedSideBySide) {
    create("testCase", "push");
    HPlugArray outputs;
    for (unsigned node = 0; node < 4; ++node) {
        const std::string name = "d" + std::to_string(node);
        create("testDeformer", name);
        connect("push.out", name + ".push");
        for (unsigned index = 0; index < 3; ++index) {
            set(input(name, index), grid(10, 10 + index));
            outputs.push_back(plug(output(name, index)));
        }
    }
    for (int frame = 0; frame < 10; ++frame) {
        plug("push.in").setDouble(frame);
        EXPECT_EQ(text(OpenQuarn::evaluate(outputs, true)), "");
        for (const HPlug& one : outputs)
            EXPECT_THAT(testDeformers::points(one).front(), HPoint(frame, 0, 0)) << one.name().asChar();
    }
    EXPECT_EQ(Gpu::counts().cpuEvaluations, 12U);
    EXPECT_EQ(Gpu::counts().gpuEvaluations, 9U * 12U);
}

} // namespace
