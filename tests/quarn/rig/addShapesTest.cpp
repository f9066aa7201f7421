// SPDX-License-Identifier: Apache-2.0
#include "rig/addShapes.h"

#include <gtest/gtest.h>
#include <oneapi/tbb/global_control.h>

#include <random>

namespace {

constexpr unsigned vertexCount = 20'001;

/// Shapes of none to all of the vertices, in random order, with their plain sums.
class AddShapes : public ::testing::Test {
protected:
    AddShapes() {
        std::uniform_real_distribution<double> any(-2, 2);
        plainSums.resize(std::size_t{3} * vertexCount);
        for (unsigned v = 0; v < vertexCount; ++v)
            start.append(HPoint(any(random), any(random), any(random)));
        deltas.resize(9);
        for (unsigned shape = 0; shape < deltas.size(); ++shape) {
            const double weight = any(random);
            std::vector<double> vertices, values;
            for (unsigned v = 0; v < vertexCount; ++v) {
                if (v % 8 >= shape)
                    continue;
                vertices.push_back(v);
                for (unsigned axis = 0; axis < 3; ++axis) {
                    values.push_back(any(random));
                    plainSums[3 * v + axis] += weight * values.back();
                }
            }
            EXPECT_FALSE(rig::makeShapeDeltas(vertices, values, deltas[shape]).error());
            shapes.push_back({&deltas[shape], weight});
        }
    }

public:
    std::mt19937 random{5};
    std::vector<rig::ShapeDeltas> deltas;
    std::vector<rig::WeightedShape> shapes;
    std::vector<double> plainSums, sums;
    HPointArray start;
};

TEST_F(AddShapes, IsThePlainSumOnAnyNumberOfThreadsAndForAnyPoints) {
    HUintArray some;
    std::vector<float> pointWeights;
    for (unsigned v = vertexCount; v-- > 0;)
        if (v % 3 != 1)
            some.append(v);
    for (unsigned i = 0; i < vertexCount; ++i)
        pointWeights.push_back(static_cast<float>(i % 5) * 0.3F);
    for (const bool chosen : {false, true})
        for (const double envelope : {1.0, 0.3})
            for (const unsigned threads : {1U, 2U, 7U}) {
                const tbb::global_control limit(tbb::global_control::max_allowed_parallelism, threads);
                const HUintArray map = chosen ? some : HUintArray();
                HPointArray points(chosen ? some.length() : vertexCount);
                for (unsigned i = 0; i < points.length(); ++i)
                    points[i] = start[chosen ? some[i] : i];
                const float* weights = chosen ? nullptr : pointWeights.data();
                rig::addShapes({shapes, vertexCount, map, weights, envelope}, sums, points);
                for (unsigned i = 0; i < points.length(); ++i) {
                    const unsigned v = chosen ? some[i] : i;
                    const double factor = weights ? envelope * static_cast<double>(weights[i]) : envelope;
                    const HVector sum(plainSums[3 * v], plainSums[3 * v + 1], plainSums[3 * v + 2]);
                    ASSERT_EQ(points[i], start[v] + sum * factor) << v << ' ' << threads;
                }
            }
}

} // namespace
