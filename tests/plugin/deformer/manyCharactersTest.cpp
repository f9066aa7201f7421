// SPDX-License-Identifier: Apache-2.0
// Characters of one mesh and one model: what they hold together, and that they do not notice each other.
#include "plugin/deformer/support/FailureTest.h"

namespace {

class ManyCharacters : public FailureTest {
public:
    /// By which of its tables a state holds what another holds.
    static std::string sharedBy(const neuralWarp::neuralWarpData& a, const neuralWarp::neuralWarpData& b) {
        std::string text;
        const auto add = [&](const char* name, const auto& one, const auto& other) {
            if (one.data() == other.data())
                text += text.empty() ? name : std::string(" ") + name;
        };
        add("pairs", a.vertexFrames.framesPairs(), b.vertexFrames.framesPairs());
        add("connections", a.vertexConnections.connections(), b.vertexConnections.connections());
        add("weights", a.connectionWeights, b.connectionWeights);
        add("rest", a.restPoints, b.restPoints);
        add("frames", a.restFramesInverse, b.restFramesInverse);
        return text + (a.principalShapes.isSharedWith(b.principalShapes) ? " basis" : "");
    }
    void write(float bias, float shape) const {
        writeChanged([&](ModelSpec& spec) {
            spec.smoothingIterations = 2;
            spec.bias = {bias, 1.0F};
            spec.shapes.assign(2, std::vector<float>(27, shape));
        });
    }
};

TEST_F(ManyCharacters, HoldTheirTablesOnceAndReloadAlone) {
    const std::string tables = "pairs connections weights rest frames";
    write(0.5F, 1.0F);
    std::vector<warpRig::Rig> rigs;
    for (const char* name : {"warp1", "warp2", "warp3"}) {
        rigs.emplace_back(name);
        rigs.back().addGeometry(0, {.mesh = unevenMesh()});
        rigs.back().setModelRoot(folder.path());
        rigs.back().setControls({1.0});
        ASSERT_EQ(rigs.back().deform(0), HStatus::kSuccess);
    }
    const auto shared = [&](std::size_t a, std::size_t b) { return sharedBy(*rigs[a].state(0), *rigs[b].state(0)); };
    EXPECT_EQ(shared(0, 1), tables + " basis");
    EXPECT_EQ(shared(1, 2), tables + " basis");
    const Coordinates before = result(rigs[0]);

    write(2.0F, 3.0F);
    nodeOf(rigs[1]).requestReload(0);
    for (const warpRig::Rig& each : rigs)
        EXPECT_EQ(each.deform(0), HStatus::kSuccess);
    EXPECT_EQ(result(rigs[0]), before);
    EXPECT_EQ(result(rigs[2]), before);
    EXPECT_NE(result(rigs[1]), before);
    EXPECT_EQ(shared(0, 1), tables);
    EXPECT_EQ(shared(0, 2), tables + " basis");
    EXPECT_EQ(rigs[0].state(0)->cacheVersions, rigs[2].state(0)->cacheVersions);

    // another rest shape of one character, which then takes the model as it is now
    HPointArray points = warpRig::pointsOf(unevenMesh());
    points[4].z += 0.5;
    rigs[2].setRest(0, warpRig::withPoints(unevenMesh(), points));
    for (const warpRig::Rig& each : rigs)
        EXPECT_EQ(each.deform(0), HStatus::kSuccess);
    EXPECT_EQ(result(rigs[0]), before);
    EXPECT_EQ(shared(0, 2), "connections");
    EXPECT_EQ(shared(1, 2), "connections basis");
    takeMessages();
}

} // namespace
