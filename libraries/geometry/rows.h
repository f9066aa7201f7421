// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/InstructionSet.h"
#include "quill/PaddedPoints.h"

#include <array>
#include <cstddef>
#include <cstdint>

namespace quill {

// As many vertices as a kernel works on side by side.
constexpr std::size_t rowLanes = 4;

// The k-th neighbours of four vertices that follow each other, and their weights; a vertex without a k-th one has
// itself.
struct NeighbourQuad {
    std::array<std::uint32_t, rowLanes> vertex;
    std::array<float, rowLanes> weight;
};

// Four vertices. Lanes beyond the last vertex have no neighbours, and there are points for them.
struct RowQuad {
    std::size_t firstQuad; // index into the neighbours
    std::uint32_t fewest, most;
    std::array<float, rowLanes> count; // of neighbours
};

// One pass of the deformer's own smoothing over padded points: all the way to the weighted mean of a vertex's
// neighbours, which is their sum in their order divided by their number; a vertex without any stays. For the quads
// begin .. end - 1. The operations on each component, and their order, are those of SmoothingKernel.
using RowsKernel = void (*)(const RowQuad* quads, const NeighbourQuad* neighbours, const PaddedPoint* source,
                            PaddedPoint* destination, std::size_t begin, std::size_t end);

void smoothRowsScalar(const RowQuad* quads, const NeighbourQuad* neighbours, const PaddedPoint* source,
                      PaddedPoint* destination, std::size_t begin, std::size_t end);
// Only on x86-64, and only to be called where the processor has AVX2.
void smoothRowsAvx2(const RowQuad* quads, const NeighbourQuad* neighbours, const PaddedPoint* source,
                    PaddedPoint* destination, std::size_t begin, std::size_t end);
// Only on x86-64, and only to be called where the processor has AVX-512F.
void smoothRowsAvx512(const RowQuad* quads, const NeighbourQuad* neighbours, const PaddedPoint* source,
                      PaddedPoint* destination, std::size_t begin, std::size_t end);

// The one for an instruction set, which the processor must have.
RowsKernel rowsKernel(InstructionSet set);

} // namespace quill
