// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/InstructionSet.h"

#include <cstddef>

namespace neuralWarp {

// Sums of a block of PrincipalBasis: sums [3][16], block [shapes][3][16]. Every kernel adds the same products in the
// same order.
using SumShapes = void (*)(float* sums, const float* block, const float* coefficients, std::size_t shapes);

void sumShapesPlain(float* sums, const float* block, const float* coefficients, std::size_t shapes);
// Only on x86-64, and only to be called where the processor has AVX.
void sumShapesAvx(float* sums, const float* block, const float* coefficients, std::size_t shapes);

// The one for an instruction set, which the processor must have.
SumShapes sumShapes(quill::InstructionSet set);

} // namespace neuralWarp
