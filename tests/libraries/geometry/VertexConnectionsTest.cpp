// SPDX-License-Identifier: Apache-2.0
#include "libraries/geometry/reference.h"
#include "support/indexMaps.h"
#include "support/meshZoo.h"

#include "quill/VertexConnections.h"

#include <gmock/gmock.h>

#include <limits>

namespace {

using quill::VertexConnections;
using testing::Each;
using testing::ElementsAre;
using testing::FloatEq;
using testing::IsEmpty;
using Points = std::vector<quill::val3<float>>;

VertexConnections build(const ZooMesh& mesh, const quill::IndexMapper& map, std::size_t rings = 0, bool self = false) {
    VertexConnections connections;
    connections.build(mesh.topology(), map, rings, self);
    return connections;
}

// A fan: vertex 0 with neighbours 1, 2, ... at the given places.
VertexConnections star(std::uint32_t neighbourCount) {
    quill::IndexMapper map;
    map.setIdentity(neighbourCount + 1);
    std::vector<std::vector<std::uint32_t>> edges;
    for (std::uint32_t k = 1; k <= neighbourCount; ++k)
        edges.push_back({0, k});
    VertexConnections connections;
    connections.build(makeTopology(edges, neighbourCount + 1), map, 0, false);
    return connections;
}

TEST(VertexConnections, BuildAgreesWithSetsOnEveryMeshMapAndRing) {
    for (const ZooMesh& mesh : meshZoo())
        for (const auto& [mapName, map] : indexMaps(mesh.vertexCount()))
            for (std::size_t rings = 0; rings < 4; ++rings)
                for (const bool self : {false, true}) {
                    SCOPED_TRACE(mesh.name + ", " + mapName + ", rings " + std::to_string(rings));
                    const auto connections = build(mesh, map, rings, self);
                    std::vector<std::uint32_t> flat, indexer{0};
                    for (const auto& set : reference::neighbours(mesh.polygons, map, rings, self)) {
                        flat.insert(flat.end(), set.begin(), set.end());
                        indexer.push_back(static_cast<std::uint32_t>(flat.size()));
                    }
                    ASSERT_EQ(connections.connections(), flat);
                    ASSERT_EQ(connections.connectionsIndexer(), indexer);
                }
}

TEST(VertexConnections, WeightsAverageOnePerVertex) {
    for (const ZooMesh& mesh : meshZoo())
        for (const double exponent : {1.0, 2.5, -1.0})
            for (const double offset : {0.0, 0.3}) {
                SCOPED_TRACE(mesh.name);
                quill::IndexMapper map;
                map.setIdentity(mesh.vertexCount());
                const auto connections = build(mesh, map);
                std::vector<float> weights;
                connections.calculateConnectionWeights(weights, mesh.points, exponent, offset);
                ASSERT_EQ(weights.size(), connections.connections().size());
                for (std::size_t v = 0; v < mesh.vertexCount(); ++v) {
                    const auto begin = connections.connectionsIndexer()[v],
                               end = connections.connectionsIndexer()[v + 1];
                    double sum = 0.0;
                    for (auto k = begin; k < end; ++k)
                        sum += static_cast<double>(weights[k]);
                    EXPECT_NEAR(sum, end - begin, 1e-5 * (1 + end - begin)) << "vertex " << v;
                }
            }
}

TEST(VertexConnections, WeightsFallWithDistance) {
    const auto connections = star(2);
    const auto weightsAt = [&](const Points& points, double exponent, double offset) {
        std::vector<float> weights;
        connections.calculateConnectionWeights(weights, points, exponent, offset);
        return weights;
    };
    EXPECT_THAT(weightsAt({{0, 0, 0}, {1, 0, 0}, {0, 0, 3}}, 1, 0), ElementsAre(1.5F, 0.5F, 1.0F, 1.0F));
    EXPECT_THAT(weightsAt({{0, 0, 0}, {1, 0, 0}, {0, 0, 3}}, 0.9e-5, 0), Each(1.0F));
    EXPECT_THAT(weightsAt({{0, 0, 0}, {1, 0, 0}, {0, 0, 2}}, 2, 0),
                ElementsAre(FloatEq(1.6F), FloatEq(0.4F), 1.0F, 1.0F));
    EXPECT_THAT(weightsAt({{0, 0, 0}, {1, 0, 0}, {0, 0, 2}}, 1, 1),
                ElementsAre(FloatEq(1.2F), FloatEq(0.8F), 1.0F, 1.0F));
    // both below a thousandth, and so equally near
    EXPECT_THAT(weightsAt({{0, 0, 0}, {0, 0, 0}, {0, 0, 5e-4F}}, 1, 0), Each(1.0F));
    EXPECT_THAT(weightsAt({{0, 0, 0}}, 1, 0), Each(1.0F)) << "too few points";
}

TEST(VertexConnections, SmoothingAgreesWithTheDirectLoopToTheBit) {
    for (const ZooMesh& mesh : meshZoo())
        for (const auto& [mapName, map] : indexMaps(mesh.vertexCount()))
            for (unsigned variant = 0; variant < 24; ++variant) {
                SCOPED_TRACE(mesh.name + ", " + mapName + ", variant " + std::to_string(variant));
                const auto connections = build(mesh, map, variant % 3 == 2 ? 1 : 0);
                const Points points = affectedPoints(mesh.points, map);
                std::vector<float> weights;
                connections.calculateConnectionWeights(weights, points, 1.0, 0.0);
                std::vector<std::uint8_t> mask(points.size());
                for (std::size_t i = 0; i < mask.size(); ++i)
                    mask[i] = i % 3 == 0 ? 7 : 0;
                const reference::Smoothing smoothing{1 + variant % 3, variant % 2 ? 0.3F : 1.0F,
                                                     variant & 4 ? &mask : nullptr, variant & 8 ? &weights : nullptr,
                                                     variant >= 16};
                const float step = smoothing.step == 1.0F ? 1.000009F : smoothing.step; // near 1 is all the way
                Points smoothed = points, scratch;
                connections.mushArray(smoothed, scratch, smoothing.iterations, step, smoothing.mask, smoothing.weights,
                                      smoothing.includeSelf);
                ASSERT_EQ(smoothed, reference::smooth(points, connections, smoothing));
                if (!points.empty() && smoothing.iterations == 1) {
                    EXPECT_EQ(scratch, points) << "one pass leaves its input in scratch";
                }
            }
}

TEST(VertexConnections, SmoothingThatCannotOrNeedNotRunTouchesNothing) {
    const auto connections = star(2);
    const Points points{{1, 2, 3}, {0, 0, 0}, {2, 0, 0}};
    const std::vector<std::uint8_t> shortMask(2);
    const std::vector<float> shortWeights(3);
    struct Row {
        const char* what;
        std::size_t iterations;
        float step;
        const std::vector<std::uint8_t>* mask = nullptr;
        const std::vector<float>* weights = nullptr;
        bool tooFewPoints = false;
    };
    for (const Row& row :
         {Row{"no pass", 0, 1.0F}, Row{"tiny step", 1, 9e-7F}, Row{"negative step", 1, -1.0F},
          Row{"NaN step", 1, std::numeric_limits<float>::quiet_NaN()}, Row{"short mask", 1, 1.0F, &shortMask},
          Row{"short weights", 1, 1.0F, nullptr, &shortWeights}, Row{"few points", 1, 1.0F, nullptr, nullptr, true}}) {
        SCOPED_TRACE(row.what);
        Points positions = row.tooFewPoints ? Points(2, {1, 1, 1}) : points, scratch{{7, 7, 7}};
        const Points before = positions;
        connections.mushArray(positions, scratch, row.iterations, row.step, row.mask, row.weights, false);
        EXPECT_EQ(positions, before);
        EXPECT_EQ(scratch, Points({{7, 7, 7}}));
    }
    Points unbuilt = points, scratch;
    VertexConnections().mushArray(unbuilt, scratch, 1, 1.0F, nullptr, nullptr, false);
    EXPECT_EQ(unbuilt, points);
    EXPECT_THAT(scratch, IsEmpty());
}

TEST(VertexConnections, SmoothingKeepsPointsBeyondItsVerticesAndTakesOneArrayTwice) {
    const auto connections = star(2);
    Points points{{9, 9, 9}, {0, 0, 0}, {2, 0, 0}, {4, 5, 6}}, scratch;
    connections.mushArray(points, scratch, 1, 1.0F, nullptr, nullptr, false);
    EXPECT_EQ(points, Points({{1, 0, 0}, {9, 9, 9}, {9, 9, 9}, {4, 5, 6}}));
    connections.mushArray(points, points, 1, 1.0F, nullptr, nullptr, false);
    EXPECT_EQ(points, Points({{9, 9, 9}, {1, 0, 0}, {1, 0, 0}, {4, 5, 6}}));
}

} // namespace
