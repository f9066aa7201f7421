// SPDX-License-Identifier: Apache-2.0
// What the deformer does when the host asks it about folders: at its making, for archives, for moved files.
#include "openquarn_app/SceneFile.h"
#include "openquarn_app/Workspace.h"
#include "plugin/entry/PluginTest.h"
#include "support/TemporaryFolder.h"

namespace {

using namespace testNodes;
using OpenQuarn::Faults;
using OpenQuarn::Workspace;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class NodeHooksTest : public PluginTest {
public:
    ~NodeHooksTest() override { Workspace::resetRootDirectory(); }

protected:
    static std::string value(const char* name) { return plug(name).asString().asStdString(); }
    static void set(const char* name, const char* value) { EXPECT_EQ(text(plug(name).setString(value)), ""); }

    /// The scene as it comes back from a file.
    void readBack() {
        std::string scene;
        ASSERT_TRUE(OpenQuarn::sceneToText(scene));
        session.newScene();
        ASSERT_TRUE(OpenQuarn::sceneFromText(scene, "scene"));
    }
};

TEST_F(NodeHooksTest, ANewNodeGetsFoldersBelowTheWorkspaceRoot) {
    const struct {
        const char* root;
        const char* fault; // what the query of the root fails in
        const char* models;
        const char* training;
    } rows[] = {
        {"/hand/", nullptr, "/hand/neuralWarp/models", "/hand/cache/neuralWarp/trainingData"},
        {"/hand", nullptr, "/handneuralWarp/models", "/handcache/neuralWarp/trainingData"},
        {"", nullptr, "neuralWarp/models", "cache/neuralWarp/trainingData"},
        {"/hand/", "HGlobal::executeCommand", "neuralWarp/models", "cache/neuralWarp/trainingData"},
        {"/hand/", "HCommandResult::getResult", "neuralWarp/models", "cache/neuralWarp/trainingData"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(std::string(row.root) + (row.fault ? row.fault : ""));
        session.newScene();
        Workspace::setRootDirectory(row.root);
        if (row.fault)
            Faults::fail(row.fault);
        create("neuralWarp", "warp");
        EXPECT_TRUE(!row.fault || Faults::fired(row.fault));
        Faults::clear();
        EXPECT_EQ(value("warp.modelRoot"), row.models);
        EXPECT_EQ(value("warp.trainingDataRoot"), row.training);
    }
}

TEST_F(NodeHooksTest, ANodeThatIsReadFromAFileKeepsWhatIsStored) {
    const struct {
        const char* models;
        const char* training;
    } rows[] = {{"here/models", ""}, {"", "here/data"}};
    for (const auto& row : rows) {
        SCOPED_TRACE(std::string(row.models) + " " + row.training);
        session.newScene();
        create("neuralWarp", "warp");
        set("warp.modelRoot", row.models);
        set("warp.trainingDataRoot", row.training);
        readBack();
        EXPECT_EQ(value("warp.modelRoot"), row.models);
        EXPECT_EQ(value("warp.trainingDataRoot"), row.training);
    }
    create("neuralWarp", "made");
    EXPECT_NE(value("made.modelRoot"), "") << "the file has been read: this one is new";
}

TEST_F(NodeHooksTest, TheArchiveGetsTheModelRootAlone) {
    const TemporaryFolder folder;
    const std::string root = folder.path().string();
    Workspace::setRootDirectory(root);
    create("neuralWarp", "warp");
    set("warp.trainingDataRoot", "training"); // a file name as well
    for (const auto& [modelRoot, resolved] :
         {std::pair("rel/models", root + "/rel/models"), {"/abs/models", "/abs/models"}}) {
        set("warp.modelRoot", modelRoot);
        EXPECT_THAT(OpenQuarn::filesToArchive(false), ElementsAre(resolved));
        EXPECT_THAT(OpenQuarn::filesToArchive(true), ElementsAre(modelRoot));
    }
    Faults::fail("HPlug::asString");
    EXPECT_THAT(OpenQuarn::filesToArchive(false), IsEmpty());
    EXPECT_TRUE(Faults::fired("HPlug::asString"));
    set("warp.modelRoot", "");
    EXPECT_THAT(OpenQuarn::filesToArchive(false), IsEmpty());
    EXPECT_THAT(OpenQuarn::filesToArchive(true), IsEmpty());
}

TEST_F(NodeHooksTest, TheModelRootIsExternalContentThatCanBeMoved) {
    const TemporaryFolder folder;
    Workspace::setRootDirectory(folder.path().string());
    std::filesystem::create_directory(folder.path() / "there");
    create("neuralWarp", "warp");
    for (const char* name : {"there", "gone"}) {
        set("warp.modelRoot", name);
        const std::vector<OpenQuarn::ExternalContent> content = OpenQuarn::externalContent();
        ASSERT_EQ(content.size(), 1U);
        const bool exists = std::string(name) == "there";
        EXPECT_EQ(content[0].node, "warp");
        EXPECT_EQ(content[0].key, "modelRoot");
        EXPECT_EQ(content[0].unresolved, name);
        EXPECT_EQ(content[0].isResolved, exists);
        EXPECT_EQ(content[0].resolved, exists ? (folder.path() / "there").string() : "");
    }
    const std::string training = value("warp.trainingDataRoot");
    EXPECT_TRUE(OpenQuarn::relocate({{"warp", "modelRoot", "/elsewhere"}}));
    EXPECT_EQ(value("warp.modelRoot"), "/elsewhere");
    EXPECT_TRUE(OpenQuarn::relocate({{"warp", "trainingDataRoot", "/elsewhere"}}));
    EXPECT_EQ(value("warp.trainingDataRoot"), training) << "it is none of the node's external content";
    EXPECT_THAT(takeMessages(), ElementsAre(::testing::HasSubstr("trainingDataRoot")));
}

} // namespace
