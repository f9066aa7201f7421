// SPDX-License-Identifier: Apache-2.0
// The GPU deformer: what it answers, what it says, and where its points are.
#include "plugin/deformer/gpu/GpuTest.h"
#include "plugin/deformer/support/SeenOutputs.h"

#include "openquarn_app/Resources.h"

#include <functional>
#include <limits>
#include <numeric>

namespace {

using OpenQuarn::Gpu;
using testing::IsEmpty;

constexpr GpuTest::Status success = HPxGPUDeformer::kDeformerSuccess;
constexpr GpuTest::Status failure = HPxGPUDeformer::kDeformerFailure;
constexpr GpuTest::Status passThrough = HPxGPUDeformer::kDeformerPassThrough;

constexpr double rounding = 1e-5; // single precision, near 1, and Surface frames of it

using T = GpuTest;
using Data = neuralWarp::neuralWarpData;
using Spoil = std::function<void(T&)>;

Spoil inState(const std::function<void(Data&)>& change) {
    return [=](T& t) { change(t.state()); };
}

/// The network in its place gives that many values.
Spoil outputs(std::size_t count) {
    return [=](T& t) {
        t.writeChanged([&](ModelSpec& spec) { spec.bias.resize(count); });
        t.state().session.load(t.modelDirectory() / "model.onnx", true);
    };
}

Spoil shapes(std::uint64_t shapeCount, std::uint64_t vertexCount, std::size_t values) {
    return inState([=](Data& data) {
        data.principalShapeCount = shapeCount;
        data.principalVertCount = vertexCount;
        data.principalShapes.assign(std::vector<float>(values, 1.0F), data.principalShapeCount);
    });
}

TEST_F(GpuTest, AnswersAndSaysWhatIsWrong) {
    const auto control = [](double value) { return [=](T& t) { t.rig->setControls({value}); }; };
    const Texts noDeltas{"error: [NEURAL WARP] No delta computed from the ML model"};
    const Texts invalid{"error: [NEURAL WARP] The training of the ml model for index 0 does not match the connected "
                        "geometry. It will need to be retrained."};
    struct Row {
        const char* name;
        Spoil spoil; ///< after an evaluation on the CPU that went well
        Status status;
        Texts messages;
    };
    const Row rows[] = {
        {"no state", [](T& t) { t.told().multiIndex = 7; }, failure, {}},
        {"export", inState([](Data& d) { d.exportMode = true; }), passThrough, {}},
        {"no envelope", [](T& t) { t.rig->plug("envelope").setFloat(0.0F); }, passThrough, {}},
        {"no session",
         inState([](Data& d) { d.session.reset(); }),
         passThrough,
         {"error: [NEURAL WARP] No ML model initialized for index 0"}},
        {"not its model", inState([](Data& d) { d.modelValid = false; }), passThrough, invalid},
        {"no network",
         [](T& t) {
             writeFile(t.folder.path() / "model.pt", "");
             t.state().session.load(t.folder.path() / "model.pt", true);
         },
         passThrough, invalid},
        {"no controls",
         [](T& t) { t.rig->setControls({}); },
         passThrough,
         {"error: [NEURAL WARP] Size of the ML model inputs (1) does not match the connected control attributes "
          "count(0).",
          report("the model has more inputs than there are control values", "neuralWarp/neuralWarpGPUNode")}},
        {"no number", control(std::numeric_limits<double>::quiet_NaN()), passThrough, noDeltas},
        {"too few outputs", outputs(26), failure, {}},
        {"too few coefficients", shapes(28, 9, 756), failure, {}},
        {"too small a basis", shapes(1, 9, 26), failure, {}},
        {"a basis without the last slot", shapes(1, 8, 27), failure, {}},
        {"a basis that says too much", shapes(1, 10, 27), failure, {}},
        {"other vertices", inState([](Data& d) { d.componentMap.setIdentity(8); }), failure, {}},
        {"no frames", inState([](Data& d) { d.vertexFrames = {}; }), failure, {}},
        {"no rest frames", inState([](Data& d) { d.restFramesInverse = {}; }), failure, {}},
        {"a rest point less",
         inState([](Data& d) {
             neuralWarp::Points points = d.restPoints;
             points.pop_back();
             d.restPoints = points;
         }),
         failure,
         {}},
        {"no connections",
         inState([](Data& d) {
             d.activeSettings.smoothingIterations = 2;
             d.vertexConnections = {};
             d.connectionWeights = {};
         }),
         failure,
         {}},
        {"too short a map",
         inState([](Data& d) {
             d.useAffectMap = true;
             d.affectMap = {0};
         }),
         failure,
         {}},
        {"too few shapes on the device",
         [](T& t) {
             shapes(1, 9, 27)(t);
             EXPECT_EQ(t.evaluate(), success);
             OpenQuarn::Gpu::resetCounts();
             shapes(2, 9, 54)(t); // without a word to who has the buffer
         },
         failure,
         {}},
        {"no kernels", [](T&) { OpenQuarn::Resources::setPath("/nowhere"); }, failure, {}},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        writeModel(modelDirectory(), modelSpec());
        makeEvaluated();
        SeenOutputs observed;
        observed.values = {1.0F};
        state().observer = &observed;
        row.spoil(*this);
        EXPECT_EQ(evaluate(), row.status);
        OpenQuarn::Resources::setPath("");
        EXPECT_EQ(shown(), row.messages);
        EXPECT_THAT(positions, IsEmpty());
        EXPECT_TRUE(observed.values.empty() || row.status != passThrough) << "nothing came of the network";
        EXPECT_TRUE(Gpu::counts().launches.empty()) << "something was enqueued";
        gpu.reset();
    }
}

TEST_F(GpuTest, MorphsAsFarAsThereIsATarget) {
    const Texts noTarget{"error: [NEURAL WARP] Could not get buffer for target geometry"};
    writeModel(modelDirectory(), modelSpec());
    enum Expected { kNothing, kModel, kTarget, kInput };
    struct Row {
        const char* name;
        double envelope;
        std::size_t targetSize;
        Expected expected;
        Texts messages;
    };
    const Row rows[] = {
        {"too weak to show", 0.0000005, 0, kModel, {}},
        {"more points than needed", 1.0, 10, kTarget, {}},
        {"too few points", 0.5, 8, kNothing, {}},
        {"no target, the model shows", 0.5, 0, kModel, noTarget},
        {"no target, and no model either", 1.0, 0, kInput, noTarget},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        makeEvaluated();
        const Coordinates expected[] = {{}, result(*rig), Coordinates(9, {5.0, 6.0, 7.0}), came()};
        rig->plug("targetMorphEnabled").setBool(true);
        rig->plug("targetMorphEnvelope").setDouble(row.envelope);
        target.assign(row.targetSize, {5.0, 6.0, 7.0});
        EXPECT_EQ(evaluate(), row.expected == kNothing ? failure : success);
        EXPECT_EQ(shown(), row.messages);
        EXPECT_LT(distanceTo(expected[row.expected]), rounding);
        gpu.reset();
    }
}

// --- uploads ---

/// Some vertices with weights, Surface deltas from principal shapes, smoothing: a use for every buffer.
class Uploads : public GpuTest {
protected:
    static ModelSpec spec() {
        ModelSpec model = modelSpec(12);
        model.deltaMode = 1;
        model.smoothingIterations = 1;
        model.shapes = {model.bias, std::vector<float>(model.bias.rbegin(), model.bias.rend())};
        model.bias = {0.5F, -0.25F};
        return model;
    }
    void make() {
        rig.emplace();
        warpRig::GeometrySpec geometry{.mesh = unevenMesh(3, 2)};
        geometry.affected = {{10, 3, 4, 7, 0, 11, 8, 6}};
        geometry.weights.resize(12);
        std::iota(geometry.weights.begin(), geometry.weights.end(), 0.25F);
        rig->addGeometry(0, geometry);
        rig->setModelRoot(folder.path());
        rig->setControls({1.0});
        EXPECT_EQ(rig->deform(0), HStatus::kSuccess);
        makeDeformer();
        takeMessages(); // that the model is of other vertices
    }
};

TEST_F(Uploads, AreOfWhatHasANewVersionAndOfAllAfterItsEnd) {
    writeModel(modelDirectory(), spec());
    make();
    SeenOutputs observed;
    state().observer = &observed;
    const std::vector<Texts> bySlot = {{"FramesIndexer", "FramesPairs"},
                                       {"ConnectionWeights", "Connections", "ConnectionsIndexer"},
                                       {"OriginalVerts", "SmoothOriginalFramesInverse"},
                                       {"AffectToDeltaMap"},
                                       {"PrincipalShapesData"}};
    Texts all;
    for (const Texts& names : bySlot)
        all.insert(all.end(), names.begin(), names.end());
    const auto uploads = [&] { // of what is published, in an evaluation
        Gpu::resetCounts();
        EXPECT_EQ(evaluate(), success);
        EXPECT_LT(distanceTo(result(*rig)), rounding);
        EXPECT_EQ(observed.values, spec().bias);
        Texts names;
        for (const auto& [name, count] : Gpu::counts().uploads)
            if (std::count(all.begin(), all.end(), name) != 0)
                names.insert(names.end(), count, name);
        return names;
    };
    EXPECT_THAT(uploads(), testing::UnorderedElementsAreArray(all));
    EXPECT_THAT(uploads(), IsEmpty());
    for (unsigned slot = 0; slot < bySlot.size(); ++slot) {
        state().bump(static_cast<Data::Cache>(slot));
        EXPECT_THAT(uploads(), testing::ElementsAreArray(bySlot[slot]));
    }
    gpu->terminate();
    EXPECT_THAT(uploads(), testing::UnorderedElementsAreArray(all));
}

// --- in the host's hands ---

TEST_F(GpuTest, WhatIsDueIsDoneOnTheCpu) {
    writeModel(modelDirectory(), modelSpec());
    makeRig();
    Gpu::setEnabled(true);
    const auto where = [&] {
        rig->setInput(0, unevenMesh());
        Gpu::resetCounts();
        OpenQuarn::evaluate(rig->output(0));
        const OpenQuarn::GpuCounts counts = Gpu::counts();
        return std::string(counts.gpuEvaluations ? "gpu" : "") + (counts.cpuEvaluations ? "cpu" : "");
    };
    EXPECT_EQ(where(), "cpu");
    EXPECT_EQ(where(), "gpu");
    state().restFramesDirty = true;
    EXPECT_EQ(where(), "cpu");
    EXPECT_EQ(where(), "gpu") << "it was done";
    EXPECT_THAT(shown(), IsEmpty());
    outputs(26)(*this); // the CPU says so, and the geometry stays as it came
    EXPECT_EQ(where(), "cpu");
    EXPECT_EQ(result(*rig), came());
    EXPECT_THAT(shown(), testing::Contains("error: [NEURAL WARP] Size of predicted deltas (8) does not match affected "
                                           "vertex count (9)"));
    Gpu::setEnabled(false);
}

} // namespace
