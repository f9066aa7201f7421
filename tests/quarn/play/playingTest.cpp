// SPDX-License-Identifier: Apache-2.0
// Meshes that move as a row says, played: what is timed, compared, written and recorded.
#include "Movers.h"

#include "quarn/scene/Warp.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>

#include <cmath>

namespace {

using namespace movers;
using ::testing::ElementsAre;
using ::testing::Key;

using Playing = Scene;

const Motion still = [](int) { return std::vector{0.0, 1.0, 2.0}; };
// steady up to frame 2, and there back again
const Motion forth = [](int frame) { return std::vector{0.0, 1.0, frame < 3 ? 2.0 + frame : 10.0 - frame}; };

TEST_F(Playing, ComparesWithTheOtherMeshAndMeasuresAllThree) {
    PlayPlan plan = planOf(mesh("still", still), {1, 4, 1});
    plan.against = mesh("forth", forth);
    plan.before = mesh("before", [](int frame) { return std::vector{0.0, 1.0, 2.0 * frame * frame}; });
    PlayResult result = play(plan);
    EXPECT_EQ(result.mesh->distances.largest(), 5.0);
    EXPECT_EQ(result.mesh->distances.worstFrame(), 3);
    EXPECT_EQ(result.mesh->distances.worstVertex(), 2U);
    EXPECT_EQ(result.mesh->jitter.largest(), 0.0);
    EXPECT_EQ(result.targetJitter.largest(), 4.0); // 3, 4, 7, 6
    EXPECT_EQ(result.before->distances.largest(), 26.0);
    EXPECT_EQ(result.before->jitter.largest(), 4.0);
    EXPECT_EQ(result.boxDiagonal, std::sqrt(9.0 + 1.0)) << "of the other mesh in the first frame";
    plan.rest = {0, 0, 0, 3, 4, 0};
    EXPECT_EQ(play(plan).boxDiagonal, 5.0) << "of the rest mesh where there is one";
    plan.against = plan.before = {};
    result = play(plan);
    EXPECT_FALSE(result.mesh || result.before || result.gpu);
    EXPECT_EQ(result.vertexCount, 3U);
}

TEST_F(Playing, RepeatsAreTimedAndTheFirstIsWritten) {
    PlayPlan plan = planOf(mesh("forth", forth), {1, 7, 2});
    plan.output = folder_.path() / "a.npy";
    EXPECT_EQ(play(plan).times.count(), 4U);
    const auto size = std::filesystem::file_size(plan.output);
    plan.repeats = 3;
    plan.against = mesh("still", still);
    const PlayResult result = play(plan);
    EXPECT_EQ(result.times.count(), 8U) << "the first of several is not timed";
    EXPECT_EQ(std::filesystem::file_size(plan.output), size);
    EXPECT_EQ(result.targetJitter.largest(), 0.0);
    EXPECT_EQ(result.mesh->distances.largest(), 5.0);
}

TEST_F(Playing, PhasesAreThoseOfEvaluation) {
    PlayPlan plan = planOf(mesh("forth", forth));
    plan.repeats = 2;
    EXPECT_THAT(play(plan).phases, ::testing::IsEmpty());
    plan.trace = folder_.path() / "trace.json";
    const PlayResult result = play(plan);
    EXPECT_THAT(result.phases, ElementsAre(Key("moving")));
    EXPECT_EQ(result.phases.at("moving").size(), 5U) << "of what is timed";
}

TEST_F(Playing, MeshesThatCannotBeComparedOrDeliveredAreRefusedByFrame) {
    const HPlug three = mesh("still", still);
    const HPlug four = mesh("four", [](int) { return std::vector{0.0, 1.0, 2.0, 3.0}; });
    const HPlug growing = mesh("growing", [](int frame) { return std::vector<double>(frame < 3 ? 3 : 4); });
    const HPlug broken = mesh("broken", [](int frame) { return std::vector{0.0, 1.0, frame < 4 ? 2.0 : 1e300}; });
    const struct {
        HPlug mesh, against, before;
        const char* expected;
    } rows[] = {
        {three, four, {}, "frame 1: four.outMesh has 4 vertices, and still.outMesh has 3: they cannot be compared"},
        {four, three, {}, "frame 1: still.outMesh has 3 vertices, and four.outMesh has 4: they cannot be compared"},
        {three, three, four, "frame 1: four.outMesh has 4 vertices, and still.outMesh has 3: they cannot be compared"},
        {growing, {}, {}, "frame 3: growing.outMesh has 4 vertices, and had 3 before"},
        {broken, {}, {}, "frame 4: vertex 2 of broken.outMesh has a coordinate that is no finite number"},
        {three, broken, {}, "frame 4: vertex 2 of broken.outMesh has a coordinate that is no finite number"},
    };
    for (const auto& row : rows) {
        PlayPlan plan = planOf(row.mesh);
        plan.against = row.against;
        plan.before = row.before;
        plan.output = folder_.path() / "lost.npy";
        plan.replacesBegun = true;
        EXPECT_EQ(failureOf([&] { play(plan); }), row.expected);
        EXPECT_FALSE(std::filesystem::exists(plan.output));
    }
}

TEST_F(Playing, TheDeformerSaysWhichFramesWhereNobodyElseDoes) {
    ASSERT_TRUE(OpenQuarn::runScript(
        "createNode neuralWarp -name warp; setAttr warp.exportStartFrame 3; setAttr warp.exportEndFrame 5", "play"));
    const Warp warp = Warp::find();
    const FrameRange own = framesToPlay("", &warp);
    EXPECT_THAT((std::vector{own.first, own.last, own.step}), ElementsAre(3, 5, 1));
    EXPECT_EQ(framesToPlay("7-9x2", &warp).step, 2);
    EXPECT_THROW(framesToPlay("", nullptr), std::runtime_error);
}

} // namespace
