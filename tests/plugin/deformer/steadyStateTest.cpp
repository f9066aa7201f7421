// SPDX-License-Identifier: Apache-2.0
// What an evaluation does again, and what it keeps from the one before.
#include "plugin/deformer/support/FailureTest.h"

#include "openquarn_app/SceneFile.h"
#include "openquarn_app/Usage.h"
#include "plugin/deformer/sweep.h"

#include <functional>

namespace {

using testing::IsEmpty;

class SteadyState : public FailureTest {
public:
    void makeRigOf(std::uint32_t deltaMode, std::uint32_t smoothing, bool isPartial) {
        writeChanged([&](ModelSpec& spec) {
            spec.deltaMode = deltaMode;
            spec.smoothingIterations = smoothing;
            if (!isPartial)
                return;
            spec.subsetState = "partial";
            spec.affectMap = {0, 1, 2, 3, 4, 5, 6, 7, 7};
            spec.shapes = {spec.bias, spec.bias};
            spec.bias = {0.5F, 2.0F};
        });
        makeRig();
    }
    void expectEvaluation() {
        EXPECT_EQ(rig->deform(0), HStatus::kSuccess);
        EXPECT_TRUE(rig->state(0)->modelApplied);
    }
    static HObject moved(double by) {
        HPointArray points = warpRig::pointsOf(unevenMesh());
        for (HPoint& p : points)
            p.z += by * p.x * p.y;
        return warpRig::withPoints(unevenMesh(), points);
    }
};

TEST_F(SteadyState, NeedsNoFileAndRebuildsNothing) {
    for (const std::uint32_t deltaMode : {0U, 1U})
        for (const std::uint32_t smoothing : {0U, 3U})
            for (const bool isPartial : {false, true}) {
                SCOPED_TRACE("mode " + std::to_string(deltaMode) + ", smoothing " + std::to_string(smoothing) +
                             (isPartial ? ", partial" : ""));
                makeRigOf(deltaMode, smoothing, isPartial);
                expectEvaluation();
                const Coordinates first = result(*rig);
                expectEvaluation(); // what was built on the way to the model's settings is released here
                takeMessages();
                const neuralWarp::neuralWarpData& state = *rig->state(0);
                const std::string flags = stateText::raised(state);
                const std::vector<std::uint32_t> versions = state.cacheVersions;
                OpenQuarn::Usage::clear();

                std::filesystem::remove_all(modelDirectory());
                for (int frame = 0; frame < 2; ++frame) {
                    expectEvaluation();
                    EXPECT_EQ(result(*rig), first);
                    EXPECT_EQ(stateText::raised(state), flags);
                    EXPECT_EQ(state.cacheVersions, versions);
                    EXPECT_THAT(takeMessages(), IsEmpty());
                }
                EXPECT_THAT(OpenQuarn::Usage::events(), IsEmpty());
            }
}

TEST_F(SteadyState, OnlyWhatACacheIsMadeOfRebuildsIt) {
    makeRigOf(1, 3, true);
    using T = SteadyState;
    struct Row {
        const char* name;
        std::function<void(T&)> edit;
        std::vector<std::uint32_t> advanced; ///< by how much each counter goes on
    };
    const std::vector<std::uint32_t> none(5);
    const auto exportSmoothed = [](int passes) {
        return [=](T& t) {
            t.rig->plug("export[0].smoothingIterations").setInt(passes);
            nodeOf(*t.rig).setExportActive(0, true);
            nodeOf(*t.rig).setExportActive(0, false);
        };
    };
    const Row rows[] = {
        {"controls", [](T& t) { t.rig->setControls({0.25}); }, none},
        {"moved input", [](T& t) { t.rig->setInput(0, moved(1.0)); }, none},
        {"envelope", [](T& t) { t.rig->plug("envelope").setFloat(0.5F); }, none},
        {"a weight", [](T& t) { t.rig->plug("weightList[0].weights[4]").setFloat(0.5F); }, none},
        {"the model off and on",
         [](T& t) {
             t.rig->plug("models[0].modelActive").setShort(0);
             t.rig->deform(0);
             t.rig->plug("models[0].modelActive").setShort(1);
         },
         none},
        {"training settings", [](T& t) { t.rig->plug("train[0].batchSize").setInt(3); }, none},
        {"export attributes", [](T& t) { t.rig->plug("export[0].deltaMode").setShort(0); }, none},
        {"the model's name", [](T& t) { t.rig->plug("models[0].modelName").setString("model"); }, {0, 0, 0, 1, 1}},
        {"another geometry's name", [](T& t) { t.rig->plug("models[3].modelName").setString("x"); }, {0, 0, 0, 1, 1}},
        {"the folder of models",
         [](T& t) {
             EXPECT_TRUE(OpenQuarn::relocate({{"warp1", "modelRoot", t.folder.path().string()}}));
         },
         {0, 0, 0, 1, 1}},
        {"a lock", [](T&) { script("setAttr -lock on warp1.modelRoot; setAttr -lock off warp1.modelRoot"); }, none},
        {"rest points", [](T& t) { t.rig->setRest(0, moved(2.0)); }, {1, 1, 1, 1, 1}},
        {"export with the same settings",
         [](T& t) {
             t.rig->plug("export[0].deltaMode").setShort(1);
             t.rig->plug("export[0].smoothingIterations").setInt(3);
             nodeOf(*t.rig).setExportActive(0, true);
             t.rig->deform(0);
             EXPECT_FALSE(t.rig->state(0)->modelApplied);
             EXPECT_EQ(result(*t.rig), coordinates(warpRig::pointsOf(moved(1.0)))) << "it is left as it came";
             nodeOf(*t.rig).setExportActive(0, false);
         },
         none},
        {"export without frames",
         [](T& t) {
             t.rig->plug("export[0].deltaMode").setShort(0);
             nodeOf(*t.rig).setExportActive(0, true);
             EXPECT_EQ(stateText::raised(*t.rig->state(0)), "topology restFrames applied export valid affectMap");
             nodeOf(*t.rig).setExportActive(0, false);
             t.rig->plug("export[0].deltaMode").setShort(1);
         },
         {1, 0, 1, 0, 0}},
        {"export with other smoothing", exportSmoothed(5), {0, 0, 1, 0, 0}},
        {"export without smoothing", exportSmoothed(0), {0, 1, 1, 0, 0}},
    };
    expectEvaluation();
    expectEvaluation();
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        const std::vector<std::uint32_t> before = rig->state(0)->cacheVersions;
        row.edit(*this);
        expectEvaluation();
        std::vector<std::uint32_t> advanced = rig->state(0)->cacheVersions;
        for (std::size_t i = 0; i < advanced.size(); ++i)
            advanced[i] -= before[i];
        EXPECT_EQ(advanced, row.advanced);
        const Coordinates kept = result(*rig);
        rig->state(0)->workspace = {};
        expectEvaluation();
        EXPECT_EQ(result(*rig), kept) << "by tables of before";
    }
    takeMessages();
}

TEST(CacheVersions, NeverComeBackToNever) {
    const std::pair<std::uint32_t, std::uint32_t> rows[] = {
        {0xFFFFFFFF, 0}, {0, 1}, {0xFFFFFFFD, 0xFFFFFFFE}, {0xFFFFFFFE, 0}};
    for (auto [version, next] : rows) {
        neuralWarp::neuralWarpData::bumpVersion(version);
        EXPECT_EQ(version, next);
    }
}

} // namespace
