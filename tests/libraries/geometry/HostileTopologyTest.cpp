// SPDX-License-Identifier: Apache-2.0
// Topologies and maps that nobody should have made: nothing is read or written out of bounds (the sanitizer builds
// watch), every index that comes out is in range, and what is skipped is what the headers say.
#include "support/indexMaps.h"
#include "support/meshZoo.h"

#include "quill/VertexConnections.h"
#include "quill/VertexFrames.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <random>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using Polygons = std::vector<std::vector<std::uint32_t>>;

constexpr std::uint32_t nowhere = 4000000000U;

Polygons walk(const quill::MeshTopology& topology) {
    Polygons polygons;
    quill::forEachPolygon(topology, [&](std::span<const std::uint32_t> corners) {
        polygons.emplace_back(corners.begin(), corners.end());
    });
    return polygons;
}

void expectTableInRange(const std::vector<std::uint32_t>& indexer, const std::vector<std::uint32_t>& entries,
                        std::size_t count) {
    ASSERT_EQ(indexer.size(), count + 1);
    EXPECT_TRUE(std::is_sorted(indexer.begin(), indexer.end()));
    EXPECT_EQ(indexer.back(), entries.size());
    for (const std::uint32_t entry : entries)
        ASSERT_LT(entry, count);
}

// Builds everything and runs everything on it.
void exercise(const quill::MeshTopology& topology, const quill::IndexMapper& map) {
    std::vector<quill::val3<float>> points(map.affectCount()), scratch;
    for (std::size_t i = 0; i < points.size(); ++i)
        points[i] = {static_cast<float>(i % 7), static_cast<float>(i % 3), static_cast<float>(i % 2)};
    for (const std::size_t rings : {0U, 2U}) {
        quill::VertexConnections connections;
        connections.build(topology, map, rings, true);
        expectTableInRange(connections.connectionsIndexer(), connections.connections(), points.size());
        std::vector<float> weights;
        connections.calculateConnectionWeights(weights, points, 1.0, 0.0);
        auto smoothed = points;
        connections.mushArray(smoothed, scratch, 2, 1.0F, nullptr, &weights, false);
        for (const bool withPoints : {true, false}) {
            quill::VertexFrames frames;
            frames.build(topology, map, withPoints ? &points : nullptr);
            expectTableInRange(frames.framesIndexer(), frames.framesPairs(), points.size());
            std::vector<quill::mat4d> matrices;
            frames.calculateFrames(matrices, smoothed, connections.connectionsIndexer(), connections.connections(),
                                   weights, 1, map, true, nullptr);
            frames.calculateDisplacements(smoothed, points, scratch);
        }
    }
}

TEST(HostileTopology, PolygonsThatDoNotFitAreSkippedOrCut) {
    struct Row {
        const char* what;
        std::vector<std::uint32_t> offsets;
        std::vector<std::uint32_t> corners;
        std::size_t polygonCount;
        Polygons walked;
    };
    const std::vector<std::uint32_t> six{0, 1, 2, 3, 4, 5};
    for (const Row& row : {
             Row{"nothing", {}, {}, 0, {}},
             Row{"no offsets", {}, six, 7, {}},
             Row{"one offset", {0}, six, 7, {}},
             Row{"well-formed", {0, 3, 6}, six, 2, {{0, 1, 2}, {3, 4, 5}}},
             Row{"count above the offsets", {0, 3, 6}, six, nowhere, {{0, 1, 2}, {3, 4, 5}}},
             Row{"count below the offsets", {0, 3, 6}, six, 1, {{0, 1, 2}}},
             Row{"empty polygons", {0, 0, 3, 3, 6}, six, 4, {{0, 1, 2}, {3, 4, 5}}},
             Row{"past the end", {0, 3, 9, 12}, six, 3, {{0, 1, 2}, {3, 4, 5}}},
             Row{"begins past the end", {8, 9}, six, 1, {}},
             Row{"descending", {6, 3, 0}, six, 2, {}},
             Row{"back and forth", {0, 6, 0, 6, 0, 6}, six, 5, {{0, 1, 2, 3, 4, 5}}},
             Row{"a gap in the corners", {0, 2, 1, 4, 6}, six, 4, {{0, 1}, {4, 5}}},
             Row{"huge", {nowhere, 0xFFFFFFFF, 0, 3}, six, 3, {{0, 1, 2}}},
         }) {
        quill::MeshTopology topology{row.offsets, row.corners, row.polygonCount, 6, true};
        EXPECT_EQ(walk(topology), row.walked) << row.what;
        for (const auto& [name, map] : indexMaps(6))
            exercise(topology, map);
    }
}

TEST(HostileTopology, IndicesOutOfRangeAreNotAffected) {
    const auto topology = makeTopology({{0, 1, 2}, {0, nowhere, 1}, {2, 3, 0xFFFFFFFF, 0}}, 3);
    quill::IndexMapper map;
    map.setIdentity(3);
    exercise(topology, map);
    quill::VertexConnections connections;
    connections.build(topology, map, 0, false);
    EXPECT_THAT(connections.connections(), ElementsAre(1, 2, 0, 2, 0, 1));
    quill::VertexFrames frames;
    frames.build(topology, map, nullptr);
    EXPECT_THAT(frames.framesPairs(), ElementsAre(1, 2, 2, 0, 0, 1));
}

TEST(HostileTopology, MapsWithWrongOrRepeatedEntries) {
    struct Row {
        const char* what;
        std::vector<std::uint32_t> affectedToFull;
        std::size_t fullCount;
        std::vector<std::uint32_t> fullToAffected; // of vertices 0 to 3
    };
    constexpr std::uint32_t no = quill::missingIndex;
    for (const Row& row :
         {Row{"later of two places", {2, 0, 2}, 4, {1, no, 2, no}},
          Row{"beyond the mesh", {nowhere, 1, 4, no}, 4, {no, 1, no, no}},
          Row{"empty mesh", {0, 1}, 0, {no, no, no, no}}, Row{"empty list", {}, 4, {no, no, no, no}}}) {
        SCOPED_TRACE(row.what);
        quill::IndexMapper map;
        map.set(row.affectedToFull, row.fullCount);
        EXPECT_EQ(map.affectCount(), row.affectedToFull.size());
        for (std::uint32_t full = 0; full < 4; ++full)
            EXPECT_EQ(map.toAffected(full), row.fullToAffected[full]) << "vertex " << full;
        for (const std::uint32_t outside : {no, nowhere, static_cast<std::uint32_t>(row.fullCount)})
            EXPECT_EQ(map.toAffected(outside), no);
        exercise(makeTopology({{0, 1, 2, 3}, {3, 2, 1}, {0, 2}}, 4), map);
    }
}

TEST(HostileTopology, ANewMapForgetsTheReverseTableOfTheOld) {
    quill::IndexMapper map;
    map.set({3, 1}, 4);
    EXPECT_EQ(map.toAffected(3), 0U);
    EXPECT_THAT(map.fullToAffected(), testing::SizeIs(4));
    map.set({2}, 3);
    EXPECT_THAT(map.fullToAffected(), IsEmpty());
    EXPECT_EQ(map.toAffected(2), 0U);
    EXPECT_EQ(map.toAffected(3), quill::missingIndex);
    map.setIdentity(2);
    EXPECT_EQ(map.toAffected(1), 1U);
    EXPECT_EQ(map.toAffected(2), quill::missingIndex);
    EXPECT_THAT(map.fullToAffected(), IsEmpty()) << "an identity needs no table";
}

TEST(HostileTopology, RandomNonsenseStaysInBounds) {
    std::mt19937 random(20);
    const auto upTo = [&](std::uint32_t n) { return std::uniform_int_distribution<std::uint32_t>(0, n)(random); };
    const auto wild = [&](std::uint32_t usual) { return upTo(9) == 0 ? upTo(0xFFFFFFFF) : upTo(usual); };
    for (int round = 0; round < 400; ++round) {
        quill::MeshTopology topology;
        topology.polygonVertices.resize(upTo(40));
        std::generate(topology.polygonVertices.begin(), topology.polygonVertices.end(), [&] { return wild(12); });
        topology.polygonOffsets.resize(upTo(14));
        std::generate(topology.polygonOffsets.begin(), topology.polygonOffsets.end(), [&] { return wild(42); });
        if (round % 2 == 0)
            std::sort(topology.polygonOffsets.begin(), topology.polygonOffsets.end());
        topology.polygonCount = wild(16);
        quill::IndexMapper map;
        if (round % 3 == 0) {
            map.setIdentity(upTo(13));
        } else {
            std::vector<std::uint32_t> list(upTo(10));
            std::generate(list.begin(), list.end(), [&] { return wild(13); });
            map.set(list, upTo(13));
        }
        SCOPED_TRACE("round " + std::to_string(round));
        exercise(topology, map);
    }
}

} // namespace
