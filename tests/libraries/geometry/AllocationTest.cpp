// SPDX-License-Identifier: Apache-2.0
// Steady-state calls allocate nothing: what they need is there after the first call. A program of its own, because it
// replaces operator new for the whole process.
#include "support/meshZoo.h"
#include "support/watchedNew.h"

#include "quill/VertexConnections.h"
#include "quill/VertexFrames.h"
#include "quill/bulk.h"

#include <gtest/gtest.h>

#include <tbb/global_control.h>

#include <functional>

namespace {

TEST(Allocation, SteadyStateCallsAllocateNothing) {
    const ZooMesh mesh = makeGrid(60, 60);
    quill::IndexMapper map;
    map.setIdentity(mesh.vertexCount());
    quill::VertexConnections connections;
    connections.build(mesh.topology(), map, 0, false);
    quill::VertexFrames vertexFrames;
    vertexFrames.build(mesh.topology(), map, &mesh.points);
    std::vector<quill::val3<float>> points = mesh.points, scratch, displacements;
    std::vector<float> weights, floats;
    std::vector<quill::mat4d> frames;
    const quill::mat4d turn{{0, 1, 0, 0, -1, 0, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1}};

    struct Step {
        const char* name;
        std::function<void()> call;
    };
    const std::vector<Step> steps{
        {"weights", [&] { connections.calculateConnectionWeights(weights, mesh.points, 1.0, 0.0); }},
        {"mushArray", [&] { connections.mushArray(points, scratch, 8, 1.0F, nullptr, &weights, false); }},
        {"calculateFrames", [&] { vertexFrames.calculateFrames(frames, points, map, true, nullptr); }},
        {"calculateDisplacements", [&] { vertexFrames.calculateDisplacements(points, mesh.points, displacements); }},
        {"multAsPoint", [&] { quill::multAsPoint(points, turn); }},
        {"multFrames", [&] { quill::multFrames(frames, turn); }},
        {"invertFrames", [&] { quill::invertFrames(frames); }},
        {"convertToFloatArray", [&] { quill::convertToFloatArray(frames, floats); }},
    };
    const tbb::global_control oneThread(tbb::global_control::max_allowed_parallelism, 1); // the one that is watched
    watch.threshold = 0;
    for (const Step& step : steps)
        step.call();
    EXPECT_GT(watch.count, 0U) << "nothing is watched";
    for (const Step& step : steps) {
        const std::size_t before = watch.count;
        step.call();
        step.call();
        EXPECT_EQ(watch.count, before) << step.name;
    }
}

} // namespace
