// SPDX-License-Identifier: Apache-2.0
// What is said of a scene: its deformers, what they affect, and what is missing of it.
#include "quarn/info/SceneReport.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/Plugins.h"
#include "openquarn_app/Session.h"
#include "plugin/deformer/support/warpRig.h"
#include "quarn/info/LineList.h"
#include "quarn/info/SceneFilesReport.h"
#include "rig/registration.h"
#include "support/TemporaryFolder.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <rapidjson/document.h>

#include <fstream>

namespace {

using namespace quarn;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

class SceneReports : public ::testing::Test {
public:
    ~SceneReports() override { OpenQuarn::setMessageSink({}); }

protected:
    SceneReports() {
        OpenQuarn::setMessageSink([](const OpenQuarn::Message&) {});
        warpRig::registerPlugin();
        OpenQuarn::addPlugin("quarnRig", rig::registerNodes, rig::deregisterNodes);
        rig_.emplace();
        rig_->setModelRoot(root());
        rig_->setControls({0.5, 1.0});
        for (const auto& [index, isOn] : {std::pair{0U, true}, {2U, false}, {5U, false}})
            rig_->addGeometry(index, {.mesh = warpRig::mesh(makeGrid(2, 3)), .modelOn = isOn});
        rig_->plug("input[0].componentTagExpression").setString("*");
        rig_->plug("models[5].modelName").setString("");
    }
    std::filesystem::path root() const { return folder_.path() / "models"; }
    HPlug tag(unsigned index) { return rig_->plug("input[" + std::to_string(index) + "].componentTagExpression"); }

    OpenQuarn::Session session_;
    TemporaryFolder folder_;
    std::optional<warpRig::Rig> rig_;
};

TEST_F(SceneReports, CountWhatEachGeometryIs) {
    rig_->addGeometry(7, {.mesh = warpRig::mesh(makeGrid(2, 3)), .affected = std::vector{4U, 0U, 9U}});
    std::filesystem::create_directories(root() / "model.nwrp");
    const std::vector<DeformedGeometry> all = describeScene().deformers.at(0).geometries;
    ASSERT_EQ(all.size(), 4U);
    EXPECT_EQ(all[0].facts.affected.size(), 12U) << "a star is no tag but everything";
    EXPECT_EQ(all[1].facts.affected.size(), 12U);
    EXPECT_THAT(all[3].facts.affected, ElementsAre(4, 0, 9)) << "in their order";
    tag(2).setString("nothing");
    EXPECT_THROW(describeScene(), std::runtime_error);
    tag(2).setString("");

    const std::string text = sceneText(describeScene());
    for (const char* line : {"deformer warp1, frames 1 to 1000\n",
                             "geometry 0 (warp1in0): 12 vertices, 12 affected, 2 controls, model model On\n",
                             "geometry 2 (warp1in2): 12 vertices, 12 affected, 2 controls, model model Off\n",
                             "geometry 5 (warp1in5): 12 vertices, 12 affected, 2 controls, no model\n",
                             "12 vertices, 3 affected, 2 controls"})
        EXPECT_THAT(text, HasSubstr(line));

    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writeScene(writer, describeScene());
    writer.EndObject();
    rapidjson::Document json;
    ASSERT_FALSE(json.Parse(buffer.GetString()).HasParseError());
    const auto& part = json["deformers"][0]["geometries"][3];
    const struct {
        const char* key;
        int count;
    } rows[] = {{"index", 7}, {"vertices", 12}, {"affected", 3}, {"controls", 2}};
    for (const auto& row : rows)
        EXPECT_EQ(part[row.key].GetInt(), row.count) << row.key;
    EXPECT_STREQ(part["modelDirectory"].GetString(), (root() / "model.nwrp").c_str());
    EXPECT_TRUE(part["modelActive"].GetBool() && part["modelThere"].GetBool());
    EXPECT_FALSE(json["deformers"][0]["geometries"][1]["modelActive"].GetBool());
}

// the folder of the models is missed as soon as one model is on; a pattern stands for files that may be any
TEST_F(SceneReports, MissWhatIsNeeded) {
    const std::string models = "warp1: " + root().string();
    EXPECT_THAT(describeScene().missingFiles, ElementsAre(models));
    rig_->plug("models[0].modelActive").setShort(0);
    EXPECT_THAT(describeScene().missingFiles, IsEmpty());
    HFnDependencyNode character;
    character.create("character", "arm");
    character.findPlug("vertexMapFile").setString("maps/{mesh}.npy");
    EXPECT_THAT(describeScene().missingFiles, IsEmpty());
    character.findPlug("sourceFile").setString("/none/arm.glb");
    EXPECT_THAT(describeScene().missingFiles, ElementsAre("arm: /none/arm.glb"));
    EXPECT_THAT(sceneText(describeScene()), HasSubstr("character arm, 1 metres a unit\n"));
    EXPECT_THAT(sceneText(describeScene()), HasSubstr("missing file of arm: /none/arm.glb\n"));
    std::filesystem::create_directories(root());
    rig_->plug("models[0].modelActive").setShort(1);
    EXPECT_THAT(describeScene().missingFiles, ElementsAre("arm: /none/arm.glb"));
}

TEST(LineLists, KeepTwentyLinesAndCountTheRest) {
    LineList lines("things");
    std::string expected;
    for (int i = 1; i <= 20; ++i) {
        lines.add(std::to_string(i));
        expected += std::to_string(i) + "\n";
    }
    EXPECT_EQ(lines.text(), expected);
    lines.add("21");
    EXPECT_EQ(lines.text(), expected + "... and 1 more things\n");
    LineList one("things");
    one.add(std::string(1000, 'a'));
    one.add(std::string(1001, 'b'));
    EXPECT_EQ(one.text(), std::string(1000, 'a') + "\n" + std::string(1000, 'b') + "...\n");
}

// what a farm takes along: the scene first, each file once, and the files of the models that are on
TEST_F(SceneReports, NameEachFileThatTheFramesNeed) {
    const std::filesystem::path scene = folder_.path() / "scene.json", model = root() / "model.nwrp";
    const std::filesystem::path cache = folder_.path() / "cache.npy";
    for (const char* node : {"one", "two"})
        ASSERT_TRUE(OpenQuarn::runScript(std::string("createNode pointCache -name ") + node + "; setAttr " + node +
                                             ".cacheFile " + cache.string() + "; createNode character -name of" + node +
                                             "; setAttr of" + node + ".sourceFile gone.fbx",
                                         "files"));
    SceneFilesReport report = describeFiles(scene, "");
    EXPECT_THAT(report.files, ElementsAre(scene, cache, model)) << "nothing is made of the character's file";
    EXPECT_THAT(report.missing, ElementsAre(cache, model));
    std::filesystem::create_directories(model);
    for (const std::filesystem::path& file : {cache, model / "model.onnx", model / "metadata.json"})
        std::ofstream(file) << "a";
    report = describeFiles(scene, "warp1");
    EXPECT_THAT(report.files, ElementsAre(scene, cache, model / "metadata.json", model / "model.onnx"));
    EXPECT_THAT(report.missing, IsEmpty());
    EXPECT_EQ(report.frames, "1-1000");
    rapidjson::Document json;
    ASSERT_FALSE(json.Parse(filesJson(report).c_str()).HasParseError());
    EXPECT_EQ(json["geometries"].Size(), 3U);
    EXPECT_STREQ(json["geometries"][1].GetString(), "warp1in2");

    rig_->plug("models[0].modelActive").setBool(false);
    rig_->plug("exportStartFrame").setInt(1001);
    EXPECT_THAT(filesJson(describeFiles(scene, "")), HasSubstr("\"frames\": null"));
    EXPECT_THAT(describeFiles(scene, "").files, ElementsAre(scene, cache));
    EXPECT_THROW(describeFiles(scene, "warp2"), std::runtime_error);
}

} // namespace
