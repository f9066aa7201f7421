// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/InstructionSet.h"

#include <cstddef>
#include <cstdint>

namespace neuralWarp {

// Sums of a block of PrincipalBasis: sums [3][16], block [shapes][3][16]. Every kernel adds the same products in the
// same order.
using SumShapes = void (*)(float* sums, const float* block, const float* coefficients, std::size_t shapes);

void sumShapesPlain(float* sums, const float* block, const float* coefficients, std::size_t shapes);
// Only on x86-64, and only to be called where the processor has AVX.
void sumShapesAvx(float* sums, const float* block, const float* coefficients, std::size_t shapes);
// Only for WebAssembly with vectors.
void sumShapesSimd128(float* sums, const float* block, const float* coefficients, std::size_t shapes);

// The same of halves, each multiplied by the scale of its shape first, in single precision: the sums that the floats
// have which are stored for them. scales [shapes]; all halves finite.
using SumHalfShapes = void (*)(float* sums, const std::uint16_t* block, const float* scales, const float* coefficients,
                               std::size_t shapes);

void sumHalfShapesPlain(float* sums, const std::uint16_t* block, const float* scales, const float* coefficients,
                        std::size_t shapes);
// Only on x86-64, and only to be called where the processor has AVX2 and F16C.
void sumHalfShapesF16c(float* sums, const std::uint16_t* block, const float* scales, const float* coefficients,
                       std::size_t shapes);

// The one for an instruction set, which the processor must have.
SumShapes sumShapes(quill::InstructionSet set);
SumHalfShapes sumHalfShapes(quill::InstructionSet set);

} // namespace neuralWarp
