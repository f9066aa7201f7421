// SPDX-License-Identifier: Apache-2.0
#include "libraries/geometry/reference.h"
#include "support/indexMaps.h"
#include "support/meshZoo.h"

#include "quill/VertexConnections.h"
#include "quill/VertexFrames.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <atomic>
#include <cmath>
#include <cstring>
#include <limits>

namespace {

using quill::mat4d;
using quill::VertexFrames;
using testing::ElementsAre;
using Points = std::vector<quill::val3<float>>;
using Vector = quill::val3<double>;

struct Built {
    quill::IndexMapper map;
    Points points;
    quill::VertexConnections connections;
    VertexFrames frames;

    Built(const ZooMesh& mesh, quill::IndexMapper mapIn)
        : map(std::move(mapIn))
        , points(affectedPoints(mesh.points, map)) {
        connections.build(mesh.topology(), map, 0, false);
        frames.build(mesh.topology(), map, &points);
    }
    explicit Built(const ZooMesh& mesh)
        : Built(mesh, indexMaps(mesh.vertexCount())[0].map) {}

    std::vector<mat4d> on(const Points& positions, bool invert = false) const {
        std::vector<mat4d> result;
        frames.calculateFrames(result, positions, map, invert, nullptr);
        return result;
    }
    bool hasPairs(std::size_t v) const { return frames.framesIndexer()[v] != frames.framesIndexer()[v + 1]; }
};

Vector row(const mat4d& m, std::size_t r) {
    return {m(r, 0), m(r, 1), m(r, 2)};
}

// Calls check(built) for every mesh with every map.
template <typename Check>
void forEachBuilt(const Check& check) {
    for (const ZooMesh& mesh : meshZoo())
        for (const auto& [mapName, map] : indexMaps(mesh.vertexCount())) {
            SCOPED_TRACE(mesh.name + ", " + mapName);
            check(mesh, Built(mesh, map));
        }
}

TEST(VertexFrames, BuildAgreesWithTheDirectReadingOnEveryMeshAndMap) {
    forEachBuilt([](const ZooMesh& mesh, const Built& built) {
        for (const Points* positions : {static_cast<const Points*>(nullptr), &built.points}) {
            VertexFrames frames;
            frames.build(mesh.topology(), built.map, positions);
            std::vector<std::uint32_t> flat, indexer{0};
            for (const auto& pairs : reference::cornerPairs(mesh.polygons, built.map, positions)) {
                flat.insert(flat.end(), pairs.begin(), pairs.end());
                indexer.push_back(static_cast<std::uint32_t>(flat.size()));
            }
            ASSERT_EQ(frames.framesPairs(), flat);
            ASSERT_EQ(frames.framesIndexer(), indexer);
        }
    });
}

// Points by the number of the corner, in turns about the circle and a number by chance.
using Shape = quill::val3<float> (*)(float turn, float chance, std::uint32_t c);

quill::val3<float> onCircle(float turn, float = 0.0F, std::uint32_t = 0) {
    return {std::cos(6.2831853F * turn), std::sin(6.2831853F * turn), 0.0F};
}

quill::val3<float> onLine(float, float chance, std::uint32_t) {
    return {chance, 0.3F * chance, 0.7F * chance};
}

ZooMesh largePolygon(Shape shape, std::uint32_t corners) {
    ZooMesh mesh{"large", {{}}, {}};
    std::uint32_t state = corners;
    for (std::uint32_t c = 0; c < corners; ++c) {
        state = state * 1664525U + 1013904223U;
        const float chance = static_cast<float>(state >> 8U) / 8388608.0F - 1.0F;
        mesh.points.push_back(shape(static_cast<float>(c) / static_cast<float>(corners), chance, c));
        mesh.polygons[0].push_back(c);
    }
    return mesh;
}

constexpr float infinity = std::numeric_limits<float>::infinity();
const std::pair<const char*, Shape> shapes[] = {
    {"circle", onCircle},
    {"circle far away", [](float t, float, std::uint32_t) { return onCircle(t) + quill::val3<float>(1000, 500, 0); }},
    {"small circle", [](float t, float, std::uint32_t) { return onCircle(t) * 1e-19F; }},
    {"circle too small for squares", [](float t, float, std::uint32_t) { return onCircle(t) * 1e-23F; }},
    {"large circle", [](float t, float, std::uint32_t) { return onCircle(t) * 3e9F; }},
    {"circle too large for squares", [](float t, float, std::uint32_t) { return onCircle(t) * 1.5e19F; }},
    {"circle at the end of numbers", [](float t, float, std::uint32_t) { return onCircle(t) * 3e38F; }},
    {"star", [](float t, float, std::uint32_t c) { return onCircle(t) * (c % 2 == 0 ? 1.0F : 0.4F); }},
    {"helix", [](float t, float, std::uint32_t) { return onCircle(7 * t) + quill::val3<float>(0, 0, t); }},
    {"by chance", [](float t, float r, std::uint32_t) { return onCircle(3 * r) * t + quill::val3<float>(0, 0, r); }},
    {"on a grid",
     [](float, float r, std::uint32_t c) { return quill::val3<float>(std::round(3 * r), float(c % 4), 0); }},
    {"on a line", onLine},
    {"on an axis", [](float, float r, std::uint32_t) { return quill::val3<float>(0, r, 0); }},
    {"one point", [](float, float, std::uint32_t) { return quill::val3<float>(1, 2, 3); }},
    {"with a NaN", [](float t, float, std::uint32_t c) { return onCircle(t) * (c == 17 ? std::nanf("") : 1.0F); }},
    {"with an infinity", [](float t, float, std::uint32_t c) { return onCircle(t) * (c % 9 == 5 ? infinity : 1.0F); }},
    {"some very far", [](float t, float r, std::uint32_t c) { return onCircle(t) * (c % 5 == 2 ? 2e18F * r : 1.0F); }},
};

TEST(VertexFrames, LargePolygonsAgreeWithTheFullSearch) {
    for (const auto& [name, shape] : shapes)
        for (const std::uint32_t corners : {21U, 32U, 33U, 100U, 147U}) {
            SCOPED_TRACE(std::string(name) + ", " + std::to_string(corners));
            ZooMesh mesh = largePolygon(shape, corners);
            mesh.polygons[0].push_back(3); // a vertex may be a corner twice
            const Built built(mesh);
            const auto pairs = reference::cornerPairs(mesh.polygons, built.map, &built.points);
            for (std::uint32_t v = 0; v < corners; ++v) {
                const auto begin = built.frames.framesPairs().begin();
                const auto& indexer = built.frames.framesIndexer();
                ASSERT_EQ(std::vector<std::uint32_t>(begin + indexer[v], begin + indexer[v + 1]), pairs[v]) << v;
            }
        }
}

TEST(VertexFrames, WhoWaitsForALargePolygonIsToldAndMayEndIt) {
    ZooMesh mesh = makeGrid(1, 1);
    VertexFrames frames;
    quill::IndexMapper map;
    map.setIdentity(3004);
    frames.build(mesh.topology(), map, nullptr);
    const auto before = frames.framesPairs();
    const ZooMesh line = largePolygon(onLine, 3000);
    mesh.polygons.push_back(line.polygons[0]);
    for (std::uint32_t& corner : mesh.polygons[1])
        corner += 4;
    mesh.points.insert(mesh.points.end(), line.points.begin(), line.points.end());
    std::vector<std::size_t> told;
    std::atomic<bool> isTold{false};
    quill::WorkWatch watch;
    watch.onSlowPolygon = [&](std::size_t polygon, std::size_t corners, double seconds) {
        told.insert(told.end(), {polygon, corners});
        isTold = seconds > 0.0;
    };
    watch.isCancelled = [&] { return isTold.load(); };
    EXPECT_THROW(frames.build(mesh.topology(), map, &mesh.points, watch), quill::Cancelled);
    EXPECT_THAT(told, ElementsAre(1, 3000));
    EXPECT_EQ(frames.framesPairs(), before);
}

TEST(VertexFrames, ATriangleHasTheStatedFrame) {
    const Built built({"triangle", {{0, 1, 2}}, {{0, 0, 0}, {1, 0, 0}, {0, 1, 0}}});
    EXPECT_EQ(built.on(built.points)[0], (mat4d{{0, 1, 0, 0, 1, 0, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1}}));
    // collinear: no normal, so X and Y vanish, and the inverse is finite all the same
    const Points collinear{{0, 0, 0}, {1, 0, 0}, {2, 0, 0}};
    EXPECT_EQ(built.on(collinear)[1], (mat4d{{0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 1, 0, 0, 1}}));
}

// the library builds frames in blocks, by component: each must still be what its own vertex alone gives
TEST(VertexFrames, FramesAgreeWithTheDirectFormulaToTheBit) {
    auto meshes = meshZoo();
    meshes.push_back(shuffled(makeGrid(31, 17), 3)); // blocks that are not full
    for (ZooMesh& mesh : meshes) {
        SCOPED_TRACE(mesh.name);
        if (mesh.points.size() > 3) {
            mesh.points[1] = {1e19F, -1e19F, 2e19F}; // lengths whose squares overflow
            mesh.points[2] = mesh.points[3];
        }
        const Built built(mesh);
        const auto pairs = reference::cornerPairs(mesh.polygons, built.map, &built.points);
        const auto frames = built.on(built.points);
        for (std::uint32_t v = 0; v < frames.size(); ++v) {
            const mat4d expected = reference::frame(v, pairs[v], built.points);
            EXPECT_EQ(std::memcmp(&frames[v], &expected, sizeof expected), 0) << "vertex " << v;
        }
    }
}

TEST(VertexFrames, InverseFramesUndoTheFramesAndAreAlwaysFinite) {
    forEachBuilt([](const ZooMesh& mesh, const Built& built) {
        const auto frames = built.on(built.points), inverses = built.on(built.points, true);
        for (std::size_t v = 0; v < frames.size(); ++v) {
            for (const double element : inverses[v].m)
                EXPECT_TRUE(std::isfinite(element));
            if (!mesh.degenerate) {
                EXPECT_TRUE((frames[v] * inverses[v]).isIdentity(1e-9)) << frames[v] * inverses[v];
            }
        }
    });
}

TEST(VertexFrames, TransportOfManyIsThatOfEach) {
    forEachBuilt([](const ZooMesh&, const Built& built) {
        const std::size_t count = built.points.size();
        Points moved = built.points;
        for (std::size_t v = 0; v < count; ++v)
            moved[v].x += 0.25F * static_cast<float>(v % 3);
        const auto restInverse = built.on(built.points, true), current = built.on(moved);
        std::vector<std::uint32_t> everySecond;
        for (std::size_t v = 0; v < count; v += 2)
            everySecond.push_back(static_cast<std::uint32_t>(v));
        for (const auto* subset : {static_cast<const std::vector<std::uint32_t>*>(nullptr),
                                   static_cast<const std::vector<std::uint32_t>*>(&everySecond)}) {
            Points deltas(subset ? subset->size() : count), expected(count, {9, 9, 9}), out = expected;
            for (std::size_t k = 0; k < deltas.size(); ++k) {
                const std::size_t v = subset ? (*subset)[k] : k;
                deltas[k] = {0.5F, 0.125F * static_cast<float>(k), -1.0F};
                expected[v] = transportDelta(built.points[v], deltas[k], restInverse[v], current[v]);
            }
            built.frames.transportDeltas(out, deltas, built.points, restInverse, moved, subset);
            EXPECT_EQ(out, expected);
            if (deltas.empty())
                continue;
            deltas.pop_back(); // what is missing at the end is left out
            expected[subset ? subset->back() : count - 1] = {9, 9, 9};
            out.assign(count, {9, 9, 9});
            built.frames.transportDeltas(out, deltas, built.points, restInverse, moved, subset);
            EXPECT_EQ(out, expected);
        }
    });
}

TEST(VertexFrames, TransportFollowsARigidMotion) {
    const Built built(makeGrid(6, 4));
    // a quarter turn about z and a shift
    const mat4d motion{{0, 1, 0, 0, -1, 0, 0, 0, 0, 0, 1, 0, 3, -2, 5, 1}};
    Points moved;
    for (const auto& p : built.points)
        moved.push_back(transformAsPoint(p, motion));
    const auto restInverse = built.on(built.points, true), current = built.on(moved);
    const quill::val3<float> delta{0.1F, 0.2F, 0.3F};
    for (std::size_t v = 0; v < moved.size(); ++v)
        EXPECT_LT(length(transportDelta(built.points[v], delta, restInverse[v], current[v]) -
                         transformAsPoint(built.points[v] + delta, motion)),
                  5e-6F);
}

TEST(VertexFrames, OnlyTheSubsetIsWrittenAndFramesNeverShrink) {
    const Built built(makeGrid(3, 3));
    const auto whole = built.on(built.points);
    const std::vector<std::uint32_t> subset{2, 5, 11, 400};
    mat4d marker;
    marker.m.fill(7.0);
    for (const std::size_t normalIterations : {0U, 1U}) {
        std::vector<mat4d> frames(20, marker);
        built.frames.calculateFrames(frames, built.points, built.connections.connectionsIndexer(),
                                     built.connections.connections(), {}, normalIterations, built.map, false, &subset);
        ASSERT_EQ(frames.size(), 20U);
        for (std::size_t v = 0; v < frames.size(); ++v) {
            const bool listed = std::find(subset.begin(), subset.end(), v) != subset.end();
            EXPECT_EQ(frames[v] == marker, !listed) << "vertex " << v;
            if (listed && normalIterations == 0) {
                EXPECT_EQ(frames[v], whole[v]);
            }
        }
    }
    std::vector<mat4d> fresh;
    built.frames.calculateFrames(fresh, built.points, built.map, false, &subset);
    EXPECT_EQ(fresh.size(), built.map.affectCount());
    EXPECT_EQ(fresh[0], mat4d());
}

TEST(VertexFrames, SmoothedNormalsAreTheWeightedSumOfNeighbours) {
    const Built built(makeGrid(4, 3));
    const auto& indexer = built.connections.connectionsIndexer();
    const auto& neighbours = built.connections.connections();
    std::vector<float> weights;
    built.connections.calculateConnectionWeights(weights, built.points, 1.0, 0.0);
    const auto plain = built.on(built.points);
    std::vector<Vector> normals;
    normals.reserve(plain.size());
    for (const mat4d& frame : plain)
        normals.push_back(row(frame, 2));
    for (std::size_t passes = 1; passes <= 3; ++passes) {
        const std::vector<Vector> before = normals;
        std::vector<mat4d> smoothed;
        built.frames.calculateFrames(smoothed, built.points, indexer, neighbours, weights, passes, built.map, false,
                                     nullptr);
        for (std::size_t v = 0; v < plain.size(); ++v) {
            for (std::size_t k = indexer[v]; k < indexer[v + 1]; ++k)
                normals[v] += static_cast<double>(weights[k]) * before[neighbours[k]];
            normals[v].normalize();
            EXPECT_LT(length(row(smoothed[v], 2) - normals[v]), 1e-6) << passes << " passes, vertex " << v;
            EXPECT_NEAR(dot(row(smoothed[v], 0), row(smoothed[v], 2)), 0.0, 1e-6);
        }
    }
    std::vector<mat4d> zeroPasses;
    built.frames.calculateFrames(zeroPasses, built.points, indexer, neighbours, weights, 0, built.map, false, nullptr);
    EXPECT_EQ(zeroPasses, plain);
}

TEST(VertexFrames, DisplacementsAreTheCoordinatesInEachFrame) {
    forEachBuilt([](const ZooMesh& mesh, const Built& built) {
        if (mesh.degenerate)
            return;
        Points points = built.points, displacements(3, {9, 9, 9});
        for (std::size_t v = 0; v < points.size(); ++v)
            points[v] += quill::val3<float>(0.5F, -0.25F, static_cast<float>(v % 3));
        built.frames.calculateDisplacements(built.points, points, displacements);
        ASSERT_EQ(displacements.size(), points.size());
        const auto frames = built.on(built.points);
        for (std::size_t v = 0; v < points.size(); ++v)
            EXPECT_LT(length(transformAsPoint(displacements[v], frames[v]) - points[v]), 2e-6F);
    });
}

TEST(VertexFrames, ArraysThatDoNotFitAreLeftOut) {
    const Built built(makeGrid(3, 3));
    const Points tooFew(built.points.begin(), built.points.end() - 1);
    EXPECT_THAT(built.on(tooFew), testing::Each(mat4d())) << "fewer points than the tables name";

    quill::IndexMapper larger;
    larger.setIdentity(30);
    std::vector<mat4d> frames;
    built.frames.calculateFrames(frames, built.points, larger, false, nullptr);
    ASSERT_EQ(frames.size(), 30U);
    EXPECT_EQ(frames[15], built.on(built.points)[15]);
    EXPECT_EQ(frames[16], mat4d()) << "no point for it";

    Points displacements;
    built.frames.calculateDisplacements(tooFew, built.points, displacements);
    EXPECT_THAT(displacements, testing::Each(quill::val3<float>()));

    // adjacency from elsewhere that points everywhere
    const std::vector<std::uint32_t> wildIndexer{0, 4000000000U, 3, 2, 1}, wildConnections{5, 4000000000U, 16, 1};
    built.frames.calculateFrames(frames, built.points, wildIndexer, wildConnections, {1, 1, 1}, 2, built.map, false,
                                 nullptr);
    for (const mat4d& frame : frames)
        EXPECT_TRUE(std::isfinite(frame.m[8]));

    VertexFrames shortRest;
    shortRest.build(makeGrid(3, 3).topology(), built.map, &tooFew);
    VertexFrames noRest;
    noRest.build(makeGrid(3, 3).topology(), built.map, nullptr);
    EXPECT_EQ(shortRest.framesPairs(), noRest.framesPairs());
}

} // namespace
