// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/InstructionSet.h"
#include "quill/val3.h"

#include <array>
#include <cstddef>
#include <cstdint>

namespace quill {

// As many vertices as a kernel works on side by side.
constexpr std::size_t transportLanes = 8;

// Eight listed vertices. Lanes beyond the end of the list stand for the block's first vertex, and are not stored.
struct TransportBlock {
    std::size_t firstPair;                               // index into TransportTables::pairs
    std::uint32_t fewest, most;                          // pairs of a lane
    std::array<std::uint32_t, transportLanes> pairCount; // of each lane
    std::array<std::uint32_t, transportLanes> vertex;    // of each lane
};

// What a kernel reads, as plain pointers into checked tables.
struct TransportTables {
    const TransportBlock* blocks;
    const std::uint32_t*
        pairs;              // [most][2][8] of each block: a and b of the k-th pair of each lane, padded by the vertex
    const float* rest;      // [blocks][3][8] points at rest
    const double* inverses; // [blocks][12][8] rest frames inverse: columns 0 to 2, each from row 0 to row 3
    std::size_t listed;     // how many vertices there are in all blocks
    bool isIdentity;        // the k-th listed vertex is vertex k
};

// Carries the listed vertices of the blocks begin .. end - 1: out[v] for vertex v, from deltas[k] of its place k in the
// list, on the frames of `rows`, which are points of four floats each. All kernels do the operations of
// transportDelta() and of a vertex frame in the same order, so that their results are the same to the bit.
using TransportKernel = void (*)(const TransportTables& tables, const float* rows, const val3<float>* deltas,
                                 val3<float>* out, std::size_t begin, std::size_t end);

void transportScalar(const TransportTables& tables, const float* rows, const val3<float>* deltas, val3<float>* out,
                     std::size_t begin, std::size_t end);
// Only on x86-64, and only to be called where the processor has AVX2.
void transportAvx2(const TransportTables& tables, const float* rows, const val3<float>* deltas, val3<float>* out,
                   std::size_t begin, std::size_t end);

// The one for an instruction set, which the processor must have.
TransportKernel transportKernel(InstructionSet set);

} // namespace quill
