// SPDX-License-Identifier: Apache-2.0
// What the host asks of a GPU deformer and its registration info, and what it does when they fail.
#include "host/pipeline/PipelineTest.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/gpu/HOpenCLInfo.h"
#include "openquarn_app/Plugins.h"

#include <stdexcept>

namespace {

using namespace testNodes;
using gpuDeformers::hooks;
using gpuDeformers::Seen;
using gpuDeformers::Status;
using OpenQuarn::Gpu;
using testDeformers::grid;
using testDeformers::meshNode;
using ::testing::AllOf;
using ::testing::Contains;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

class DeformerTest : public PipelineTest {
protected:
    void SetUp() override {
        PipelineTest::SetUp();
        meshNode("m", mesh);
        makePusher("d", "m.outMesh");
        EXPECT_EQ(evaluatedOn("d"), "cpu");
    }
    /// The next frame; what comes out has to be right wherever it was made.
    std::string nextFrame() {
        animate("d", ++frame_);
        std::string where = evaluatedOn("d");
        EXPECT_THAT(pushedBy("d", mesh), Each(frame_));
        return where;
    }
    const HObject mesh = grid(4, 3);

private:
    double frame_ = 0.0;
};

TEST_F(DeformerTest, FailuresGiveTheFrameOfTheCpuAndOneMessage) {
    struct Case {
        const char* name;
        std::function<void()> breakIt;
        const char* message;
    };
    const Case cases[] = {
        {"fails", [] { hooks.deform = [](auto&&...) { return HPxGPUDeformer::kDeformerFailure; }; },
         "its GPU deformer failed"},
        {"says what failed",
         [] {
             hooks.deform = [](auto&&...) {
                 HOpenCLInfo::checkCLErrorStatus(CL_OUT_OF_RESOURCES);
                 return HPxGPUDeformer::kDeformerFailure;
             };
         },
         "CL_OUT_OF_RESOURCES"},
        {"throws", [] { hooks.deform = [](auto&&...) -> Status { throw std::runtime_error("broken"); }; },
         "its GPU deformer failed"},
        {"is none", [] { hooks.create = [] { return static_cast<HPxGPUDeformer*>(nullptr); }; },
         "its plug-in made no GPU deformer"},
        {"answers nonsense", [] { hooks.deform = [](auto&&...) { return static_cast<Status>(17); }; },
         "its GPU deformer failed"},
    };
    EXPECT_EQ(nextFrame(), "gpu");
    for (const Case& one : cases) {
        SCOPED_TRACE(one.name);
        one.breakIt();
        Gpu::setEnabled(false); // so that a new deformer is made
        Gpu::setEnabled(true);
        nextFrame();
        std::vector<std::string> said;
        for (int i = 0; i < 3; ++i) {
            EXPECT_EQ(nextFrame(), "cpu");
            EXPECT_EQ(Gpu::counts().fallbacks, 1U);
        }
        for (const std::string& message : takeMessages())
            if (message.find("warning") == 0) // what was thrown is a message of its own
                said.push_back(message);
        EXPECT_THAT(
            said, ElementsAre(AllOf(HasSubstr("'d.outputGeom[0]' is evaluated on the CPU: "), HasSubstr(one.message))));
        hooks = {};
        EXPECT_EQ(nextFrame(), "gpu") << "as soon as it works again";
    }
}

TEST_F(DeformerTest, ARefusedNodeStaysOnTheCpuAndSaysWhy) {
    const auto refuse = [](HStringArray* reasons) {
        reasons->append("too pretty");
        return false;
    };
    for (std::function<bool(HStringArray*)>* hook : {&hooks.validateGraph, &hooks.validateValues}) {
        *hook = refuse;
        plug("d.weightList[0].weights[0]").setDouble(1.0);
        EXPECT_EQ(nextFrame(), "cpu");
        EXPECT_EQ(nextFrame(), "cpu");
        EXPECT_THAT(takeMessages(), ElementsAre(HasSubstr("'d.outputGeom[0]' is evaluated on the CPU: too pretty")));
        *hook = nullptr;
        EXPECT_EQ(nextFrame(), "cpu");
        EXPECT_EQ(nextFrame(), "gpu");
    }
    hooks.outputMesh = [](const HObject&) { return HPxGeometryFilter::inputGeometry; };
    plug("d.weightList[0].weights[0]").setDouble(1.0);
    EXPECT_EQ(nextFrame(), "cpu");
    EXPECT_EQ(nextFrame(), "cpu") << "another attribute is its output";
}

std::string inputsSeen; ///< by Copies<1>, each with a space behind it

/// A deformer that overrides one of the three variants, and copies the positions.
template <int variant>
class Copies final : public HPxGPUDeformer {
public:
    Copies() { ++Seen::alive; }
    ~Copies() override { --Seen::alive; }
    using HPxGPUDeformer::evaluate;

    DeformerStatus evaluate(HDataBlock& block, const HEvaluationNode& node, const HPlug& output,
                            const HPlugArray& inputs, const HGPUDeformerData& in, HGPUDeformerData& out) override {
        if (variant != 1)
            return HPxGPUDeformer::evaluate(block, node, output, inputs, in, out);
        inputsSeen.clear();
        for (const HPlug& one : inputs)
            inputsSeen += one.name().asStdString() + " ";
        return copy(in.getBuffer(inputs.front(), sPositionsName), output, out);
    }
    DeformerStatus evaluate(HDataBlock& block, const HEvaluationNode& node, const HPlug& output, const HPlug& input,
                            const HGPUDeformerData& in, HGPUDeformerData& out) override {
        if (variant != 2)
            return HPxGPUDeformer::evaluate(block, node, output, input, in, out);
        return copy(in.getBuffer(input, sPositionsName), output, out);
    }
    DeformerStatus evaluate(HDataBlock& block, const HEvaluationNode& node, const HPlug& output, unsigned vertexCount,
                            const HOpenCLBuffer& in, HOpenCLBuffer& out) override {
        if (variant != 3)
            return HPxGPUDeformer::evaluate(block, node, output, vertexCount, in, out);
        EXPECT_EQ(vertexCount, 12U);
        return copyTo(in, out);
    }

private:
    static DeformerStatus copyTo(const HOpenCLBuffer& in, HOpenCLBuffer& out) {
        ++Seen::evaluations;
        HOpenCLEvent done;
        const cl_int status = clEnqueueCopyBuffer(HOpenCLInfo::getQuarnDefaultOpenCLCommandQueue(), in.get(), out.get(),
                                                  0, 0, in.bufferSize(), 0, nullptr, done.receive());
        out.setBufferReadyEvent(done);
        return HOpenCLInfo::checkCLErrorStatus(status) == CL_SUCCESS ? kDeformerSuccess : kDeformerFailure;
    }
    DeformerStatus copy(const HOpenCLBuffer& in, const HPlug& output, HGPUDeformerData& out) {
        if (made_.ensureBufferSize(in.bufferSize()) != CL_SUCCESS)
            return kDeformerFailure;
        out.setBuffer(output, sPositionsName, made_);
        return copyTo(in, made_);
    }
    HOpenCLBuffer made_;
};

TEST_F(DeformerTest, InputPlugsAreThoseThatMakeTheOutput) {
    meshNode("n", grid(2, 2));
    connect("n.outMesh", input("d", 3));
    hooks.create = [] { return new Copies<1>; };
    for (const bool matches : {true, false}) {
        hooks.matchesIndices = matches;
        plug("d.weightList[0].weights[0]").setDouble(1.0);
        animate("d", 1.0);
        EXPECT_EQ(evaluatedOn("d"), "cpu");
        animate("d", 2.0);
        EXPECT_EQ(evaluatedOn("d"), "gpu");
        EXPECT_EQ(inputsSeen,
                  matches ? "d.input[0].inputGeometry " : "d.input[0].inputGeometry d.input[3].inputGeometry ");
    }
}

TEST_F(DeformerTest, EachVariantOfEvaluateCanBeTheOneThatWorks) {
    const std::function<HPxGPUDeformer*()> variants[] = {[] { return new Copies<1>; }, [] { return new Copies<2>; },
                                                         [] { return new Copies<3>; }};
    for (const auto& make : variants) {
        hooks.create = make;
        Gpu::setEnabled(false);
        Gpu::setEnabled(true);
        Seen::reset();
        OpenQuarn::makeDirty(plug(output("d", 0)));
        EXPECT_EQ(evaluatedOn("d"), "cpu");
        for (const double depth : {2.0, 3.0}) {
            const HObject moved = grid(4, 3, depth);
            set("m.inMesh", moved);
            EXPECT_EQ(evaluatedOn("d"), "gpu");
            EXPECT_THAT(pushedBy("d", moved), Each(0.0));
        }
        EXPECT_EQ(Seen::evaluations, 2);
    }
    hooks.create = [] { return new Copies<0>; };
    Gpu::setEnabled(false);
    Gpu::setEnabled(true);
    set("m.inMesh", mesh);
    OpenQuarn::makeDirty(plug(output("d", 0)));
    nextFrame();
    EXPECT_EQ(nextFrame(), "cpu") << "no variant at all";
    EXPECT_THAT(takeMessages(), ElementsAre(HasSubstr("its GPU deformer failed")));
}

TEST_F(DeformerTest, AdditionalMeshesAreUploadedWhenTheyAreAskedFor) {
    meshNode("target", grid(2, 2));
    connect("target.outMesh", "d.originalGeometry[0]");
    hooks.additional = [](const HObject&, HObjectArray& attributes) {
        attributes.append(HPxGeometryFilter::originalGeometry);
    };
    EXPECT_EQ(nextFrame(), "cpu");
    EXPECT_EQ(nextFrame(), "gpu");
    EXPECT_EQ(Gpu::counts().uploads.at("positions"), 1U) << "nobody asked";
    std::size_t bytes = 0;
    hooks.deform = [&](HPxGPUStandardDeformer& deformer, const HGPUDeformerData& data, HDataBlock& block) {
        block.inputValue(HFnDependencyNode(deformer.dependencyNode()).attribute("push")); // what it depends on
        HPlug target(deformer.dependencyNode(), HPxGeometryFilter::originalGeometry);
        target.selectAncestorLogicalIndex(deformer.multiIndex());
        cl_int status = -1;
        bytes = data.getBuffer(target, HPxGPUDeformer::sPositionsName, &status).bufferSize();
        EXPECT_EQ(status, CL_SUCCESS);
        EXPECT_TRUE(data.getBuffer(target, "normals", &status).isNull());
        EXPECT_EQ(status, CL_SUCCESS);
        return HPxGPUDeformer::kDeformerPassThrough;
    };
    for (const std::uint64_t uploads : {1U, 0U}) {
        animate("d", 50.0 + static_cast<double>(uploads));
        EXPECT_EQ(evaluatedOn("d"), "gpu");
        EXPECT_EQ(bytes, 48U);
        EXPECT_EQ(Gpu::counts().bytesUp, uploads * 48U);
    }
}

TEST_F(DeformerTest, PassingThroughGivesTheMeshOfTheAttribute) {
    const HObject other = grid(4, 3, 9.0);
    set("d.originalGeometry[0]", other);
    hooks.passThroughMesh = [](const HObject&) { return HPxGeometryFilter::originalGeometry; };
    hooks.deform = [](auto&&...) { return HPxGPUDeformer::kDeformerPassThrough; };
    EXPECT_EQ(nextFrame(), "cpu");
    animate("d", 2.0);
    EXPECT_EQ(evaluatedOn("d"), "gpu");
    EXPECT_THAT(pushedBy("d", other), Each(0.0));
}

TEST_F(DeformerTest, WithoutAFilterThereIsNoEnvelope) {
    hooks.isGeometryFilter = false;
    plug("d.envelope").setDouble(0.0);
    plug("d.weightList[0].weights[0]").setDouble(0.0);
    animate("d", 1.0);
    EXPECT_EQ(evaluatedOn("d"), "cpu");
    animate("d", 2.0);
    EXPECT_EQ(evaluatedOn("d"), "gpu");
    EXPECT_THAT(pushedBy("d", mesh), Each(2.0)) << "neither envelope nor weights count";
}

TEST_F(DeformerTest, TerminateMayBeFollowedByAnotherEvaluation) {
    HPxGPUDeformer* made = nullptr;
    hooks.create = [&] { return made = gpuDeformers::makePush(); };
    plug("d.weightList[0].weights[0]").setDouble(1.0);
    EXPECT_EQ(nextFrame(), "cpu");
    EXPECT_EQ(nextFrame(), "gpu");
    ASSERT_NE(made, nullptr);
    made->terminate();
    EXPECT_EQ(nextFrame(), "gpu");
    EXPECT_EQ(Gpu::counts().uploads.at("weights"), 1U) << "everything anew";
    EXPECT_EQ(Seen::terminations, 1);
}

TEST_F(DeformerTest, TheHostTerminatesADeformerWhereverItLetsItGo) {
    struct Row {
        const char* name;
        std::function<void()> letGo, comeBack;
    };
    const auto anew = [&] { session.newScene(), SetUp(); };
    const std::vector<Row> rows = {
        {"the pipeline is switched off", [] { Gpu::setEnabled(false); },
         [&] {
             Gpu::setEnabled(true);
             EXPECT_EQ(nextFrame(), "cpu");
         }},
        {"a frame fails",
         [&] {
             hooks.deform = [](auto&&...) { return HPxGPUDeformer::kDeformerFailure; };
             EXPECT_EQ(nextFrame(), "cpu");
         },
         [] { hooks.deform = nullptr; }},
        {"another device",
         [&] {
             Gpu::setTiming(true);
             EXPECT_EQ(nextFrame(), "gpu");
         },
         [] { Gpu::setTiming(false); }},
        {"the plug-in takes it back",
         [&] {
             OpenQuarn::unloadPlugin("gpuDeformers");
             EXPECT_EQ(Seen::alive, 0);
             EXPECT_EQ(nextFrame(), "nowhere") << "no GPU deformer, nothing to count";
         },
         [&] {
             registerPush();
             EXPECT_EQ(nextFrame(), "cpu");
         }},
        {"no mesh comes in any more",
         [] {
             create("mesh", "empty");
             disconnect("m.outMesh", input("d", 0)), connect("empty.outMesh", input("d", 0));
             EXPECT_EQ(evaluate(output("d", 0)), "");
         },
         anew},
        {"the node is deleted",
         [] {
             HDGModifier modifier;
             modifier.deleteNode(plug("d.envelope").node());
             EXPECT_EQ(text(modifier.doIt()), "");
         },
         anew},
        {"a new scene", [&] { session.newScene(); }, anew},
    };
    for (const bool isThrowing : {false, true})
        for (const Row& row : rows) {
            SCOPED_TRACE(row.name);
            EXPECT_EQ(nextFrame(), "gpu");
            Seen::reset();
            std::vector<std::string> nodes;
            hooks.terminate = [&](const HPxGPUDeformer& deformer) {
                nodes.push_back(HFnDependencyNode(deformer.dependencyNode()).name().asStdString());
                if (isThrowing)
                    throw std::runtime_error("no end");
            };
            row.letGo();
            hooks.terminate = nullptr;
            EXPECT_THAT(nodes, ElementsAre("d"));
            EXPECT_THAT(takeMessages(), Contains("error: d: terminate: no end").Times(isThrowing ? 1 : 0));
            row.comeBack();
        }
}

} // namespace
