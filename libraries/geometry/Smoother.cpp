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

// What the first pass starts from and the last one leaves, both in the order of vertices; null: in the buffers.
struct Ends {
    const val3<float>* points = nullptr;
    PaddedPoint* out = nullptr;
};

// Several passes over a mesh in blocks, which a pass may do as soon as the one before has done the block, and the ones
// beside it (time skewing: Wonnacott, Using Time Skewing to Eliminate Idle Time due to Memory Bandwidth and Network
// Limitations, 2000). Pass p = 1, 2, ... reads buffer (p - 1) % 2 and writes p % 2; pass 0 puts points into buffer 0.
class PassesTogether {
public:
    // order: [vertexCount] the vertex at each place, or null
    PassesTogether(const std::vector<RowQuad>& quads, const std::vector<NeighbourQuad>& neighbours,
                   std::size_t blockSize, std::size_t vertexCount, const std::uint32_t* order)
        : quads_(quads)
        , neighbours_(neighbours)
        , blockSize_(blockSize)
        , vertexCount_(vertexCount)
        , order_(order) {}

    // What `ends` does not take is in buffer passes % 2.
    void run(std::size_t passes, std::size_t parts, std::array<PaddedPoint*, 2> buffers, const Ends& ends) {
        last_ = passes;
        buffers_ = buffers;
        ends_ = ends;
        const std::size_t mostParts = std::max<std::size_t>(1, blockCount() / (2 * passes + 3));
        if (mostParts < parts && quads_.size() > fewestForThreads)
            runOneByOne();
        else
            runTogether(std::min(parts, mostParts));
    }

private:
    std::size_t blockCount() const { return (quads_.size() + blockSize_ - 1) / blockSize_; }

    // For meshes whose neighbours are far apart in every order.
    void runOneByOne() const {
        for (std::size_t pass = 0; pass <= last_; ++pass)
            parallelForRange(quads_.size(), [&](int begin, int end) {
                runQuads(pass, static_cast<std::size_t>(begin), static_cast<std::size_t>(end));
            });
    }

    // Every part of the mesh goes as far as it can without what others do; then the seams between them are done.
    void runTogether(std::size_t parts) const {
        const std::size_t blocks = blockCount();
        const auto border = [&](std::size_t part) { return blocks * part / parts; };
        parallelFor(parts, [&](std::size_t part) {
            const std::size_t left = border(part), right = border(part + 1);
            for (std::size_t step = left; step < right + last_; ++step)
                for (std::size_t pass = 0; pass <= last_ && step >= left + pass; ++pass) {
                    const std::size_t block = step - pass;
                    const std::size_t leftInset = part == 0 ? 0 : pass, rightInset = part + 1 == parts ? 0 : pass;
                    if (block >= left + leftInset && block + rightInset < right)
                        runBlock(pass, block);
                }
        });
        parallelFor(parts - 1, [&](std::size_t seam) {
            const std::size_t at = border(seam + 1);
            for (std::size_t pass = 1; pass <= last_; ++pass)
                for (std::size_t block = at - pass; block < at + pass; ++block)
                    runBlock(pass, block);
        });
    }

    void runBlock(std::size_t pass, std::size_t block) const {
        const std::size_t begin = block * blockSize_;
        runQuads(pass, begin, std::min(begin + blockSize_, quads_.size()));
    }

    void runQuads(std::size_t pass, std::size_t begin, std::size_t end) const {
        if (pass == 0)
            takeIn(rowLanes * begin, std::min(rowLanes * end, vertexCount_));
        else
            kernel_(quads_.data(), neighbours_.data(), buffers_[(pass - 1) % 2], buffers_[pass % 2], begin, end);
        if (pass == last_)
            putOut(rowLanes * begin, std::min(rowLanes * end, vertexCount_));
    }

    // The places begin .. end - 1. Done block by block beside the passes, whose arithmetic hides how long points that
    // lie all over the memory take.
    void takeIn(std::size_t begin, std::size_t end) const {
        for (std::size_t place = begin; ends_.points && place < end; ++place) {
            const val3<float>& p = ends_.points[order_ ? order_[place] : place];
            buffers_[0][place] = {p.x, p.y, p.z, 0.0F};
        }
    }
    void putOut(std::size_t begin, std::size_t end) const {
        for (std::size_t place = begin; ends_.out && place < end; ++place)
            ends_.out[order_ ? order_[place] : place] = buffers_[last_ % 2][place];
    }

    const std::vector<RowQuad>& quads_;
    const std::vector<NeighbourQuad>& neighbours_;
    std::size_t blockSize_; // in quads
    std::size_t vertexCount_;
    const std::uint32_t* order_;
    RowsKernel kernel_ = rowsKernel(instructionSet());
    std::size_t last_ = 0;
    std::array<PaddedPoint*, 2> buffers_{};
    Ends ends_;
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
    SharedArray<std::uint32_t> sharedOrder(std::move(order));
    SharedArray<RowQuad> sharedQuads(std::move(quads));
    neighbours_ = std::move(neighbours);
    order_ = std::move(sharedOrder);
    quads_ = std::move(sharedQuads);
    vertexCount_ = vertexCount;
    blockSize_ = std::max(smallestBlock, (reach + rowLanes - 1) / rowLanes);
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
    // points in an order of their own are put into `out` at last, others are there already
    PaddedPoints& first = order ? scratch.a : out;
    first.resize(rowLanes * quads_.size());
    scratch.b.resize(rowLanes * quads_.size());
    if (order)
        out.resize(vertexCount_);
    const auto parts = static_cast<std::size_t>(std::max(1, tbb::this_task_arena::max_concurrency()));
    PassesTogether together(quads_, neighbours_, blockSize_, vertexCount_, order);
    std::size_t done = 0;
    do {
        if (watch.isCancelled && watch.isCancelled())
            throw Cancelled();
        const std::size_t now = std::min(passes - done, passesTogether);
        together.run(now, parts, {first.data(), scratch.b.data()},
                     {done == 0 ? points.data() : nullptr, order && done + now == passes ? out.data() : nullptr});
        if (now % 2 == 1)
            first.swap(scratch.b);
        done += now;
    } while (done < passes);
    out.resize(vertexCount_);
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
