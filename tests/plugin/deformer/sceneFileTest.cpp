// SPDX-License-Identifier: Apache-2.0
// The node in a scene that is saved, opened, moved, edited, duplicated and closed.
#include "openquarn_app/SceneFile.h"
#include "frame/FrameSampler.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Evaluation.h"
#include "plugin/deformer/support/WarpTest.h"
#include "plugin/deformer/support/stateText.h"

namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::Not;
namespace fs = std::filesystem;

ModelSpec quadModel(float lift) {
    ModelSpec spec;
    spec.controls = 2;
    spec.bias.assign(12, 0.125F);
    spec.weights.assign(24, lift);
    spec.smoothingIterations = 1;
    spec.fullCount = spec.affectCount = 4;
    return spec;
}

class WarpScene : public WarpTest {
protected:
    WarpScene() { writeModel(modelDirectory(), quadModel(0.5F)); }

    /// A node with these geometries, evaluated.
    warpRig::Rig evaluatedRig(const std::vector<unsigned>& indices) const {
        warpRig::Rig rig;
        for (const unsigned index : indices)
            rig.addGeometry(index, {.mesh = quad, .weights = {1.0F, 0.5F, 0.3F, 1.0F}});
        rig.setModelRoot(folder.path());
        rig.setControls({0.3, 0.7});
        for (const unsigned index : indices)
            EXPECT_EQ(rig.deform(index), HStatus::kSuccess);
        return rig;
    }
    static HPointArray evaluated(const std::string& node, unsigned index = 0) {
        const HPlug output = testNodes::plug(node + ".outputGeom[" + std::to_string(index) + "]");
        EXPECT_EQ(OpenQuarn::evaluate(output), HStatus::kSuccess);
        return warpRig::pointsOf(output.asHObject());
    }
    static neuralWarp::neuralWarpData* state(const std::string& node, unsigned index = 0) {
        const HFnPluginData data(testNodes::plug(node + ".deformerData[" + std::to_string(index) + "]").asHObject());
        return static_cast<neuralWarp::neuralWarpData*>(data.data());
    }
    static void run(const std::string& script) { EXPECT_EQ(OpenQuarn::runCommand(script).error, ""); }

    const HObject quad = warpRig::mesh(makeGrid(1, 1));
};

TEST_F(WarpScene, OpensToTheSameBits) {
    const HPointArray saved = evaluatedRig({0}).result(0);
    EXPECT_NE(saved, warpRig::pointsOf(quad));
    run("neuralWarp -exp off warp1; setAttr warp1.train[2].epochs 17");
    const fs::path file = folder.path() / "scene.json";
    ASSERT_TRUE(OpenQuarn::saveScene(file));
    std::string written;
    ASSERT_TRUE(OpenQuarn::sceneToText(written));
    EXPECT_THAT(written, AllOf(HasSubstr("modelRoot"), Not(HasSubstr("deformerData")), Not(HasSubstr("\"dfd\""))));

    ASSERT_TRUE(OpenQuarn::openScene(file));
    EXPECT_EQ(state("warp1"), nullptr);
    EXPECT_EQ(evaluated("warp1"), saved);
    EXPECT_TRUE(state("warp1")->modelApplied);
    EXPECT_EQ(testNodes::plug("warp1.train[2].epochs").asInt(), 17);
    std::string again;
    ASSERT_TRUE(OpenQuarn::sceneToText(again));
    EXPECT_EQ(again, written);
}

TEST_F(WarpScene, AnEditReachesAsManyIndicesAsThereAreStates) {
    const warpRig::Rig rig = evaluatedRig({0, 2, 5}); // three states: 0 and 2 are below that, 5 is not
    run("setAttr warp1.models[5].modelName model");
    EXPECT_TRUE(rig.state(0)->modelPathDirty);
    EXPECT_TRUE(rig.state(2)->modelPathDirty);
    EXPECT_FALSE(rig.state(5)->modelPathDirty);
    run("neuralWarp -reloadModel -multiIndex 5 warp1");
    EXPECT_TRUE(rig.state(5)->modelPathDirty);
}

/// With all that a frame needs before it is evaluated, and whatever becomes of the original.
TEST_F(WarpScene, ADuplicateHasAStateOfItsOwn) {
    ModelSpec part = quadModel(0.5F);
    part.deltaMode = 0;
    part.subsetState = "partial";
    part.affectMap = {2, 0};
    part.bias.resize(2);
    part.weights.resize(4);
    part.shapes = {{1, 2, 3, 4, 5, 6}, {0, 1, 0, 2, 0, 3}};
    writeModel(modelDirectory(), part);
    const warpRig::Rig rig = evaluatedRig({0, 1});
    const HPointArray before = rig.result(1);
    takeMessages(); // that the model is of other vertices
    run("setAttr warp1.export[0].smoothingIterations 4; neuralWarp -exportActive on -multiIndex 0 warp1;"
        "duplicate warp1 -name copy");
    const auto placed = [](neuralWarp::neuralWarpData& data) {
        neuralWarp::Points result;
        const std::vector<float> outputs = data.session.run(std::vector<float>{0.3F, 0.7F});
        neuralWarp::FrameSampler(data.frameModel()).place(data.workspace, result, makeGrid(1, 1).points, outputs);
        return result;
    };
    ASSERT_NE(state("copy", 1), rig.state(1));
    EXPECT_EQ(stateText::raised(*state("copy", 1)), "topology restFrames valid affectMap");
    EXPECT_EQ(placed(*state("copy", 1)), placed(*rig.state(1)));
    EXPECT_EQ(placed(*rig.state(1)).size(), 4U);
    EXPECT_EQ(state("copy", 1)->slotCount(), 2U);
    EXPECT_EQ(evaluated("copy"), warpRig::pointsOf(quad)) << "it is exported as well";

    // a directory that was written into since: the network need not be the one of the rest
    writeFile(modelDirectory() / "principal_shapes.json", "{}");
    run("duplicate warp1 -name late");
    EXPECT_THAT(stateText::raised(*state("late", 1)), HasSubstr("load metadata path"));
    EXPECT_FALSE(rig.state(1)->modelPathDirty);
    fs::remove_all(modelDirectory());
    run("duplicate warp1 -name without");
    EXPECT_FALSE(state("without", 1)->canApplyModel());

    run("deleteNode warp1");
    writeModel(modelDirectory(), part);
    run("setAttr copy.models[0].modelName model"); // which reaches both geometries
    EXPECT_TRUE(state("copy", 1)->modelPathDirty);
    EXPECT_EQ(evaluated("copy", 1), before);
    EXPECT_THAT(takeMessages(), ::testing::ElementsAre(HasSubstr("multiIndex 1")));
}

TEST_F(WarpScene, ANodeThatGoesTakesItsCallbackAlong) {
    for (const std::string end : {"deleteNode warp1", "file -new"}) {
        evaluatedRig({0});
        OpenQuarn::Faults::fail("HMessage::removeCallback", 2); // a second removal would be one too many
        run(end);
        EXPECT_FALSE(OpenQuarn::Faults::fired("HMessage::removeCallback")) << end;
        run("file -new");
        evaluatedRig({0});
        OpenQuarn::Faults::fail("HMessage::removeCallback", 1);
        run(end);
        EXPECT_TRUE(OpenQuarn::Faults::fired("HMessage::removeCallback")) << end;
        OpenQuarn::Faults::clear();
        run("file -new; createNode neuralWarp -name warp1; setAttr warp1.modelRoot somewhere");
        run("file -new");
    }
}

} // namespace
