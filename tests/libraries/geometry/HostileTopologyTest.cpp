// SPDX-License-Identifier: Apache-2.0
// Topologies and maps that nobody should have made: nothing is read or written out of bounds (the sanitizer builds
// watch), every index that comes out is in range, and what is skipped is what the headers say.
#include "fuzz/topologyTarget.h"
#include "support/indexMaps.h"
#include "support/meshZoo.h"
#include "support/seedCorpus.h"

#include "quill/VertexConnections.h"
#include "quill/VertexFrames.h"

#include <gmock/gmock.h>

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

// Builds everything and runs everything on it.
void exercise(const quill::MeshTopology& topology, const quill::IndexMapper& map) {
    TopologyUse use;
    for (std::size_t i = 0; i < map.affectCount(); ++i)
        use.points.emplace_back(static_cast<float>(i % 7), static_cast<float>(i % 3), static_cast<float>(i % 2));
    for (use.rings = 0; use.rings < 3; use.rings += 2)
        for (const bool invert : {false, true}) {
            use.invert = invert;
            useTopology(topology, map, use);
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
    int withFrames = 0;
    for (int round = 0; round < 1000; ++round) {
        std::vector<std::uint8_t> bytes(random() % 200);
        for (std::uint8_t& byte : bytes) // small numbers, which meet, and some from anywhere
            byte = static_cast<std::uint8_t>(random() % 16 == 0 ? 0xFF : random() % 13);
        withFrames += fuzzTopology(bytes.data(), bytes.size()) ? 1 : 0;
    }
    EXPECT_GT(withFrames, 50);
}

TEST(HostileTopology, SeedsAreAcceptedOrRefusedAsNamed) {
    EXPECT_GE(runSeedCorpus("fuzz_topology", fuzzTopology), 2);
}

} // namespace
