// SPDX-License-Identifier: Apache-2.0
// Registering and deregistering, with each step failing in turn.
#include "entry/registration.h"
#include "host/support/SceneTest.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn_app/Plugins.h"

namespace {

using OpenQuarn::Faults;
using Names = std::vector<std::string>;

HStatus lastStatus;

// Answers the host with a success, so that it leaves in place what there is.
HStatus registerAndKeep(HObject plugin) {
    lastStatus = neuralWarp::registerPlugin(plugin);
    return HStatus::kSuccess;
}

bool keepsAll = false;

HStatus deregisterOrKeep(HObject plugin) {
    return keepsAll ? HStatus(HStatus::kSuccess) : lastStatus = neuralWarp::deregisterPlugin(plugin);
}

struct Step {
    const char* text; ///< printed when it fails
    const char* operation;
    int call;
    const char* item; ///< what it registers or takes away; none for the texts, which may fail
};

constexpr Step registering[] = {
    {"registerData neuralWarpData", "HFnPlugin::registerData", 1, "data neuralWarpData"},
    {"registerNode neuralWarp", "HFnPlugin::registerNode", 1, "node neuralWarp"},
    {"registerGPUDeformerCreator neuralWarp", "HGPUDeformerRegistry::registerGPUDeformerCreator", 1, "GPU neuralWarp"},
    {"registerCommand neuralWarp", "HFnPlugin::registerCommand", 1, "command neuralWarp"},
    {"registerUIStrings neuralWarp", "HFnPlugin::registerUIStrings", 1, nullptr},
    {"registerNode controlCollectorNode", "HFnPlugin::registerNode", 2, "node controlCollector"},
    {"registerNode orthoAxisFromMatrixArray", "HFnPlugin::registerNode", 3, "node orthoAxisFromMatrixArray"},
    {"registerNode matrixConverterNode", "HFnPlugin::registerNode", 4, "node matrixConverter"},
};

constexpr Step deregistering[] = {
    {"deregisterNode matrixConverterNode", "HFnPlugin::deregisterNode", 1, "node matrixConverter"},
    {"deregisterNode orthoAxisFromMatrixArray", "HFnPlugin::deregisterNode", 2, "node orthoAxisFromMatrixArray"},
    {"deregisterNode controlCollectorNode", "HFnPlugin::deregisterNode", 3, "node controlCollector"},
    {"deregisterGPUDeformerCreator neuralWarp", "HGPUDeformerRegistry::deregisterGPUDeformerCreator", 1,
     "GPU neuralWarp"},
    {"deregisterNode neuralWarp", "HFnPlugin::deregisterNode", 4, "node neuralWarp"},
    {"deregisterData neuralWarpData", "HFnPlugin::deregisterData", 1, "data neuralWarpData"},
    {"deregisterCommand neuralWarp", "HFnPlugin::deregisterCommand", 1, "command neuralWarp"},
};

Names registered() {
    const OpenQuarn::PluginInfo info = OpenQuarn::pluginInfo("neuralWarp");
    Names items;
    const auto add = [&](const char* kind, const Names& names) {
        for (const std::string& name : names)
            items.push_back(kind + (" " + name));
    };
    add("data", info.dataTypes);
    add("node", info.nodeTypes);
    add("command", info.commands);
    add("GPU", info.gpuDeformers);
    return items;
}

std::string printedFor(const Step& step) {
    return std::string("error: ") + step.text + ": " + step.operation + ": failed on demand";
}

class Registration : public SceneTest {
protected:
    void add() { OpenQuarn::addPlugin("neuralWarp", registerAndKeep, deregisterOrKeep); }
    /// The host takes away what the plug-in does not.
    void forceUnload() {
        keepsAll = true;
        OpenQuarn::unloadPlugin("neuralWarp");
        keepsAll = false;
        takeMessages();
    }
};

TEST_F(Registration, StopsAtTheFirstStepThatFailsExceptForTheTexts) {
    add();
    const Names all = registered();
    EXPECT_EQ(all.size(), std::size(deregistering));
    EXPECT_EQ(OpenQuarn::pluginInfo("neuralWarp").vendor, "Kestrava");
    EXPECT_EQ(OpenQuarn::pluginInfo("neuralWarp").version, "3.0");
    forceUnload();

    Names before;
    for (const Step& step : registering) {
        SCOPED_TRACE(step.text);
        Faults::fail(step.operation, step.call);
        add();
        EXPECT_EQ(takeMessages(), Names{printedFor(step)});
        EXPECT_EQ(lastStatus, step.item ? HStatus::kFailure : HStatus::kSuccess);
        EXPECT_THAT(registered(), testing::UnorderedElementsAreArray(step.item ? before : all));
        if (step.item)
            before.emplace_back(step.item);
        forceUnload();
    }
    EXPECT_THAT(before, testing::UnorderedElementsAreArray(all));
}

TEST_F(Registration, IsUndoneUntilAStepFails) {
    for (std::size_t failing = 0; failing < std::size(deregistering); ++failing) {
        const Step& step = deregistering[failing];
        SCOPED_TRACE(step.text);
        add();
        Faults::fail(step.operation, step.call);
        EXPECT_THROW(OpenQuarn::unloadPlugin("neuralWarp"), std::runtime_error);
        EXPECT_EQ(takeMessages(), Names{printedFor(step)});
        EXPECT_EQ(lastStatus, HStatus::kFailure);
        Names left;
        for (std::size_t i = failing; i < std::size(deregistering); ++i)
            left.emplace_back(deregistering[i].item);
        EXPECT_THAT(registered(), testing::UnorderedElementsAreArray(left));
        forceUnload();
    }
    add();
    OpenQuarn::unloadPlugin("neuralWarp"); // nothing is left that the host would have to warn of
}

TEST_F(Registration, GivesEachNodeTypeItsId) {
    add();
    const std::pair<const char*, unsigned> types[] = {{"neuralWarp", 0x58000971},
                                                      {"controlCollector", 0x58000973},
                                                      {"orthoAxisFromMatrixArray", 0x58000974},
                                                      {"matrixConverter", 0x58000975}};
    for (const auto& [name, id] : types) {
        HStatus status;
        const HObject node = HFnDependencyNode().create(name, "made", &status);
        ASSERT_EQ(status, HStatus::kSuccess) << name;
        EXPECT_EQ(HFnDependencyNode(node).typeId().id(), id) << name;
    }
}

} // namespace
