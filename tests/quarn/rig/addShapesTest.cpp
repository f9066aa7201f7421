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
    HUintArray all, some;
    std::vector<float> pointWeights;
    for (unsigned v = vertexCount; v-- > 0;) {
        if (v % 3 != 1)
            some.append(v);
        pointWeights.push_back(static_cast<float>(v % 5) * 0.3F);
    }
    const struct {
        const HUintArray& map;
        const float* weights;
        double envelope;
    } rows[] = {{all, nullptr, 1.0}, {all, pointWeights.data(), 0.3}, {some, pointWeights.data(), 1.0}};
    for (const auto& [map, weights, envelope] : rows) {
        HPointArray before, wanted;
        for (unsigned i = 0; i < (map.isEmpty() ? vertexCount : map.length()); ++i) {
            const unsigned v = map.isEmpty() ? i : map[i];
            const double* sum = plainSums.data() + std::size_t{3} * v;
            before.append(start[v]);
            wanted.append(start[v] + HVector(sum[0], sum[1], sum[2]) *
                                         (weights ? envelope * static_cast<double>(weights[i]) : envelope));
        }
        for (const unsigned threads : {1U, 2U, 7U}) {
            const tbb::global_control limit(tbb::global_control::max_allowed_parallelism, threads);
            for (int round = 0; round < 20; ++round) { // a task may meet its neighbours' work, or not
                HPointArray points = before;
                rig::addShapes({shapes, vertexCount, map, weights, envelope}, sums, points);
                ASSERT_TRUE(points == wanted) << map.length() << ' ' << threads;
            }
        }
    }
}

} // namespace
