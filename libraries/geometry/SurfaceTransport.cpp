// SPDX-License-Identifier: Apache-2.0
#include "quill/SurfaceTransport.h"

#include "quill/largePages.h"
#include "quill/parallelFor.h"
#include "transport.h"

#include <algorithm>
#include <stdexcept>
#include <utility>

namespace quill {

SurfaceTransport::SurfaceTransport() = default;
SurfaceTransport::~SurfaceTransport() = default;
SurfaceTransport::SurfaceTransport(SurfaceTransport&& other) noexcept = default;
SurfaceTransport& SurfaceTransport::operator=(SurfaceTransport&& other) noexcept = default;

void SurfaceTransport::build(const VertexFrames& frames, const std::vector<val3<float>>& restPoints,
                             const std::vector<mat4d>& restFramesInverse, std::size_t vertexCount,
                             const std::vector<std::uint32_t>* subset) {
    *this = {};
    if (std::min({restPoints.size(), restFramesInverse.size()}) < vertexCount || frames.vertexCount() > vertexCount)
        throw std::length_error("quill: fewer rest points or frames than vertices");
    const std::vector<std::uint32_t>& indexer = frames.framesIndexer();
    const auto countOf = [&](std::size_t v) {
        return v < frames.vertexCount() ? (indexer[v + 1] - indexer[v]) / 2 : 0;
    };
    const std::size_t listed = subset ? subset->size() : vertexCount;
    std::vector<TransportBlock> blocks((listed + transportLanes - 1) / transportLanes);
    std::size_t pairs = 0;
    for (std::size_t b = 0; b < blocks.size(); ++b) {
        TransportBlock& block = blocks[b];
        for (std::size_t j = 0; j < transportLanes; ++j) {
            const std::size_t k = transportLanes * b + j;
            const std::size_t at = k < listed ? k : transportLanes * b;
            block.vertex[j] = subset ? (*subset)[at] : static_cast<std::uint32_t>(at);
            block.pairCount[j] = countOf(block.vertex[j]);
        }
        block.firstPair = pairs;
        block.fewest = *std::min_element(block.pairCount.begin(), block.pairCount.end());
        block.most = *std::max_element(block.pairCount.begin(), block.pairCount.end());
        pairs += 2 * transportLanes * static_cast<std::size_t>(block.most);
    }
    std::vector<std::uint32_t> pairTable;
    std::vector<float> rest;
    std::vector<double> inverses;
    resizeInLargePages(pairTable, pairs);
    resizeInLargePages(rest, 3 * transportLanes * blocks.size());
    resizeInLargePages(inverses, 12 * transportLanes * blocks.size());
    for (std::size_t b = 0; b < blocks.size(); ++b) {
        const TransportBlock& block = blocks[b];
        for (std::size_t j = 0; j < transportLanes; ++j) {
            const std::uint32_t v = block.vertex[j];
            for (std::size_t k = 0; k < block.most; ++k)
                for (std::size_t side = 0; side < 2; ++side)
                    pairTable[block.firstPair + (2 * k + side) * transportLanes + j] =
                        k < block.pairCount[j] ? frames.framesPairs()[indexer[v] + 2 * k + side] : v;
            for (std::size_t c = 0; c < 3; ++c) {
                rest[(3 * b + c) * transportLanes + j] = restPoints[v][c];
                for (std::size_t r = 0; r < 4; ++r)
                    inverses[(12 * b + 4 * c + r) * transportLanes + j] = restFramesInverse[v](r, c);
            }
        }
    }
    SharedArray<TransportBlock> sharedBlocks(std::move(blocks));
    SharedArray<std::uint32_t> sharedPairs(std::move(pairTable));
    SharedArray<float> sharedRest(std::move(rest));
    inverses_ = std::move(inverses);
    blocks_ = std::move(sharedBlocks);
    pairs_ = std::move(sharedPairs);
    rest_ = std::move(sharedRest);
    vertexCount_ = vertexCount;
    listed_ = listed;
    isIdentity_ = !subset;
}

std::size_t SurfaceTransport::bytes() const {
    return blocks_.capacity() * sizeof(TransportBlock) + pairs_.capacity() * sizeof(std::uint32_t) +
           rest_.capacity() * sizeof(float) + inverses_.capacity() * sizeof(double);
}

void SurfaceTransport::run(std::vector<val3<float>>& out, const std::vector<val3<float>>& deltas,
                           const PaddedPoints& positions) const {
    if (out.size() != vertexCount_ || positions.size() != vertexCount_ || deltas.size() != listed_)
        return;
    const TransportTables tables{blocks_.data(), pairs_.data(), rest_.data(), inverses_.data(), listed_, isIdentity_};
    const TransportKernel kernel = transportKernel(instructionSet());
    constexpr std::size_t grain = copyGrain / 4 / transportLanes; // a frame takes longer than a copy
    parallelForRange(
        blocks_.size(),
        [&](int begin, int end) {
            kernel(tables, &positions.data()->x, deltas.data(), out.data(), static_cast<std::size_t>(begin),
                   static_cast<std::size_t>(end));
        },
        grain);
}

TransportKernel transportKernel([[maybe_unused]] InstructionSet set) {
#if defined(__x86_64__)
    if (set >= InstructionSet::avx2)
        return transportAvx2;
#endif
    return transportScalar;
}

} // namespace quill
