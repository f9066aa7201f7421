// SPDX-License-Identifier: Apache-2.0
// Several scenes in one session.
#include "host/files/FileTest.h"

#include "openquarn/HFileObject.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HNodeMessage.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Scene.h"

#include <filesystem>
#include <fstream>
#include <memory>
#include <optional>
#include <stdexcept>
#include <thread>

namespace {

namespace fs = std::filesystem;
using OpenQuarn::Scene;
using testing::ElementsAre;
using testing::HasSubstr;

HPlug plugOf(const HObject& node, const char* attribute) {
    return HFnDependencyNode(node).findPlug(attribute);
}

class Scenes : public FileTest {
protected:
    /// A scene of its own with a node "thing" that holds this number, at frame `number`.
    struct Own {
        explicit Own(OpenQuarn::Session& session, double number) {
            const Scene::Current current(scene);
            node = testNodes::create("fileNode", "thing");
            real = plugOf(node, "real");
            real.setDouble(number);
            session.setTime(number);
        }
        Scene scene;
        HObject node;
        HPlug real;
    };
    /// Names of all nodes of the current scene.
    std::vector<std::string> names() const {
        std::vector<std::string> all;
        for (const HObject& node : session.nodes())
            all.emplace_back(HFnDependencyNode(node).name().asChar());
        return all;
    }
    std::string valueOfThing() const {
        const OpenQuarn::CommandOutcome outcome = OpenQuarn::runCommand("getAttr thing.real");
        return outcome ? OpenQuarn::printedValue(outcome.result) : outcome.error;
    }
};

TEST_F(Scenes, HaveNodesTimeAndNamesOfTheirOwn) {
    Own first(session, 2.0);
    Own second(session, 5.0);
    EXPECT_THAT(names(), ElementsAre("time1")) << "the session's own scene";
    EXPECT_EQ(session.time(), 1.0);
    {
        const Scene::Current outer(first.scene);
        EXPECT_EQ(valueOfThing(), "2");
        {
            const Scene::Current inner(second.scene);
            EXPECT_THAT(names(), ElementsAre("time1", "thing"));
            EXPECT_EQ(valueOfThing(), "5");
            EXPECT_EQ(session.time(), 5.0);
            session.newScene();
            EXPECT_TRUE(second.node.isNull());
        }
        EXPECT_EQ(valueOfThing(), "2");
        EXPECT_EQ(session.time(), 2.0);
    }
    EXPECT_THAT(valueOfThing(), HasSubstr("thing"));
    EXPECT_EQ(first.real.asDouble(), 2.0);
}

TEST_F(Scenes, LeaveNothingOfOneThatHasGone) {
    HPlug real;
    HObject node;
    {
        const Own own(session, 3.0);
        real = own.real;
        node = own.node;
    }
    HStatus status;
    EXPECT_EQ(real.asDouble(&status), 0.0);
    EXPECT_TRUE(status.error());
    EXPECT_TRUE(node.isNull());
    EXPECT_TRUE(real.setDouble(1.0).error());
}

TEST_F(Scenes, HaveAFileAndAFolderOfTheirOwn) {
    const fs::path root = fs::path(testing::TempDir()) / "scenes";
    std::vector<std::unique_ptr<Own>> scenes;
    for (const char* name : {"one", "two"}) {
        fs::create_directories(root / name);
        std::ofstream(root / name / "map.txt") << name;
        scenes.push_back(std::make_unique<Own>(session, 1.0));
        const Scene::Current current(scenes.back()->scene);
        ASSERT_TRUE(OpenQuarn::saveScene(root / name / "scene.json"));
    }
    HFileObject map;
    map.setRawFullName("map.txt");
    for (const auto& [scene, name] : {std::pair(scenes[0].get(), "one"), std::pair(scenes[1].get(), "two")}) {
        const Scene::Current current(scene->scene);
        EXPECT_EQ(OpenQuarn::currentFile(), root / name / "scene.json");
        EXPECT_EQ(map.resolvedFullName().asStdString(), root / name / "map.txt");
    }
    EXPECT_EQ(OpenQuarn::currentFile(), "");

    std::vector<fs::path> told;
    OpenQuarn::setSceneFolderSink([&](const fs::path& folder) { told.push_back(folder); });
    { const Scene::Current current(scenes[1]->scene); }
    OpenQuarn::setSceneFolderSink({});
    EXPECT_THAT(told, ElementsAre(root / "two", ""));
}

void count(int, HPlug&, HPlug&, void* counter) {
    ++*static_cast<int*>(counter);
}

TEST_F(Scenes, TellCallbacksApart) {
    Own first(session, 1.0);
    Own second(session, 1.0);
    int firstCalls = 0;
    int secondCalls = 0;
    const HCallbackId one = HNodeMessage::addAttributeChangedCallback(first.node, count, &firstCalls);
    const HCallbackId two = HNodeMessage::addAttributeChangedCallback(second.node, count, &secondCalls);
    EXPECT_NE(one, two);
    EXPECT_FALSE(HMessage::removeCallback(one).error()) << "although neither scene is current";
    EXPECT_TRUE(HMessage::removeCallback(one).error());
    first.real.setDouble(2.0);
    second.real.setDouble(2.0);
    EXPECT_EQ(firstCalls, 0);
    EXPECT_EQ(secondCalls, 1);
}

TEST_F(Scenes, KeepAPlugInThatAnyOfThemUses) {
    const auto unload = [] {
        try {
            OpenQuarn::unloadPlugin("fileNodes");
        } catch (const std::runtime_error& error) {
            return std::string(error.what());
        }
        return std::string();
    };
    std::optional<Own> own(std::in_place, session, 1.0);
    EXPECT_THAT(unload(), HasSubstr("1 node of type 'fileNode', such as 'thing'"));
    own.reset();
    EXPECT_EQ(unload(), "");
}

TEST_F(Scenes, AreUsedFromAnyThreadThatMakesThemCurrent) {
    Own own(session, 1.0);
    std::thread([&] {
        const Scene::Current current(own.scene);
        EXPECT_FALSE(own.real.setDouble(4.0).error());
        EXPECT_EQ(valueOfThing(), "4");
    }).join();
    EXPECT_FALSE(own.real.setDouble(2.0).error()) << "this is the main thread again";
}

TEST(ScenesWithoutSession, AreEmptiedWithItAndMadeCurrentNoMore) {
    EXPECT_THROW(Scene(), std::runtime_error);
    std::optional<Scene> left;
    HObject node;
    {
        const OpenQuarn::Session session;
        left.emplace();
        const Scene::Current current(*left);
        node = HFnDependencyNode().create("mesh");
        EXPECT_FALSE(node.isNull());
    }
    EXPECT_TRUE(node.isNull());
    EXPECT_THROW(Scene::Current{*left}, std::runtime_error);
}

} // namespace
