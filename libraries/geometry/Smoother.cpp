// SPDX-License-Identifier: Apache-2.0
#include "quill/Smoother.h"

#include "nearOrder.h"
#include "quill/parallelFor.h"
#include "rows.h"

#include <tbb/task_arena.h>

#include <algorithm>
#include <array>
#include <span>
#include <stdexcept>

namespace quill {
namespace {

// So many passes go over the mesh together: their blocks have to stay in the cache side by side.
constexpr std::size_t passesTogether = 10;
constexpr std::size_t smallestBlock = 16;
// Below this many quads one thread is done before others have begun.
constexpr std::size_t fewestForThreads = 1024;
// A mesh whose neighbours are farther apart is put into another order.
constexpr std::size_t farthestAsItIs = 2048;

// Several passes over a mesh in blocks, which a pass may do as soon as the one before has done the block, and the ones
// beside it (time skewing: Wonnacott, Using Time Skewing to Eliminate Idle Time due to Memory Bandwidth and Network
// Limitations, 2000). Pass p = 1, 2, ... reads buffer (p - 1) % 2 and writes p % 2.
class PassesTogether {
public:
    PassesTogether(const std::vector<RowQuad>& quads, const std::vector<NeighbourQuad>& neighbours,
                   std::size_t blockSize, std::array<PaddedPoint*, 2> buffers)
        : quads_(quads)
        , neighbours_(neighbours)
        , blockSize_(blockSize)
        , buffers_(buffers) {}

    std::size_t blockCount() const { return (quads_.size() + blockSize_ - 1) / blockSize_; }

    // The result is in buffer passes % 2.
    void run(std::size_t passes, std::size_t parts) const {
        const std::size_t mostParts = std::max<std::size_t>(1, blockCount() / (2 * passes + 1));
        if (mostParts < parts && quads_.size() > fewestForThreads)
            runOneByOne(passes);
        else
            runTogether(passes, std::min(parts, mostParts));
    }

private:
    // For meshes whose neighbours are far apart in every order.
    void runOneByOne(std::size_t passes) const {
        for (std::size_t pass = 1; pass <= passes; ++pass)
            parallelForRange(quads_.size(), [&](int begin, int end) {
                kernel_(quads_.data(), neighbours_.data(), buffers_[(pass - 1) % 2], buffers_[pass % 2],
                        static_cast<std::size_t>(begin), static_cast<std::size_t>(end));
            });
    }

    // Every part of the mesh goes as far as it can without what others do; then the seams between them are done.
    void runTogether(std::size_t passes, std::size_t parts) const {
        const std::size_t blocks = blockCount();
        const auto border = [&](std::size_t part) { return blocks * part / parts; };
        parallelFor(parts, [&](std::size_t part) {
            const std::size_t left = border(part), right = border(part + 1);
            for (std::size_t step = left; step < right + passes; ++step)
                for (std::size_t pass = 1; pass <= passes && step + 1 >= left + pass; ++pass) {
                    const std::size_t block = step + 1 - pass;
                    const std::size_t leftInset = part == 0 ? 0 : pass - 1,
                                      rightInset = part + 1 == parts ? 0 : pass - 1;
                    if (block >= left + leftInset && block + rightInset < right)
                        runBlock(pass, block);
                }
        });
        parallelFor(parts - 1, [&](std::size_t seam) {
            const std::size_t at = border(seam + 1);
            for (std::size_t pass = 2; pass <= passes; ++pass)
                for (std::size_t block = at - (pass - 1); block < at + (pass - 1); ++block)
                    runBlock(pass, block);
        });
    }

    void runBlock(std::size_t pass, std::size_t block) const {
        const std::size_t begin = block * blockSize_;
        kernel_(quads_.data(), neighbours_.data(), buffers_[(pass - 1) % 2], buffers_[pass % 2], begin,
                std::min(begin + blockSize_, quads_.size()));
    }

    const std::vector<RowQuad>& quads_;
    const std::vector<NeighbourQuad>& neighbours_;
    std::size_t blockSize_; // in quads
    std::array<PaddedPoint*, 2> buffers_;
    RowsKernel kernel_ = rowsKernel(instructionSet());
};

} // namespace

Smoother::Smoother() = default;
Smoother::~Smoother() = default;
Smoother::Smoother(Smoother&& other) noexcept = default;
Smoother& Smoother::operator=(Smoother&& other) noexcept = default;

void Smoother::build(const VertexConnections& connections, const std::vector<float>& weights, std::size_t vertexCount) {
    *this = {};
    const std::vector<std::uint32_t>& from = connections.connections();
    const std::vector<std::uint32_t>& fromIndexer = connections.connectionsIndexer();
    const std::size_t connected = connections.vertexCount();
    if (weights.size() < from.size() || vertexCount < connected)
        throw std::length_error("quill: fewer weights or points than connections");
    std::size_t reach = farthestNeighbour(from, fromIndexer, {});
    std::vector<std::uint32_t> order, placeOf;
    if (reach > farthestAsItIs) {
        order = nearOrder(from, fromIndexer, vertexCount);
        placeOf.resize(vertexCount);
        for (std::size_t place = 0; place < vertexCount; ++place)
            placeOf[order[place]] = static_cast<std::uint32_t>(place);
        reach = farthestNeighbour(from, fromIndexer, placeOf);
    }
    std::vector<RowQuad> quads((vertexCount + rowLanes - 1) / rowLanes);
    std::vector<NeighbourQuad> neighbours;
    neighbours.reserve(from.size() / rowLanes);
    for (std::size_t q = 0; q < quads.size(); ++q) {
        std::array<std::span<const std::uint32_t>, rowLanes> lists;
        RowQuad& quad = quads[q];
        quad = {neighbours.size(), ~0U, 0, {}};
        for (std::size_t j = 0; j < rowLanes; ++j) {
            const std::size_t place = rowLanes * q + j;
            const std::size_t v = place < vertexCount && !order.empty() ? order[place] : place;
            if (v < connected)
                lists[j] = {from.data() + fromIndexer[v], from.data() + fromIndexer[v + 1]};
            quad.fewest = std::min(quad.fewest, static_cast<std::uint32_t>(lists[j].size()));
            quad.most = std::max(quad.most, static_cast<std::uint32_t>(lists[j].size()));
            quad.count[j] = static_cast<float>(static_cast<std::int32_t>(lists[j].size()));
        }
        for (std::size_t k = 0; k < quad.most; ++k) {
            NeighbourQuad& neighbour = neighbours.emplace_back();
            for (std::size_t j = 0; j < rowLanes; ++j) {
                neighbour.vertex[j] = static_cast<std::uint32_t>(rowLanes * q + j);
                if (k < lists[j].size()) {
                    neighbour.vertex[j] = placeOf.empty() ? lists[j][k] : placeOf[lists[j][k]];
                    neighbour.weight[j] = weights[static_cast<std::size_t>(&lists[j][k] - from.data())];
                }
            }
        }
    }
    vertexCount_ = vertexCount;
    blockSize_ = std::max(smallestBlock, (reach + rowLanes - 1) / rowLanes);
    order_ = std::move(order);
    quads_ = std::move(quads);
    neighbours_ = std::move(neighbours);
}

std::size_t Smoother::bytes() const {
    return order_.capacity() * sizeof(std::uint32_t) + quads_.capacity() * sizeof(RowQuad) +
           neighbours_.capacity() * sizeof(NeighbourQuad);
}

void Smoother::run(const std::vector<val3<float>>& points, std::size_t passes, PaddedPoints& out, Scratch& scratch,
                   const WorkWatch& watch) const {
    if (points.size() != vertexCount_)
        return;
    const std::uint32_t* const order = order_.empty() ? nullptr : order_.data();
    PaddedPoints& first = order ? scratch.a : out;
    first.resize(rowLanes * quads_.size());
    scratch.b.resize(rowLanes * quads_.size());
    parallelFor(
        vertexCount_,
        [&, to = first.data(), from = points.data()](std::size_t place) {
            const val3<float>& p = from[order ? order[place] : place];
            to[place] = {p.x, p.y, p.z, 0.0F};
        },
        copyGrain);
    const auto parts = static_cast<std::size_t>(std::max(1, tbb::this_task_arena::max_concurrency()));
    for (std::size_t left = passes; left > 0;) {
        if (watch.isCancelled && watch.isCancelled())
            throw Cancelled();
        const std::size_t now = std::min(left, passesTogether);
        PassesTogether(quads_, neighbours_, blockSize_, {first.data(), scratch.b.data()}).run(now, parts);
        if (now % 2 == 1)
            first.swap(scratch.b);
        left -= now;
    }
    if (!order) {
        out.resize(vertexCount_);
        return;
    }
    out.resize(vertexCount_);
    parallelFor(
        vertexCount_, [&, to = out.data(), from = first.data()](std::size_t place) { to[order[place]] = from[place]; },
        copyGrain);
}

RowsKernel rowsKernel([[maybe_unused]] InstructionSet set) {
#if defined(__x86_64__)
    if (set >= InstructionSet::avx512)
        return smoothRowsAvx512;
    if (set >= InstructionSet::avx2)
        return smoothRowsAvx2;
#endif
    return smoothRowsScalar;
}

} // namespace quill
