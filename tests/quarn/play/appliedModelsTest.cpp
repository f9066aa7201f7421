// SPDX-License-Identifier: Apache-2.0
// Which models are looked at before a mesh is delivered, and what is refused.
#include "quarn/scene/AppliedModels.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/Session.h"
#include "plugin/deformer/support/modelFolder.h"
#include "plugin/deformer/support/warpRig.h"
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>

namespace {

using quarn::AppliedModels;
using ::testing::ContainsRegex;
using warpRig::Rig;

class Applied : public ::testing::Test {
protected:
    Applied() {
        OpenQuarn::setMessageSink([](const OpenQuarn::Message&) {});
        warpRig::registerPlugin();
        writeModel(path("good"), spec());
        rig_.emplace();
        rig_->addGeometry(0, {.mesh = grid_, .modelName = "good"});
        rig_->setModelRoot(folder_.path());
        rig_->setControls({0.5});
    }
    ~Applied() override { OpenQuarn::setMessageSink({}); }

    std::filesystem::path path(const std::string& model) const { return folder_.path() / (model + ".nwrp"); }
    ModelSpec spec() const {
        ModelSpec spec;
        spec.bias.assign(3 * std::size_t{vertices_}, 0.5F);
        spec.fullCount = spec.affectCount = vertices_;
        return spec;
    }
    void useDamaged() {
        ModelSpec damaged = spec();
        damaged.deltaMode = 7;
        writeModel(path("damaged"), damaged);
        rig_->plug("models[0].modelName").setString("damaged");
    }
    // what the meshes are refused for, in two frames; "" when they are not
    static std::string refusal(
        const std::vector<HPlug>& meshes, const std::function<void()>& nextFrame = [] {}) {
        AppliedModels models(meshes);
        return failureOf([&] {
            for (const HPlug& mesh : meshes)
                OpenQuarn::evaluate(mesh);
            models.requireSound();
            nextFrame();
            models.requireSound();
        });
    }
    std::string refusal() const { return refusal({rig_->output(0)}); }

    OpenQuarn::Session session_;
    TemporaryFolder folder_;
    const HObject grid_ = warpRig::mesh(makeGrid(2, 3));
    const unsigned vertices_ = warpRig::pointsOf(grid_).length();
    std::optional<Rig> rig_;
};

TEST_F(Applied, DamageIsRefusedByName) {
    EXPECT_EQ(refusal(), "");
    struct Row {
        std::function<void()> damage;
        const char* expected;
    };
    ModelSpec strange = spec();
    strange.subsetState = "Complete";
    ModelSpec beyond = spec();
    beyond.subsetState = "partial";
    beyond.affectMap = {0, vertices_};
    const Row rows[] = {
        {[&] { useDamaged(); }, "^warp1 cannot apply the model .*/damaged.nwrp: .* the deltaMode 7:"},
        {[&] { writeModel(path("damaged"), strange); }, "no subsetState that is known"},
        {[&] { writeModel(path("damaged"), beyond); }, "drives vertex 12, and its mesh has 12"},
        {[&] { std::filesystem::remove(path("damaged") / "metadata.json"); }, "metadata.json is missing"},
        {[&] {
             writeModel(path("damaged"), spec());
             writeFile(path("damaged") / "principal_shapes.json", R"({"principalShapeCount": 2, "vertCount": 1})");
         },
         "principal_shapes.json is damaged"},
        {[&] {
             rig_->plug("models[0].modelName").setString("good");
             rig_->setRest(0, warpRig::mesh(makeGrid(3, 3)));
         },
         "model to warp1in0, which has 12 vertices: its rest mesh warp1rest0.outMesh has 16|originalGeometry.* has 16"},
    };
    for (const Row& row : rows) {
        row.damage();
        EXPECT_THAT(refusal(), ContainsRegex(row.expected));
    }
}

TEST_F(Applied, WhatIsNotAppliedIsNotRefused) {
    useDamaged();
    EXPECT_NE(refusal(), "");
    EXPECT_EQ(refusal({HPlug(), rig_->plug("input[0].inputGeometry").source()}), "") << "above the deformer";
    HPlug active = rig_->plug("models[0].modelActive");
    HPlug envelope = rig_->plug("envelope");
    active.setShort(0);
    EXPECT_EQ(refusal(), "");
    active.setShort(1);
    envelope.setFloat(0);
    EXPECT_EQ(refusal(), "");
    envelope.setFloat(1);
    rig_->setMorphTarget(0, grid_);
    rig_->plug("targetMorphEnabled").setBool(true);
    EXPECT_EQ(refusal(), "");
    rig_->plug("targetMorphEnvelope").setDouble(0.5);
    EXPECT_NE(refusal(), "");
}

TEST_F(Applied, ModelsComeIntoForceLaterAndFurtherUp) {
    useDamaged();
    Rig below("below");
    below.addGeometry(0, {.mesh = grid_, .modelName = "good", .modelOn = false});
    below.addGeometry(1, {.mesh = grid_, .modelName = "good", .modelOn = false});
    EXPECT_EQ(refusal({below.output(0), below.output(1)}), "");
    const HPlug input = below.plug("input[0].inputGeometry");
    warpRig::disconnect(input.source(), input);
    warpRig::connect(rig_->output(0), input);
    EXPECT_THAT(refusal({below.output(0)}), ContainsRegex("^warp1 cannot apply"));
    EXPECT_EQ(refusal({below.output(1)}), "") << "another geometry of the same deformer";

    const Rig other("other"); // its envelope stands for any animated value
    other.plug("envelope").setFloat(0);
    warpRig::connect(other.plug("envelope"), rig_->plug("envelope"));
    EXPECT_EQ(refusal(), "");
    EXPECT_NE(refusal({rig_->output(0)}, [&] { other.plug("envelope").setFloat(1); }), "");
}

} // namespace
