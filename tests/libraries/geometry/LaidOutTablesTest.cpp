// SPDX-License-Identifier: Apache-2.0
// The tables that are laid out for speed give the bits of the loops that are not, with every instruction set, on any
// number of threads, for any mesh.
#include "support/meshZoo.h"

#include "quill/InstructionSet.h"
#include "quill/Smoother.h"
#include "quill/SurfaceTransport.h"

#include <gtest/gtest.h>

#include <tbb/task_arena.h>

#include <cstring>
#include <functional>
#include <limits>
#include <numeric>

namespace {

using Points = std::vector<quill::val3<float>>;
using quill::InstructionSet;

/// With coordinates that show what is added, left out or added in another order.
Points uneven(Points points) {
    for (std::size_t i = 0; i < points.size(); ++i)
        points[i].z += 0.01F * static_cast<float>(i % 17);
    if (points.size() > 40) {
        points[3] = {-0.0F, std::numeric_limits<float>::denorm_min(), 3e38F};
        points[20].x = std::numeric_limits<float>::infinity();
    }
    return points;
}

std::vector<ZooMesh> meshes() {
    std::vector<ZooMesh> all = meshZoo();
    all.push_back(makeGrid(70, 61));              // large enough for several parts
    all.push_back(shuffled(makeGrid(70, 61), 5)); // neighbours far apart: another order
    all.push_back(shuffled(makeIcosphere(4), 6));
    ZooMesh loose = shuffled(makeGrid(60, 50), 7); // with vertices beyond all that is connected
    loose.points.resize(loose.points.size() + 3, {1, 2, 3});
    loose.name = "loose";
    all.push_back(loose);
    ZooMesh star = makeGrid(80, 70); // a vertex with neighbours everywhere: far apart in every order
    star.name = "star";
    for (std::uint32_t v = 3; v + 90 < star.vertexCount(); v += 89)
        star.polygons.push_back({0, v, v + 40});
    all.push_back(star);
    return all;
}

/// Points whose bits are as they were wanted; one that is no number counts as any other.
bool isSame(float a, float b) {
    return std::memcmp(&a, &b, sizeof a) == 0 || (a != a && b != b);
}
template <class Point>
std::size_t firstOther(const Points& wanted, const std::vector<Point>& got) {
    for (std::size_t i = 0; i < wanted.size(); ++i)
        if (i >= got.size() || !isSame(wanted[i].x, got[i].x) || !isSame(wanted[i].y, got[i].y) ||
            !isSame(wanted[i].z, got[i].z))
            return i;
    return got.size();
}

void forEverySet(const std::function<void()>& check) {
    for (const InstructionSet set :
         {InstructionSet::plain, InstructionSet::avx, InstructionSet::avx2, InstructionSet::avx512}) {
        if (set > quill::processorInstructionSet())
            continue;
        quill::limitInstructionSet(set);
        for (const int threads : {1, 2, 7}) {
            SCOPED_TRACE(testing::Message() << "set " << static_cast<int>(set) << ", threads " << threads);
            tbb::task_arena(threads).execute(check);
        }
    }
    quill::limitInstructionSet(InstructionSet::avx512);
}

TEST(Smoother, GivesTheBitsOfTheLoop) {
    for (const ZooMesh& mesh : meshes()) {
        SCOPED_TRACE(mesh.name);
        quill::IndexMapper map;
        map.setIdentity(mesh.vertexCount());
        quill::VertexConnections connections;
        connections.build(mesh.topology(), map, mesh.vertexCount() > 1000 ? 0 : 1, false);
        std::vector<float> weights(connections.connections().size());
        for (std::size_t k = 0; k < weights.size(); ++k)
            weights[k] = 0.3F + 0.1F * static_cast<float>(k % 11);
        const Points points = uneven(mesh.points);
        quill::Smoother smoother;
        smoother.build(connections, weights, points.size());
        for (const std::size_t passes : {0U, 1U, 2U, 10U, 23U}) {
            Points wanted = points, other;
            connections.mushArray(wanted, other, passes, 1.0F, nullptr, &weights, false);
            quill::PaddedPoints smoothed;
            quill::Smoother::Scratch scratch;
            forEverySet([&] {
                smoother.run(points, passes, smoothed, scratch);
                ASSERT_EQ(smoothed.size(), points.size());
                EXPECT_EQ(firstOther(wanted, smoothed), points.size()) << passes << " passes";
            });
        }
    }
}

TEST(Smoother, RefusesWhatDoesNotFitAndEndsOnRequest) {
    const ZooMesh mesh = makeGrid(3, 3);
    quill::IndexMapper map;
    map.setIdentity(mesh.vertexCount());
    quill::VertexConnections connections;
    connections.build(mesh.topology(), map, 0, false);
    std::vector<float> weights(connections.connections().size(), 1.0F);
    quill::Smoother smoother;
    EXPECT_THROW(smoother.build(connections, weights, 15), std::length_error);
    smoother.build(connections, weights, 16);
    quill::PaddedPoints out;
    quill::Smoother::Scratch scratch;
    smoother.run(Points(15), 3, out, scratch);
    EXPECT_TRUE(out.empty());
    int looks = 0;
    EXPECT_THROW(smoother.run(mesh.points, 1000, out, scratch, {[&] { return ++looks == 5; }}), quill::Cancelled);
    EXPECT_EQ(looks, 5);
    weights.pop_back();
    EXPECT_THROW(smoother.build(connections, weights, 16), std::length_error);
    EXPECT_EQ(smoother.vertexCount(), 0U);
}

TEST(SurfaceTransport, GivesTheBitsOfTheLoop) {
    for (const ZooMesh& mesh : meshes()) {
        SCOPED_TRACE(mesh.name);
        const std::size_t count = mesh.vertexCount();
        quill::IndexMapper map;
        map.setIdentity(count);
        quill::VertexFrames frames;
        frames.build(mesh.topology(), map, &mesh.points);
        std::vector<quill::mat4d> restInverse;
        frames.calculateFrames(restInverse, mesh.points, map, true, nullptr);
        const Points positions = uneven(mesh.points);
        quill::PaddedPoints rows;
        for (const auto& p : positions)
            rows.push_back({p.x, p.y, p.z, std::numeric_limits<float>::quiet_NaN()});
        std::vector<std::uint32_t> everyThird;
        for (std::size_t v = 0; v < count; v += 3)
            everyThird.push_back(static_cast<std::uint32_t>(v));
        for (const std::vector<std::uint32_t>* subset : {static_cast<const std::vector<std::uint32_t>*>(nullptr),
                                                         static_cast<const std::vector<std::uint32_t>*>(&everyThird)}) {
            SCOPED_TRACE(subset ? "every third" : "all");
            Points deltas(subset ? subset->size() : count), wanted(count, {-7, -7, -7});
            for (std::size_t k = 0; k < deltas.size(); ++k)
                deltas[k] = {0.01F * static_cast<float>(k % 7), -0.02F, 0.003F * static_cast<float>(k % 5)};
            frames.transportDeltas(wanted, deltas, mesh.points, restInverse, positions, subset);
            quill::SurfaceTransport transport;
            transport.build(frames, mesh.points, restInverse, count, subset);
            EXPECT_EQ(transport.size(), deltas.size());
            forEverySet([&] {
                Points got(count, {-7, -7, -7});
                transport.run(got, deltas, rows);
                EXPECT_EQ(firstOther(wanted, got), count);
            });
        }
        Points untouched(count + 1);
        quill::SurfaceTransport transport;
        transport.build(frames, mesh.points, restInverse, count, nullptr);
        transport.run(untouched, Points(count), rows);
        EXPECT_EQ(untouched, Points(count + 1)) << "arrays of other sizes are left alone";
        if (count > 0) {
            restInverse.pop_back();
            EXPECT_THROW(transport.build(frames, mesh.points, restInverse, count, nullptr), std::length_error);
            EXPECT_EQ(transport.size(), 0U);
        }
    }
}

} // namespace
