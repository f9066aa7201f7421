// SPDX-License-Identifier: Apache-2.0
// What a recording shows of an evaluation.
#include "openquarn_app/Profiling.h"
#include "deformer/neuralWarpNode.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HProfilingScope.h"
#include "plugin/deformer/support/WarpTest.h"

#include <rapidjson/document.h>
#include <rapidjson/istreamwrapper.h>

#include <fstream>
#include <map>

namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

struct Event {
    std::string label; ///< "category name colour description"
    double begin = 0.0, end = 0.0;

    bool encloses(const Event& inner) const { return begin <= inner.begin && inner.end <= end; }
};

class WarpProfile : public WarpTest {
protected:
    WarpProfile() {
        ModelSpec spec;
        spec.bias.assign(12, 0.25F);
        spec.deltaMode = 1;
        spec.fullCount = spec.affectCount = 4;
        writeModel(modelDirectory(), spec);
        rig.addGeometry(0, {.mesh = quad});
        rig.setModelRoot(folder.path());
        rig.setControls({0.5});
        EXPECT_EQ(rig.deform(0), HStatus::kSuccess); // builds the caches, which a steady frame does not
    }

    /// The events of category "Evaluation" that describe the node, in the order in which they ended.
    std::vector<Event> recorded(const std::function<void()>& body) const {
        OpenQuarn::Profiling::start();
        body();
        OpenQuarn::Profiling::stop();
        const auto path = folder.path() / "trace.json";
        OpenQuarn::Profiling::writeTrace(path);
        std::ifstream file(path);
        rapidjson::IStreamWrapper stream(file);
        rapidjson::Document trace;
        trace.ParseStream(stream);
        std::vector<Event> events;
        for (const auto& event : trace["traceEvents"].GetArray()) {
            if (event["ph"] != "X" || event["args"]["description"] != "body")
                continue;
            const double begin = event["ts"].GetDouble();
            events.push_back({std::string(event["cat"].GetString()) + ' ' + event["name"].GetString() + ' ' +
                                  std::to_string(event["args"]["color"].GetInt()),
                              begin, begin + event["dur"].GetDouble()});
        }
        return events;
    }
    static std::vector<std::string> labels(const std::vector<Event>& events) {
        std::vector<std::string> texts;
        texts.reserve(events.size());
        for (const Event& event : events)
            texts.push_back(event.label);
        return texts;
    }

    const HObject quad = warpRig::mesh(makeGrid(1, 1));
    warpRig::Rig rig{"body"};
};

const std::string inference = "Evaluation InferenceDeltas 0";
const std::string applying = "Evaluation ApplyDeltas 9";
const std::string measuring = "Evaluation CalculateVertexFrames 10";

TEST_F(WarpProfile, AFrameOfSurfaceMode) {
    const std::vector<Event> events = recorded([this] { EXPECT_EQ(rig.deform(0), HStatus::kSuccess); });
    ASSERT_THAT(labels(events), ElementsAre(inference, measuring, applying));
    EXPECT_TRUE(events[2].encloses(events[1]));
    EXPECT_LE(events[0].end, events[2].begin);
}

TEST_F(WarpProfile, WhatIsNotDoneIsNotShown) {
    const auto frame = [this] { EXPECT_EQ(rig.deform(0), HStatus::kSuccess); };
    rig.plug("models[0].modelActive").setShort(0);
    EXPECT_THAT(labels(recorded(frame)), ElementsAre());
    rig.plug("models[0].modelActive").setShort(1);

    // the frames of the rest surface, when they are due: once, before the network runs
    HPointArray points = warpRig::pointsOf(quad);
    points[0].z += 1.0;
    rig.setRest(0, warpRig::withPoints(quad, points));
    EXPECT_THAT(labels(recorded(frame)), ElementsAre(measuring, inference, measuring, applying));

    ModelSpec spec;
    spec.bias.assign(12, 0.25F);
    spec.deltaMode = 0;
    spec.fullCount = spec.affectCount = 4;
    writeModel(modelDirectory(), spec);
    rig.plug("models[0].modelName").setString("model");
    EXPECT_THAT(labels(recorded(frame)), ElementsAre(inference, applying));
}

TEST_F(WarpProfile, AFrameThatFailsLeavesNothingOpen) {
    const auto failing = [this](const char* operation, int call) {
        return recorded([&] {
            OpenQuarn::Faults::fail(operation, call);
            EXPECT_NE(rig.deform(0), HStatus::kSuccess);
            OpenQuarn::Faults::clear();
        });
    };
    // the input stops being readable after the network ran
    EXPECT_THAT(labels(failing("HItGeometry::rawPositions", 1)), ElementsAre(inference, applying));
    EXPECT_THAT(takeMessages(), Contains(HasSubstr("the input geometry has 0 points")));
    // the positions cannot be fetched when all else is done
    EXPECT_THAT(labels(failing("HItGeometry::allPositions", 1)), ElementsAre(inference, measuring, applying));
    EXPECT_THAT(takeMessages(), Contains(HasSubstr("allPositions")));
    // an open scope would enclose the frame after it
    const std::vector<Event> next = recorded([this] { rig.deform(0); });
    EXPECT_THAT(labels(next), ElementsAre(inference, measuring, applying));
    EXPECT_LE(next[0].end, next[2].begin);
}

TEST_F(WarpProfile, CarryingPointsByFrames) {
    HStatus status;
    const auto& node = dynamic_cast<const neuralWarp::neuralWarpNode&>(*HFnDependencyNode(rig.node).userNode());
    neuralWarp::Points in(4, {1, 2, 3}), out;
    quill::mat4d lifted;
    lifted(3, 1) = 5.0; // row vectors: the last row moves
    const std::vector<quill::mat4d> frames(4, lifted);
    const std::vector<std::uint32_t> subset{2};
    const auto events = recorded([&] { status = node.applyVertexFrames(out, in, frames, 0, &subset); });
    EXPECT_EQ(status, HStatus::kSuccess);
    EXPECT_THAT(labels(events), ElementsAre("Evaluation ApplyVertexFrames 9"));
    ASSERT_EQ(out.size(), 4U);
    EXPECT_EQ(out[2].y, 7.0F);
    EXPECT_EQ(out[1].y, 0.0F); // outside of the subset
}

} // namespace
