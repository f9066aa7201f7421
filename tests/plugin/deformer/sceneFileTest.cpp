// SPDX-License-Identifier: Apache-2.0
// The node in a scene that is saved, opened, moved, edited, duplicated and closed.
#include "openquarn_app/SceneFile.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/Workspace.h"
#include "plugin/deformer/support/WarpTest.h"

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
    static HPointArray evaluated(const std::string& node) {
        const HPlug output = testNodes::plug(node + ".outputGeom[0]");
        EXPECT_EQ(OpenQuarn::evaluate(output), HStatus::kSuccess);
        return warpRig::pointsOf(output.asHObject());
    }
    static const neuralWarp::neuralWarpData* state(const std::string& node) {
        const HFnPluginData data(testNodes::plug(node + ".deformerData[0]").asHObject());
        return static_cast<const neuralWarp::neuralWarpData*>(data.data());
    }
    static std::string text(const std::string& plug) { return testNodes::plug(plug).asString().asStdString(); }
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

TEST_F(WarpScene, AFolderThatMovesIsFoundAgain) {
    const HPointArray before = evaluatedRig({0}).result(0);
    const TemporaryFolder elsewhere;
    fs::copy(folder.path(), elsewhere.path(), fs::copy_options::recursive);
    const auto content = OpenQuarn::externalContent();
    ASSERT_EQ(content.size(), 1U);
    EXPECT_EQ(content[0].node, "warp1");
    EXPECT_EQ(content[0].unresolved, folder.path().string());
    fs::remove_all(modelDirectory());

    ASSERT_TRUE(OpenQuarn::relocate({{"warp1", content[0].key, elsewhere.path().string()}}));
    EXPECT_EQ(text("warp1.modelRoot"), elsewhere.path().string());
    EXPECT_EQ(evaluated("warp1"), before);
    EXPECT_EQ(state("warp1")->modelDirectory, elsewhere.path() / "model.nwrp");
    EXPECT_THAT(OpenQuarn::filesToArchive(true), ::testing::ElementsAre(elsewhere.path().string()));

    // and that what is there is read, not what was
    writeModel(elsewhere.path() / "other" / "model.nwrp", quadModel(-1.0F));
    ASSERT_TRUE(OpenQuarn::relocate({{"warp1", content[0].key, (elsewhere.path() / "other").string()}}));
    EXPECT_NE(evaluated("warp1"), before);
}

TEST_F(WarpScene, ANodeOfAFileKeepsItsFolders) {
    OpenQuarn::Workspace::setRootDirectory("/shows/arm");
    run("createNode neuralWarp -name fresh; createNode neuralWarp -name kept; createNode neuralWarp -name bare;"
        "setAttr kept.modelRoot \"/elsewhere/models\"; setAttr bare.modelRoot \"\"; setAttr bare.trainingDataRoot "
        "\"\"");
    EXPECT_EQ(text("fresh.modelRoot"), "/shows/armneuralWarp/models");
    std::string scene;
    ASSERT_TRUE(OpenQuarn::sceneToText(scene));
    OpenQuarn::Workspace::setRootDirectory("/other/");
    ASSERT_TRUE(OpenQuarn::sceneFromText(scene, "scene"));
    EXPECT_EQ(text("fresh.modelRoot"), "/shows/armneuralWarp/models");
    EXPECT_EQ(text("fresh.trainingDataRoot"), "/shows/armcache/neuralWarp/trainingData");
    EXPECT_EQ(text("kept.modelRoot"), "/elsewhere/models");
    EXPECT_EQ(text("bare.modelRoot"), "");
    EXPECT_EQ(text("bare.trainingDataRoot"), "");
    run("createNode neuralWarp -name late");
    EXPECT_EQ(text("late.modelRoot"), "/other/neuralWarp/models");
    OpenQuarn::Workspace::resetRootDirectory();
}

TEST_F(WarpScene, EditsOfTheModelsPlaceAskForAReload) {
    struct Row {
        const char* edit;
        bool reloads;
        bool dirties;
    };
    const std::vector<Row> rows = {
        {"setAttr warp1.models[3].modelName other", true, true}, // of a geometry that is not there
        {"setAttr warp1.models[3].modelName other", true, true}, // the same text again
        {"setAttr warp1.models[0].modelName model", true, true},
        {"setAttr warp1.mlrt nowhere", true, true},
        {"setAttr warp1.models[0].modelActive Off", false, true},
        {"setAttr warp1.models[0].modelActive On", false, true},
        {"setAttr warp1.controlValues 0.1 0.2", false, true},
        {"setAttr warp1.targetMorphEnvelope 0.5", false, true},
        {"setAttr warp1.train[0].batchSize 64", false, false},
        {"setAttr warp1.train[0].outputModelName other", false, false},
        {"setAttr warp1.export[0].smoothingIterations 3", false, false},
        {"setAttr warp1.trainingDataRoot nowhere", false, false},
        {"setAttr -lock on warp1.models[0].modelName", false, false},
        {"setAttr -lock off warp1.models[0].modelName", false, false},
    };
    const warpRig::Rig rig = evaluatedRig({0, 1, 2});
    for (const Row& row : rows) {
        for (const unsigned index : {0U, 1U, 2U})
            rig.state(index)->modelPathDirty = rig.state(index)->metadataDirty = rig.state(index)->modelLoadPending =
                false;
        for (const unsigned index : {0U, 1U, 2U})
            rig.output(index).asHObject(); // clean again
        takeMessages();                    // of evaluations with the paths above
        const OpenQuarn::DirtyWatch watch;
        run(row.edit);
        for (const unsigned index : {0U, 1U, 2U}) {
            const neuralWarp::neuralWarpData& data = *rig.state(index);
            EXPECT_EQ(data.modelPathDirty && data.metadataDirty && data.modelLoadPending, row.reloads)
                << row.edit << ", " << index;
            EXPECT_EQ(data.modelPathDirty || data.metadataDirty || data.modelLoadPending, row.reloads)
                << row.edit << ", " << index;
        }
        const bool dirties = std::ranges::any_of(
            watch.plugs(), [](const std::string& plug) { return plug.starts_with("warp1.outputGeom"); });
        EXPECT_EQ(dirties, row.dirties) << row.edit;
    }
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

TEST_F(WarpScene, ADuplicateHasAStateOfItsOwn) {
    const warpRig::Rig rig = evaluatedRig({0});
    const HPointArray result = rig.result(0);
    rig.plug("export[0].smoothingIterations").setInt(4);
    run("duplicate warp1 -name copy");
    const neuralWarp::neuralWarpData* original = rig.state(0);
    const neuralWarp::neuralWarpData* copied = state("copy");
    ASSERT_NE(copied, nullptr);
    ASSERT_NE(copied, original);
    EXPECT_TRUE(copied->canApplyModel()); // loaded again from its file: the network is not shared
    EXPECT_FALSE(copied->modelPathDirty);

    run("setAttr copy.models[0].modelName model");
    EXPECT_TRUE(state("copy")->modelPathDirty);
    EXPECT_FALSE(rig.state(0)->modelPathDirty);
    EXPECT_EQ(text("copy.modelRoot"), folder.path().string());
    EXPECT_EQ(evaluated("copy"), result);
    EXPECT_EQ(testNodes::plug("copy.export[0].smoothingIterations").asInt(), 4);

    run("deleteNode warp1; setAttr copy.models[0].modelName model; dgdirty copy");
    EXPECT_EQ(evaluated("copy"), result);
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
