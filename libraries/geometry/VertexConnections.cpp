// SPDX-License-Identifier: Apache-2.0
#include "quill/VertexConnections.h"

#include "edgeNeighbours.h"
#include "quill/parallelFor.h"
#include "smoothing.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <stdexcept>

namespace quill {
namespace {

// Grows one-ring lists by further rings, breadth first; every expansion reads the one-ring lists.
class RingExpander {
public:
    RingExpander(const NeighbourLists& oneRing, std::size_t extraRings, bool includeSelf)
        : oneRing_(oneRing)
        , extraRings_(extraRings)
        , includeSelf_(includeSelf)
        , seenBy_(oneRing.indexer.size() - 1, missingIndex) {}

    NeighbourLists expand() {
        NeighbourLists out;
        out.indexer.reserve(oneRing_.indexer.size());
        out.indexer.push_back(0);
        for (std::size_t v = 0; v < seenBy_.size(); ++v) {
            appendRings(static_cast<std::uint32_t>(v), out.neighbours);
            if (out.neighbours.size() > std::numeric_limits<std::uint32_t>::max())
                throw std::length_error("quill: more than 2^32 - 1 vertex connections");
            out.indexer.push_back(static_cast<std::uint32_t>(out.neighbours.size()));
        }
        return out;
    }

private:
    // The list being built is its own queue: each ring expands what the ring before it appended.
    void appendRings(std::uint32_t vertex, std::vector<std::uint32_t>& out) {
        const auto first = static_cast<std::ptrdiff_t>(out.size());
        for (const std::uint32_t w : oneRing_.of(vertex)) {
            seenBy_[w] = vertex;
            out.push_back(w);
        }
        auto frontier = static_cast<std::size_t>(first);
        for (std::size_t ring = 0; ring < extraRings_ && frontier < out.size(); ++ring)
            for (const std::size_t end = out.size(); frontier < end; ++frontier)
                appendUnseen(vertex, out[frontier], out);
        std::sort(out.begin() + first, out.end());
    }

    void appendUnseen(std::uint32_t vertex, std::uint32_t from, std::vector<std::uint32_t>& out) {
        for (const std::uint32_t w : oneRing_.of(from)) {
            if ((w == vertex && !includeSelf_) || seenBy_[w] == vertex)
                continue;
            seenBy_[w] = vertex;
            out.push_back(w);
        }
    }

    const NeighbourLists& oneRing_;
    const std::size_t extraRings_;
    const bool includeSelf_;
    std::vector<std::uint32_t> seenBy_;
};

double inverseDistance(float distance, double exponent, double offset) {
    const double reach = static_cast<double>(std::max(distance, 0.001F)) + offset;
    // pow(x, 1) is x; the usual exponent needs no call
    return 1.0 / (exponent == 1.0 ? reach : std::pow(reach, exponent));
}

} // namespace

void VertexConnections::build(const MeshTopology& topology, const IndexMapper& map, std::size_t extraRings,
                              bool includeSelf) {
    NeighbourLists lists = edgeNeighbours(topology, map);
    if (extraRings > 0)
        lists = RingExpander(lists, extraRings, includeSelf).expand();
    SharedArray<std::uint32_t> connections(std::move(lists.neighbours));
    connectionsIndexer_ = std::move(lists.indexer);
    connections_ = std::move(connections);
}

void VertexConnections::calculateConnectionWeights(std::vector<float>& weights,
                                                   const std::vector<val3<float>>& positions, double exponent,
                                                   double offset) const {
    if (std::abs(exponent) < 1e-5 || positions.size() < vertexCount()) {
        weights.assign(connections_.size(), 1.0F);
        return;
    }
    weights.resize(connections_.size()); // each entry is some vertex's, and written below
    // plain pointers: after a store to a weight the compiler would load the vectors' own again
    const std::uint32_t* const indexer = connectionsIndexer_.data();
    const std::uint32_t* const connections = connections_.data();
    const val3<float>* const points = positions.data();
    float* const out = weights.data();
    parallelFor(vertexCount(), [=](std::size_t i) {
        const std::uint32_t first = indexer[i];
        const std::uint32_t last = indexer[i + 1];
        if (first == last)
            return;
        const val3<float> here = points[i];
        double sum = 0.0;
        for (std::uint32_t k = first; k < last; ++k) {
            const double weight = inverseDistance(length(here - points[connections[k]]), exponent, offset);
            sum += weight;
            out[k] = static_cast<float>(weight);
        }
        const auto scale = static_cast<float>(static_cast<double>(last - first) / sum);
        for (std::uint32_t k = first; k < last; ++k)
            out[k] *= scale;
    });
}

void VertexConnections::mushArray(std::vector<val3<float>>& positions, std::vector<val3<float>>& scratch,
                                  std::size_t iterations, float step, const std::vector<std::uint8_t>* mask,
                                  const std::vector<float>* weights, bool includeSelf) const {
    if (iterations == 0 || connectionsIndexer_.empty() || !(static_cast<double>(step) >= 1e-6))
        return;
    if (positions.size() < vertexCount() || (mask && mask->size() < positions.size()) ||
        (weights && weights->size() < connections_.size()))
        return;
    if (&positions == &scratch) {
        std::vector<val3<float>> ownScratch;
        mushArray(positions, ownScratch, iterations, step, mask, weights, includeSelf);
        return;
    }
    const SmoothingPass pass{connections_.data(),
                             connectionsIndexer_.data(),
                             vertexCount(),
                             mask ? mask->data() : nullptr,
                             weights ? weights->data() : nullptr,
                             step,
                             equivalent(step, 1.0, 1e-5),
                             includeSelf};
    const SmoothingKernel kernel = smoothingKernel(instructionSet());
    scratch.resize(positions.size());
    for (std::size_t iteration = 0; iteration < iterations; ++iteration) {
        positions.swap(scratch);
        parallelForRange(positions.size(), [&](int begin, int end) {
            kernel(pass, scratch.data(), positions.data(), static_cast<std::size_t>(begin),
                   static_cast<std::size_t>(end));
        });
    }
}

} // namespace quill
