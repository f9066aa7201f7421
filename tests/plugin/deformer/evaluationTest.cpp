// SPDX-License-Identifier: Apache-2.0
// Which control values an evaluation takes, and when.
#include "openquarn_app/Evaluation.h"
#include "plugin/deformer/support/WarpTest.h"
#include "plugin/deformer/sweep.h"

#include <functional>

namespace {

class Evaluation : public WarpTest {};

/// A quad that a model with four controls moves in x: by the first control, the second and so on.
class FourControls : public WarpTest {
protected:
    FourControls() {
        ModelSpec spec;
        spec.controls = 4;
        spec.bias.assign(12, 0.0F);
        spec.weights.assign(48, 0.0F);
        for (std::size_t vertex = 0; vertex < 4; ++vertex)
            spec.weights[12 * vertex + 3 * vertex] = 1.0F;
        spec.deltaMode = 0;
        spec.fullCount = spec.affectCount = 4;
        writeModel(modelDirectory(), spec);
        rig.addGeometry(0, {.mesh = quad});
        rig.setModelRoot(folder.path());
    }

    HObject quad = warpRig::mesh(makeGrid(1, 1));
    warpRig::Rig rig;
};

TEST_F(FourControls, AreTakenByTheirPosition) {
    const std::vector<unsigned> indices = {7, 2, 30, 11, 12}; // made in this order
    for (const unsigned index : indices)
        ASSERT_FALSE(rig.plug("controlValues[" + std::to_string(index) + "]").setDouble(index).error());
    ASSERT_EQ(rig.deform(0), HStatus::kSuccess);
    const HPointArray before = warpRig::pointsOf(quad);
    const HPointArray after = rig.result(0);
    const std::vector<double> expectedMoves = {2, 7, 11, 12};
    for (unsigned vertex = 0; vertex < 4; ++vertex)
        EXPECT_FLOAT_EQ(static_cast<float>(after[vertex].x - before[vertex].x),
                        static_cast<float>(expectedMoves[vertex]));
}

TEST_F(FourControls, AnEnvelopeOfZeroTouchesNothing) {
    rig.setModelRoot(folder.path() / "missing");
    ASSERT_FALSE(rig.plug("envelope").setFloat(0.0F).error());
    EXPECT_EQ(rig.deform(0), HStatus::kSuccess);
    EXPECT_EQ(firstDifference(rig.result(0), warpRig::pointsOf(quad)), 4U);
    EXPECT_TRUE(rig.state(0)->modelPathDirty && rig.state(0)->indexMapDirty);
}

/// What makes evaluations leave the controls unread.
struct UnreadControls {
    const char* name;
    std::function<void(ModelSpec&)> spoil; ///< the model; none: export mode does
};

TEST_F(Evaluation, ControlsThatWereNotReadCountAtTheirNextChange) {
    ModelSpec good;
    good.weights = {0, 0, 1, 0, 0, 1, 0, 0, 1, 0, 0, 1};
    good.bias.assign(12, 0.0F);
    good.deltaMode = 0;
    good.fullCount = good.affectCount = 4;
    const HObject quad = warpRig::mesh(makeGrid(1, 1));
    for (const UnreadControls& row :
         {UnreadControls{"export mode", nullptr},
          UnreadControls{"a model of another mesh", [](ModelSpec& spec) { spec.fullCount = 5; }},
          UnreadControls{"a model that drives nothing", [](ModelSpec& spec) { spec.subsetState = "empty"; }},
          UnreadControls{"a model of who knows what", [](ModelSpec& spec) { spec.subsetState = "others"; }}}) {
        SCOPED_TRACE(row.name);
        session.newScene();
        warpRig::Rig rig;
        rig.setModelRoot(folder.path());
        rig.addGeometry(0, {.mesh = quad});
        rig.plug("export[0].smoothingIterations").setInt(0);
        HPlug control = warpRig::plug(testNodes::create("testCase", "control"), "in");
        const HPlug passedOn = warpRig::plug(testNodes::create("testCase", "passedOn"), "out");
        warpRig::connect(warpRig::plug(control.node(), "out"), warpRig::plug(passedOn.node(), "in"));
        warpRig::connect(passedOn, rig.plug("controlValues[0]"));
        const auto movedBy = [&](double value) {
            control.setDouble(value);
            return rig.result(0)[3].z - warpRig::pointsOf(quad)[3].z;
        };
        const auto change = [&](const ModelSpec& model, const char* exportMode) {
            writeModel(modelDirectory(), model);
            script(row.spoil ? "neuralWarp -reloadModel warp1"
                             : std::string("neuralWarp -exportActive ") + exportMode + " warp1");
        };
        writeModel(modelDirectory(), good);
        EXPECT_NEAR(movedBy(0.0625), 0.0625, 1e-6);
        ModelSpec spoilt = good;
        if (row.spoil)
            row.spoil(spoilt);
        change(spoilt, "on");
        OpenQuarn::makeDirty(rig.output(0)); // commands leave that to their user
        for (const double value : {0.125, 0.25, 0.375})
            EXPECT_NEAR(movedBy(value), 0.0, 1e-6);
        takeMessages();
        change(good, "off");
        movedBy(0.4375); // after one that drove nothing, a model is loaded and not yet applied
        for (const double value : {0.5, 0.625, 0.75})
            EXPECT_NEAR(movedBy(value), value, 1e-6);
    }
}

} // namespace
