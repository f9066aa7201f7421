// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/InstructionSet.h"
#include "quill/val3.h"

#include <cstddef>
#include <cstdint>

namespace quill {

// One pass of neighbour averaging, described by plain pointers into checked tables: indexer[i] .. indexer[i + 1] are
// entries of connections (and weights), and every connection is below the number of source points.
struct SmoothingPass {
    const std::uint32_t* connections;
    const std::uint32_t* indexer; // [vertexCount + 1]
    std::size_t vertexCount;      // vertices from here on are copied
    const std::uint8_t* mask;     // may be null: nothing pinned
    const float* weights;         // may be null: all 1
    float step;
    bool wholeStep; // step is 1
    bool includeSelf;
};

// Runs the pass for the vertices begin .. end - 1. All kernels do the same single-precision operations in the same
// order for each component, so that their results are the same to the bit.
using SmoothingKernel = void (*)(const SmoothingPass& pass, const val3<float>* source, val3<float>* destination,
                                 std::size_t begin, std::size_t end);

void smoothScalar(const SmoothingPass& pass, const val3<float>* source, val3<float>* destination, std::size_t begin,
                  std::size_t end);
// Only on x86-64, and only to be called where the processor has AVX.
void smoothAvx(const SmoothingPass& pass, const val3<float>* source, val3<float>* destination, std::size_t begin,
               std::size_t end);

// Only on x86-64, and only to be called where the processor has AVX-512VL.
void smoothAvx512(const SmoothingPass& pass, const val3<float>* source, val3<float>* destination, std::size_t begin,
                  std::size_t end);

// The one for an instruction set, which the processor must have.
SmoothingKernel smoothingKernel(InstructionSet set);

} // namespace quill
