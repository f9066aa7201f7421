// SPDX-License-Identifier: Apache-2.0
// The same bits from 1, 2 and 7 threads and from run to run, on meshes large enough to be cut among them.
#include "support/meshZoo.h"

#include "quill/VertexConnections.h"
#include "quill/VertexFrames.h"
#include "quill/bulk.h"
#include "quill/parallelFor.h"

#include <gtest/gtest.h>

#include <tbb/global_control.h>
#include <tbb/task_arena.h>

#include <atomic>
#include <chrono>
#include <cstdint>
#include <mutex>
#include <set>
#include <thread>

namespace {

using Points = std::vector<quill::val3<float>>;

// FNV-1a, 64 bits.
template <typename T>
void hash(std::uint64_t& state, const std::vector<T>& values) {
    const auto* bytes = reinterpret_cast<const unsigned char*>(values.data());
    for (std::size_t i = 0; i < values.size() * sizeof(T); ++i)
        state = (state ^ bytes[i]) * 1099511628211ULL;
}

// Every parallel operation of the library on one mesh, hashed.
std::uint64_t hashEverything(const ZooMesh& mesh) {
    std::uint64_t state = 14695981039346656037ULL;
    quill::IndexMapper map;
    map.setIdentity(mesh.vertexCount());
    quill::VertexConnections connections;
    connections.build(mesh.topology(), map, 0, false);
    hash(state, connections.connections());
    std::vector<float> weights;
    connections.calculateConnectionWeights(weights, mesh.points, 1.3, 0.0);
    hash(state, weights);
    Points smoothed = mesh.points, scratch;
    connections.mushArray(smoothed, scratch, 7, 0.9F, nullptr, &weights, false);
    hash(state, smoothed);

    quill::VertexFrames vertexFrames;
    vertexFrames.build(mesh.topology(), map, &mesh.points);
    std::vector<quill::mat4d> frames, smoothFrames;
    vertexFrames.calculateFrames(frames, smoothed, map, true, nullptr);
    vertexFrames.calculateFrames(smoothFrames, smoothed, connections.connectionsIndexer(), connections.connections(),
                                 weights, 2, map, false, nullptr);
    vertexFrames.calculateDisplacements(mesh.points, smoothed, scratch);
    hash(state, scratch);
    quill::multAsPoint(smoothed, frames[17]);
    quill::multFrames(frames, smoothFrames[3]);
    quill::invertFrames(smoothFrames);
    std::vector<float> floats;
    quill::convertToFloatArray(frames, floats);
    hash(state, smoothed);
    hash(state, floats);
    hash(state, smoothFrames);
    return state;
}

// How many threads take part in one of the library's loops. Each part of the range waits, for a bounded time, until a
// second thread has come, so that the count does not depend on how busy the machine is.
std::size_t threadsInALoop() {
    std::mutex mutex;
    std::set<std::thread::id> threads;
    std::atomic<bool> enough = false;
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
    quill::parallelFor(1000, [&](std::size_t) {
        {
            const std::lock_guard lock(mutex);
            threads.insert(std::this_thread::get_id());
            enough = enough || threads.size() > 1;
        }
        while (!enough && std::chrono::steady_clock::now() < deadline)
            std::this_thread::yield();
    });
    return threads.size();
}

TEST(ParallelFor, VisitsEachIndexOnceAndStartsNobodyForLittle) {
    for (const std::size_t grain : {0U, 1U, 100U, 8192U})
        for (const std::size_t count : {0U, 1U, 99U, 100U, 101U, 8193U, 50000U}) {
            SCOPED_TRACE(std::to_string(count) + " by " + std::to_string(grain));
            std::vector<int> visits(count);
            std::atomic<unsigned> pieces = 0;
            quill::parallelForRange(
                count,
                [&](int begin, int end) {
                    ++pieces;
                    for (int i = begin; i < end; ++i)
                        ++visits[static_cast<std::size_t>(i)];
                },
                grain);
            EXPECT_EQ(visits, std::vector<int>(count, 1));
            EXPECT_LE(pieces, std::max<std::size_t>(1, grain > 0 ? 2 * count / grain : count));
        }
}

TEST(Determinism, EqualBitsForEveryNumberOfThreadsAndEveryRun) {
    const ZooMesh grid = makeGrid(400, 300);
    std::set<std::uint64_t> hashes;
    for (const ZooMesh& mesh : {grid, shuffled(grid, 9)}) {
        ASSERT_GE(mesh.vertexCount(), 100000U);
        for (const std::size_t threads : {1U, 2U, 7U}) {
            const tbb::global_control limit(tbb::global_control::max_allowed_parallelism, threads);
            tbb::task_arena arena(static_cast<int>(threads)); // more slots than cores, if need be
            arena.execute([&] {
                if (threads > 1) {
                    EXPECT_GE(threadsInALoop(), 2U) << "the comparison would compare one thread with itself";
                }
                hashes.insert(hashEverything(mesh));
                hashes.insert(hashEverything(mesh));
            });
        }
    }
    EXPECT_EQ(hashes.size(), 2U) << "one for each mesh";
}

} // namespace
