// SPDX-License-Identifier: Apache-2.0
#include "sumShapes.h"

#include "half.h"

namespace neuralWarp {

void sumShapesPlain(float* sums, const float* block, const float* coefficients, std::size_t shapes) {
    constexpr std::size_t components = 48;
    float sum[components] = {}; // NOLINT(modernize-avoid-c-arrays): stays in registers
    for (std::size_t j = 0; j < shapes; ++j, block += components)
        for (std::size_t i = 0; i < components; ++i)
            sum[i] += coefficients[j] * block[i];
    for (std::size_t i = 0; i < components; ++i)
        sums[i] = sum[i];
}

void sumHalfShapesPlain(float* sums, const std::uint16_t* block, const float* scales, const float* coefficients,
                        std::size_t shapes) {
    constexpr std::size_t components = 48;
    float sum[components] = {}; // NOLINT(modernize-avoid-c-arrays): stays in registers
    for (std::size_t j = 0; j < shapes; ++j, block += components)
        for (std::size_t i = 0; i < components; ++i)
            sum[i] += coefficients[j] * (scales[j] * decodeHalf(block[i]));
    for (std::size_t i = 0; i < components; ++i)
        sums[i] = sum[i];
}

SumShapes sumShapes([[maybe_unused]] quill::InstructionSet set) {
#if defined(__x86_64__)
    if (set >= quill::InstructionSet::avx)
        return sumShapesAvx;
#elif defined(__wasm_simd128__)
    return sumShapesSimd128;
#endif
    return sumShapesPlain;
}

SumHalfShapes sumHalfShapes([[maybe_unused]] quill::InstructionSet set) {
#if defined(__x86_64__)
    if (set >= quill::InstructionSet::avx2)
        return sumHalfShapesF16c;
#endif
    return sumHalfShapesPlain;
}

} // namespace neuralWarp
