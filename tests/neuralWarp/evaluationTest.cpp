// SPDX-License-Identifier: Apache-2.0
// Whole evaluations, from a model directory to moved points.
#include "neuralWarp/support/WarpTest.h"

namespace {

class Evaluation : public WarpTest {};

TEST_F(Evaluation, OffsetModeAddsTheNetworksOutputs) {
    ModelSpec spec;
    spec.controls = 2;
    spec.bias = {0, 0, 0.5F, 0, 0, 0, 0, 0, 0, 0.25F, 0, 0};
    spec.weights.assign(24, 0.0F);
    spec.weights[1] = 2.0F; // first control: y of vertex 0
    spec.deltaMode = 0;
    spec.fullCount = spec.affectCount = 4;
    writeModel(modelDirectory(), spec);

    warpRig::Rig rig;
    const HObject quad = warpRig::mesh(makeGrid(1, 1));
    rig.addGeometry(0, {.mesh = quad});
    rig.setModelRoot(folder.path());
    rig.setControls({0.5, 0.0});
    ASSERT_EQ(rig.deform(0), HStatus::kSuccess);
    const HPointArray before = warpRig::pointsOf(quad);
    const HPointArray after = rig.result(0);
    EXPECT_NEAR(after[0].z - before[0].z, 0.5, 1e-6);
    EXPECT_NEAR(after[0].y - before[0].y, 1.0, 1e-6);
    EXPECT_NEAR(after[3].x - before[3].x, 0.25, 1e-6);
    EXPECT_TRUE(rig.state(0)->modelApplied);
}

} // namespace
