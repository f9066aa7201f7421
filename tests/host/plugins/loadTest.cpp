// SPDX-License-Identifier: Apache-2.0
// Loading plug-ins from files, and unloading them: every step that can fail, and what is left behind.
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"

#include "openquarn/HFnData.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HSelectionList.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/Faults.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/Plugins.h"
#include "openquarn_app/Session.h"

#include <gmock/gmock.h>

#include <dlfcn.h>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>
#include <thread>

namespace {

namespace fs = std::filesystem;
using namespace OpenQuarn;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

const fs::path folder = PLUGIN_FOLDER;

std::string module(const std::string& name) {
    return (folder / (name + ".so")).string();
}

bool isMapped(const std::string& name) {
    void* const handle = dlopen(module(name).c_str(), RTLD_NOW | RTLD_NOLOAD);
    if (handle)
        dlclose(handle);
    return handle != nullptr;
}

bool hasType(const char* name) {
    HStatus status;
    HFnDependencyNode().create(name, "probe", &status);
    return !status.error();
}

/// An open session, and all messages that appear while it is open.
class Loading : public testing::Test {
protected:
    Loading()
        : previous_(setMessageSink([this](const Message& message) { messages_.push_back(message.text); })) {}

public:
    ~Loading() override { setMessageSink(previous_); }

protected:
    void expectNothingLeft() {
        EXPECT_THAT(loadedPlugins(), IsEmpty());
        EXPECT_EQ(session_.nodeCount(), 1U);
        EXPECT_FALSE(hasType("tinyNode"));
        EXPECT_FALSE(runCommand("tinyCommand").ok);
    }

    TemporaryFolder copies_;
    std::vector<std::string> messages_;
    Session session_;

private:
    MessageSink previous_;
};

struct FailingLoad {
    std::string path;
    const char* reason;
};

TEST_F(Loading, EveryStepThatFailsIsNamedAndLeavesNothing) {
    const fs::path text = copies_.path() / "noLibrary.so";
    std::ofstream(text) << "not a library";
    const std::vector<FailingLoad> rows = {
        {module("isNotThere"), "no such file"},
        {"", "no such file"},
        {folder.string(), "not a file"},
        {text.string(), "cannot be opened as a library"},
        {module("notAPlugin"), "no symbol 'HApiVersion'"},
        {module("tinyNoVersion"), "no symbol 'HApiVersion'"},
        {module("tinyNoInitialize"), "no symbol 'initializePlugin'"},
        {module("tinyNoUninitialize"), "no symbol 'uninitializePlugin'"},
        {module("tinyOtherMajor"), "built for version '3.0' of the H-API"},
        {module("tinyNewerMinor"), "built for version '2.1' of the H-API"},
        {module("tinyNoNumber"), "built for version 'newest?!' of the H-API"},
        {module("tinyRequiresMore"), "requires version '2.7' of the H-API"},
        {module("tinyFails"), "initializePlugin failed: out of luck"},
        {module("tinyThrows"), "initializePlugin failed: initializePlugin: out of patience"},
        {module("tinyThrowsOdd"), "an exception of an unknown type"},
        {module("tinyTwice"), "node type 'second' (0x00007001) is in the way of 'tinyNode'"},
        {module("tinyMakesNode"), "a node is left"},
    };
    for (const FailingLoad& row : rows) {
        const std::string error = failureOf([&] { loadPlugin(row.path); });
        EXPECT_THAT(error, HasSubstr("plug-in '" + row.path + "' cannot be loaded"));
        EXPECT_THAT(error, HasSubstr(row.reason));
        expectNothingLeft();
        EXPECT_FALSE(isMapped(fs::path(row.path).stem().string())) << row.path;
    }
    EXPECT_THAT(messages_, IsEmpty());
}

TEST_F(Loading, TellsWhatIsLoadedAndLoadsAgainAfterUnloading) {
    for (int round = 0; round < 3; ++round) {
        EXPECT_EQ(loadPlugin(module("tinyGood")), "tinyGood");
        EXPECT_EQ(loadPlugin(module("../modules/tinyGood")), "tinyGood"); // the same file: nothing to do
        const PluginInfo info = pluginInfo("tinyGood");
        EXPECT_EQ(info.path, fs::canonical(module("tinyGood")).string());
        EXPECT_EQ(info.vendor, "Tiny Makers");
        EXPECT_EQ(info.version, "3.1");
        EXPECT_EQ(info.apiVersion, "2.0");
        EXPECT_THAT(info.nodeTypes, ElementsAre("tinyNode"));
        EXPECT_THAT(info.dataTypes, ElementsAre("tinyNodeData"));
        EXPECT_THAT(info.commands, ElementsAre("tinyCommand"));
        EXPECT_THAT(loadedPlugins(), ElementsAre("tinyGood"));
        EXPECT_EQ(std::get<std::string>(runCommand("tinyCommand").result), "tiny");

        unloadPlugin("tinyGood");
        expectNothingLeft();
        EXPECT_FALSE(isMapped("tinyGood"));
    }
    EXPECT_THAT(failureOf([] { pluginInfo("tinyGood"); }), HasSubstr("no plug-in named 'tinyGood'"));
    EXPECT_THAT(failureOf([] { unloadPlugin("tinyGood"); }), HasSubstr("no plug-in named 'tinyGood'"));
}

TEST_F(Loading, OnlyOneOfAName) {
    const fs::path other = copies_.path() / "tinyGood.so";
    fs::copy_file(module("tinyGood"), other, fs::copy_options::overwrite_existing);
    loadPlugin(module("tinyGood"));
    EXPECT_THAT(failureOf([&] { loadPlugin(other.string()); }),
                HasSubstr("is loaded already, from " + folder.string()));
    // another name, but the same node type: the first one stays whole
    const fs::path renamed = copies_.path() / "tinyCopy.so";
    fs::copy_file(module("tinyGood"), renamed, fs::copy_options::overwrite_existing);
    EXPECT_THAT(failureOf([&] { loadPlugin(renamed.string()); }), HasSubstr("is in the way of 'tinyNode'"));
    EXPECT_TRUE(hasType("tinyNode"));
    EXPECT_TRUE(runCommand("tinyCommand").ok);
    EXPECT_EQ(loadPlugin(module("tinyOther")), "tinyOther");
    EXPECT_THAT(loadedPlugins(), ElementsAre("tinyGood", "tinyOther"));
}

TEST_F(Loading, StaysLoadedWhileNodesOrDataOfItExist) {
    loadPlugin(module("tinyGood"));
    HFnDependencyNode first;
    const HObject node = first.create("tinyNode", "kept");
    const HPlug plug = first.findPlug("value");
    HFnDependencyNode().create("tinyNode", "second");
    EXPECT_THAT(failureOf([] { unloadPlugin("tinyGood"); }),
                HasSubstr("there are still 2 nodes of type 'tinyNode', such as 'kept'"));
    EXPECT_TRUE(hasType("tinyNode"));
    session_.newScene();

    HObject data = HFnPluginData().create(HTypeId(0x7002));
    ASSERT_FALSE(data.isNull());
    EXPECT_THAT(failureOf([] { unloadPlugin("tinyGood"); }), HasSubstr("1 object of data type 'tinyNodeData'"));
    data = HObject();

    // handles on what was there are stale, and nothing else
    unloadPlugin("tinyGood");
    EXPECT_FALSE(isMapped("tinyGood"));
    EXPECT_TRUE(node.isNull());
    HStatus status;
    EXPECT_EQ(plug.asDouble(&status), 0.0);
    EXPECT_TRUE(status.error());
}

TEST(Unloading, AFailingUninitializeLeavesItLoadedUntilTheSessionEnds) {
    const std::pair<std::string, const char*> rows[] = {{"tinyStays", "not now"}, {"tinyThrowsAtEnd", "not like this"}};
    std::vector<std::string> messages;
    const MessageSink previous = setMessageSink([&](const Message& message) { messages.push_back(message.text); });
    for (const auto& [name, reason] : rows) {
        const Session session;
        loadPlugin(module(name));
        const std::string unloading = failureOf([&, plugin = name] { unloadPlugin(plugin); });
        EXPECT_THAT(unloading, HasSubstr("'" + name + "' cannot be unloaded: uninitializePlugin failed"));
        EXPECT_THAT(unloading, HasSubstr(reason));
        EXPECT_THAT(loadedPlugins(), ElementsAre(name));
        EXPECT_TRUE(runCommand("tinyCommand").ok);
    }
    setMessageSink(previous);
    EXPECT_THAT(messages, ElementsAre(HasSubstr("not now"), HasSubstr("not like this")));
    EXPECT_FALSE(isMapped("tinyStays"));
    EXPECT_FALSE(isMapped("tinyThrowsAtEnd"));
}

TEST_F(Loading, AnUnloadThatFailsHalfWayIsDoneByTheNextOne) {
    struct Row {
        const char* failing;
        const char* without; ///< empty: it is whole
    };
    const std::vector<Row> rows = {
        {"HFnPlugin::deregisterNode", ""},
        {"HFnPlugin::deregisterData", "node type 'tinyNode'"},
        {"HFnPlugin::deregisterCommand", "node type 'tinyNode', data type 'tinyNodeData'"},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.failing);
        const std::string without = row.without;
        loadPlugin(module("tinyGood"));
        Faults::fail(row.failing, 1, 2);
        for (int attempt = 0; attempt < 2; ++attempt) {
            EXPECT_THAT(failureOf([] { unloadPlugin("tinyGood"); }),
                        HasSubstr("uninitializePlugin failed, and it stays loaded" +
                                  (without.empty() ? ": " : " without " + without + ", until")));
            EXPECT_EQ(hasType("tinyNode"), without.empty());
            session_.newScene();
            const std::string loading = failureOf([] { loadPlugin(module("tinyGood")); });
            EXPECT_EQ(loading.empty(), without.empty()) << loading;
            EXPECT_THAT(loading, HasSubstr(without.empty() ? "" : "'tinyGood' is half unloaded, without " + without));
        }
        Faults::clear();
        unloadPlugin("tinyGood");
        expectNothingLeft();
        EXPECT_FALSE(isMapped("tinyGood"));
        EXPECT_THAT(messages_, IsEmpty()) << "it has taken back all of it";
    }
}

TEST_F(Loading, WhatItLeavesRegisteredIsTakenAwayWithAWarning) {
    loadPlugin(module("tinyLeaves"));
    unloadPlugin("tinyLeaves");
    EXPECT_THAT(messages_, ElementsAre("plug-in 'tinyLeaves' left registered, and the host took away: node type "
                                       "'tinyNode', data type 'tinyNodeData', command 'tinyCommand'",
                                       HasSubstr("'tinyLeaves' left 1 callbacks on nodes")));
    expectNothingLeft();
    EXPECT_FALSE(isMapped("tinyLeaves"));
    session_.setTime(12.0); // would call it
}

TEST_F(Loading, SaysSoWhenALibraryCannotGo) {
    loadPlugin(module("tinyPinned"));
    unloadPlugin("tinyPinned");
    EXPECT_THAT(messages_, ElementsAre(HasSubstr("the library of plug-in 'tinyPinned' stays mapped")));
    EXPECT_TRUE(isMapped("tinyPinned"));
    expectNothingLeft();
}

TEST(Unloading, FiftyRoundsWithThreadsAtWorkInThePlugin) {
    Session session;
    const auto threads = [] {
        return std::distance(fs::directory_iterator("/proc/self/task"), fs::directory_iterator());
    };
    std::thread([] {}).join(); // a sanitizer starts a thread of its own with the first one
    const auto before = threads();
    bool hadWorkers = false;
    for (int round = 0; round < 50; ++round) {
        loadPlugin(module("tinyWorker"));
        HFnDependencyNode node;
        ASSERT_FALSE(node.create("tinyWorker").isNull());
        node.findPlug("count").setInt(1000);
        EXPECT_EQ(node.findPlug("total").asInt(), 499500);
        hadWorkers = hadWorkers || threads() > before;
        session.newScene();
        unloadPlugin("tinyWorker");
        ASSERT_EQ(threads(), before) << "a worker may still be in the library's code, round " << round;
        ASSERT_FALSE(isMapped("tinyWorker")) << "round " << round;
    }
    EXPECT_TRUE(hadWorkers || std::thread::hardware_concurrency() == 1);
}

TEST(Unloading, TheEndOfASessionUnloadsEverything) {
    {
        const Session session;
        loadPlugin(module("tinyGood"));
        loadPlugin(module("tinyWorker"));
        HFnDependencyNode().create("tinyNode");
        HFnDependencyNode().create("tinyWorker");
    }
    EXPECT_THAT(loadedPlugins(), IsEmpty());
    EXPECT_FALSE(isMapped("tinyGood"));
    EXPECT_FALSE(isMapped("tinyWorker"));
    EXPECT_THAT(failureOf([] { loadPlugin(module("tinyGood")); }), HasSubstr("no session"));
    EXPECT_FALSE(isMapped("tinyGood"));
}

} // namespace
