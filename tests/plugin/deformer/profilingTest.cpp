// SPDX-License-Identifier: Apache-2.0
// What a recording shows of an evaluation.
#include "deformer/neuralWarpNode.h"
#include "openquarn/HFnDependencyNode.h"
#include "plugin/deformer/support/WarpTest.h"
#include "plugin/traceEvents.h"

namespace {

using ::testing::ElementsAre;

class WarpProfile : public WarpTest {
protected:
    WarpProfile() {
        write(1);
        rig.addGeometry(0, {.mesh = quad});
        rig.setModelRoot(folder.path());
        rig.setControls({0.5});
        EXPECT_EQ(rig.deform(0), HStatus::kSuccess); // builds the caches, which a steady frame does not
    }
    void write(std::uint32_t deltaMode) const {
        ModelSpec spec;
        spec.bias.assign(12, 0.25F);
        spec.deltaMode = deltaMode;
        spec.fullCount = spec.affectCount = 4;
        writeModel(modelDirectory(), spec);
    }
    std::vector<TraceEvent> frame() const {
        return recordedEvents("body", [&] { EXPECT_EQ(rig.deform(0), HStatus::kSuccess); });
    }
    static std::vector<std::string> labels(const std::vector<TraceEvent>& events) {
        std::vector<std::string> texts;
        texts.reserve(events.size());
        for (const TraceEvent& event : events)
            texts.push_back(event.label);
        return texts;
    }

    const HObject quad = warpRig::mesh(makeGrid(1, 1));
    warpRig::Rig rig{"body"};
};

const std::string inference = "Evaluation InferenceDeltas 0";
const std::string applying = "Evaluation ApplyDeltas 9";
const std::string measuring = "Evaluation CalculateVertexFrames 10";

TEST_F(WarpProfile, AFrameShowsWhatItDoes) {
    const std::vector<TraceEvent> events = frame();
    ASSERT_THAT(labels(events), ElementsAre(inference, measuring, applying));
    EXPECT_TRUE(events[2].begin <= events[1].begin && events[1].end <= events[2].end) << "the one encloses the other";
    EXPECT_LE(events[0].end, events[2].begin);

    rig.plug("models[0].modelActive").setShort(0);
    EXPECT_THAT(labels(frame()), ElementsAre());
    rig.plug("models[0].modelActive").setShort(1);

    // the frames of the rest surface, when they are due: once, before the network runs
    HPointArray points = warpRig::pointsOf(quad);
    points[0].z += 1.0;
    rig.setRest(0, warpRig::withPoints(quad, points));
    EXPECT_THAT(labels(frame()), ElementsAre(measuring, inference, measuring, applying));

    write(0);
    rig.plug("models[0].modelName").setString("model");
    EXPECT_THAT(labels(frame()), ElementsAre(inference, applying));
}

TEST_F(WarpProfile, CarryingPointsByFrames) {
    HStatus status;
    const auto& node = dynamic_cast<const neuralWarp::neuralWarpNode&>(*HFnDependencyNode(rig.node).userNode());
    neuralWarp::Points in(4, {1, 2, 3}), out;
    quill::mat4d lifted;
    lifted(3, 1) = 5.0; // row vectors: the last row moves
    const std::vector<quill::mat4d> frames(4, lifted);
    const std::vector<std::uint32_t> subset{2};
    const auto events = recordedEvents("body", [&] { status = node.applyVertexFrames(out, in, frames, 0, &subset); });
    EXPECT_EQ(status, HStatus::kSuccess);
    EXPECT_THAT(labels(events), ElementsAre("Evaluation ApplyVertexFrames 9"));
    ASSERT_EQ(out.size(), 4U);
    EXPECT_EQ(out[2].y, 7.0F);
    EXPECT_EQ(out[1].y, 0.0F); // outside of the subset
}

} // namespace
