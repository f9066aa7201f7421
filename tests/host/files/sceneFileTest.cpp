// SPDX-License-Identifier: Apache-2.0
// Files on the disk, and the files that a scene needs.
#include "fuzz/sceneTarget.h"
#include "host/files/FileTest.h"
#include "support/TemporaryFolder.h"
#include "support/seedCorpus.h"

#include "openquarn/HFileIO.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Workspace.h"

#include <csignal>
#include <fstream>
#include <sstream>

#include <sys/resource.h>

namespace {

using namespace fileNodes;
using OpenQuarn::FileOutcome;
using OpenQuarn::openScene;
using OpenQuarn::saveScene;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Pair;
using testNodes::plug;

std::string contentOf(const std::filesystem::path& path) {
    std::ifstream file(path, std::ios::binary);
    std::ostringstream text;
    text << file.rdbuf();
    return text.str();
}

void write(const std::filesystem::path& path, const std::string& text) {
    std::ofstream(path, std::ios::binary) << text;
}

class SceneFile : public FileTest {
protected:
    /// Names of everything in the folder, sorted.
    std::vector<std::string> listing() const {
        std::vector<std::string> names;
        for (const auto& entry : std::filesystem::directory_iterator(folder_.path()))
            names.push_back(entry.path().filename());
        std::sort(names.begin(), names.end());
        return names;
    }
    std::filesystem::path path(const char* name) const { return folder_.path() / name; }

    /// Saves, and expects that it fails with a message that names the file.
    void expectUnsaved(const std::filesystem::path& to) {
        const std::string before = OpenQuarn::currentFile();
        const FileOutcome outcome = saveScene(to);
        EXPECT_FALSE(outcome);
        EXPECT_THAT(outcome.error, ::testing::StartsWith(to.string() + ": "));
        EXPECT_EQ(OpenQuarn::currentFile(), before);
    }

    TemporaryFolder folder_;
};

TEST_F(SceneFile, SavingAndOpeningMakeItTheCurrentFileAndANewSceneHasNone) {
    create("one");
    EXPECT_EQ(OpenQuarn::currentFile(), "");
    ASSERT_TRUE(saveScene(path("a.scene")));
    EXPECT_EQ(HFileIO::currentFile(), path("a.scene").string());
    ASSERT_TRUE(saveScene(path("b.scene")));
    EXPECT_EQ(contentOf(path("a.scene")), contentOf(path("b.scene")));
    ASSERT_TRUE(openScene(path("a.scene")));
    EXPECT_EQ(OpenQuarn::currentFile(), path("a.scene"));
    EXPECT_EQ(session.nodeCount(), 2U);
    EXPECT_EQ(HFileIO::currentlyReadingFileVersion(), -1);
    EXPECT_EQ(saved(), contentOf(path("b.scene")));
    session.newScene();
    EXPECT_EQ(OpenQuarn::currentFile(), "");
    EXPECT_THAT(listing(), ElementsAre("a.scene", "b.scene"));
}

TEST_F(SceneFile, WhatCannotBeOpenedLeavesTheSceneAndItsFile) {
    create("one");
    ASSERT_TRUE(saveScene(path("good.scene")));
    write(path("bad.scene"), "{\"openquarnScene\":1,");
    const std::pair<std::filesystem::path, const char*> rows[] = {
        {path("bad.scene"), "line 1, column 21"},
        {path("none.scene"), "does not exist"},
        {folder_.path(), "is no regular file"},
        {"/dev/null", "is no regular file"},
        {"", "does not exist"},
    };
    const std::string before = saved();
    for (const auto& [file, error] : rows) {
        const FileOutcome outcome = openScene(file);
        EXPECT_FALSE(outcome);
        EXPECT_THAT(outcome.error, ::testing::StartsWith(file.string() + ": "));
        EXPECT_THAT(outcome.error, HasSubstr(error));
        EXPECT_EQ(saved(), before);
        EXPECT_EQ(OpenQuarn::currentFile(), path("good.scene"));
    }
}

TEST_F(SceneFile, ASaveThatFailsLeavesTheOldFileAndNothingBesideIt) {
    create("one");
    ASSERT_TRUE(saveScene(path("old.scene")));
    const std::string old = contentOf(path("old.scene"));
    for (int i = 0; i < 100; ++i)
        create("more" + std::to_string(i));

    expectUnsaved(path("old.scene") / "x.scene");
    expectUnsaved(""); // the folder itself
    std::filesystem::create_directory(path("taken.scene"));
    expectUnsaved(path("taken.scene"));

    // the disk takes no more than the first bytes
    struct rlimit limit = {};
    getrlimit(RLIMIT_FSIZE, &limit);
    const struct rlimit few = {1000, limit.rlim_max};
    const auto handler = std::signal(SIGXFSZ, SIG_IGN);
    setrlimit(RLIMIT_FSIZE, &few);
    expectUnsaved(path("old.scene"));
    setrlimit(RLIMIT_FSIZE, &limit);
    std::signal(SIGXFSZ, handler);

    EXPECT_EQ(contentOf(path("old.scene")), old);
    EXPECT_THAT(listing(), ElementsAre("old.scene", "taken.scene"));
}

TEST_F(SceneFile, TheSummaryTellsWhatIsInIt) {
    session.setTime(7.5);
    write(path("a.scene"), R"({"openquarnScene":3,"writtenBy":"me","time":2.5,"plugins":["p",5],"nodes":[
        {"name":"time1","type":"time"},{"name":"a","type":"fileNode"},{"name":"b","type":"fileNode"},{"type":"gone"},7],
        "connections":[["a.out","b.real"]]})");
    const OpenQuarn::SceneSummary summary = OpenQuarn::readSummary(path("a.scene"));
    EXPECT_TRUE(summary.outcome);
    EXPECT_EQ(summary.version, 3);
    EXPECT_EQ(summary.writtenBy, "me");
    EXPECT_EQ(summary.time, 2.5);
    EXPECT_EQ(summary.bytes, std::filesystem::file_size(path("a.scene")));
    EXPECT_EQ(summary.nodes, 5U);
    EXPECT_EQ(summary.connections, 1U);
    EXPECT_THAT(summary.plugins, ElementsAre("p"));
    EXPECT_THAT(summary.nodesByType,
                ElementsAre(Pair("", 1U), Pair("fileNode", 2U), Pair("gone", 1U), Pair("time", 1U)));
    EXPECT_THAT(summary.missingTypes, ElementsAre("", "gone"));
    EXPECT_EQ(session.time(), 7.5);
    EXPECT_FALSE(OpenQuarn::readSummary(path("none")).outcome);
}

TEST_F(SceneFile, NodesNameTheFilesTheyNeedAndTakeNewPlaces) {
    const std::string here = path("here.txt");
    write(here, "x");
    for (const char* name : {"one", "two", "three"})
        create(name);
    plug("one.path").setString(here);
    plug("two.path").setString(path("folder/../missing.txt").string());
    plug("three.path").setString(here);
    EXPECT_THAT(OpenQuarn::filesToArchive(true), ElementsAre(here, path("folder/../missing.txt")));
    EXPECT_EQ(OpenQuarn::filesToArchive().front(), here);

    const std::vector<OpenQuarn::ExternalContent> content = OpenQuarn::externalContent();
    ASSERT_EQ(content.size(), 3U);
    EXPECT_EQ(content[0].node + "." + content[0].key, "one.path");
    EXPECT_TRUE(content[0].isResolved);
    EXPECT_EQ(content[0].resolved, here);
    EXPECT_FALSE(content[1].isResolved);
    EXPECT_EQ(content[1].unresolved, path("folder/../missing.txt"));

    const FileOutcome outcome = OpenQuarn::relocate(
        {{"two", "path", here}, {"none", "path", "x"}, {"one", "colour", "x"}, {"two", "path", "y"}});
    EXPECT_TRUE(outcome);
    EXPECT_THAT(outcome.warnings,
                ElementsAre(HasSubstr("no node named 'none'"), HasSubstr("node 'one': "), HasSubstr("node 'two': ")));
    EXPECT_EQ(takeMessages(), outcome.warnings);
    EXPECT_EQ(plug("two.path").asString(), here.c_str());
}

TEST_F(SceneFile, ASceneSavedInAnotherFolderStillFindsWhatIsThere) {
    for (const char* folder : {"old/files", "new", "ma$HOME"})
        std::filesystem::create_directories(path(folder));
    write(path("old/files/a"), "x");
    write(path("new/b"), "x");
    write(path("ma$HOME/c"), "x");
    const std::string absolute = path("new/b");
    const struct {
        const char* text;
        std::string named; // in the folder "new"
        const char* warning;
    } rows[] = {
        {"files/a", path("old/files/a"), ""},
        {"./files/../files", path("old/files"), ""},
        {"../new/b", "b", ""},
        {"files/none", "files/none", ""},
        {"files/*", path("old/files/*"), ""}, // a pattern, of a folder that is there
        {"nowhere/*", "nowhere/*", ""},
        {absolute.c_str(), absolute, ""},
        {"~/x", "~/x", ""},
        {"", "", ""},
        {"../ma$HOME/c", "../ma$HOME/c", "$ begins a variable"},
    };
    std::vector<std::string> folders;
    OpenQuarn::setSceneFolderSink([&](const std::filesystem::path& folder) { folders.push_back(folder.filename()); });
    create("one");
    for (const auto& row : rows) {
        SCOPED_TRACE(row.text);
        ASSERT_TRUE(saveScene(path("old/s.json")));
        plug("one.path").setString(row.text);
        expectUnsaved(path("new") / std::string(300, 'x'));
        EXPECT_EQ(plug("one.path").asString(), row.text) << "a save that fails changes nothing";
        takeMessages();
        const FileOutcome outcome = saveScene(path("new/s.json"));
        EXPECT_TRUE(outcome) << outcome.error;
        EXPECT_EQ(plug("one.path").asString().asStdString(), row.named);
        ASSERT_EQ(outcome.warnings.size(), *row.warning ? 1U : 0U);
        if (*row.warning) {
            EXPECT_THAT(outcome.warnings.front(), HasSubstr(row.warning));
        }
        takeMessages();
        EXPECT_EQ(folders.back(), "new");
        plug("one.path").setString("");
    }
    ASSERT_TRUE(saveScene(path("old/s.json")));
    plug("one.path").setString("files/a");
    plug("one.path").setLocked(true);
    EXPECT_THAT(saveScene(path("new/s.json")).warnings, ElementsAre(HasSubstr("one.path is locked or connected")));
    takeMessages();
    session.newScene();
    EXPECT_EQ(folders.back(), "");
    OpenQuarn::setSceneFolderSink({});
}

// the one rule: arguments count from the caller's folder, texts of the scene from the scene's, and from the caller's
// while there is none
TEST_F(SceneFile, PathsCountFromTheCallersFolderOrTheScenes) {
    for (const char* file : {"callers/both", "callers/mine", "callers/s/both", "callers/s/its"}) {
        std::filesystem::create_directories(path(file).parent_path());
        write(path(file), "x");
    }
    OpenQuarn::Workspace::setCallersFolder(path("callers"));
    create("one");
    const auto found = [](const char* text) {
        plug("one.path").setString(text);
        return OpenQuarn::externalContent().front().resolved;
    };
    EXPECT_EQ(found("both"), path("callers/both"));
    EXPECT_EQ(found("its"), "");
    plug("one.path").setString("");
    ASSERT_TRUE(saveScene("s/a.json"));
    EXPECT_EQ(OpenQuarn::currentFile(), "s/a.json");
    EXPECT_EQ(found("both"), path("callers/s/both"));
    EXPECT_EQ(found("its"), path("callers/s/its"));
    EXPECT_EQ(found("mine"), "");
    EXPECT_TRUE(openScene("s/a.json"));
    EXPECT_TRUE(OpenQuarn::readSummary("s/a.json").outcome);
    EXPECT_FALSE(openScene("a.json"));
    EXPECT_EQ(OpenQuarn::Workspace::rootDirectory(), path("callers").string() + "/");
    EXPECT_TRUE(OpenQuarn::runCommand("workspace -openWorkspace s"));
    EXPECT_EQ(OpenQuarn::Workspace::rootDirectory(), path("callers/s").string() + "/");
    OpenQuarn::Workspace::resetRootDirectory();
    OpenQuarn::Workspace::setCallersFolder({});
}

TEST_F(SceneFile, ANodeThatThrowsIsNamedAndTheOthersAreAsked) {
    create("one");
    throwing = true;
    EXPECT_THAT(OpenQuarn::filesToArchive(), IsEmpty());
    EXPECT_THAT(OpenQuarn::externalContent(), IsEmpty());
    EXPECT_THAT(takeMessages(), ElementsAre(HasSubstr("one: "), HasSubstr("one: ")));
}

TEST(SceneSeeds, AreAcceptedOrRefusedAsNamed) {
    EXPECT_GE(runSeedCorpus("fuzz_scene", fuzzScene), 4);
}

TEST(SceneFiles, WithoutASessionAreAnError) {
    const OpenQuarn::MessageSink previous = OpenQuarn::setMessageSink([](const OpenQuarn::Message&) {});
    EXPECT_THAT(OpenQuarn::sceneFromText(R"({"openquarnScene":1})", "file").error, HasSubstr("there is no scene"));
    EXPECT_FALSE(saveScene("x.scene"));
    EXPECT_FALSE(OpenQuarn::relocate({}));
    EXPECT_THAT(OpenQuarn::filesToArchive(), IsEmpty());
    OpenQuarn::setMessageSink(previous);
}

} // namespace
