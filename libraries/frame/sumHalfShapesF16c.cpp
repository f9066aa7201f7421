// SPDX-License-Identifier: Apache-2.0
// Compiled for F16C: a block takes half the memory, and is decoded on its way into the registers.
#include "sumShapes.h"

#include <immintrin.h>

namespace neuralWarp {

void sumHalfShapesF16c(float* sums, const std::uint16_t* block, const float* scales, const float* coefficients,
                       std::size_t shapes) {
    constexpr std::size_t registers = 6;
    __m256 sum[registers]; // NOLINT(modernize-avoid-c-arrays): std::array would drop the attributes of the type
    for (__m256& s : sum)
        s = _mm256_setzero_ps();
    for (std::size_t j = 0; j < shapes; ++j, block += 8 * registers) {
        const __m256 coefficient = _mm256_broadcast_ss(coefficients + j), scale = _mm256_broadcast_ss(scales + j);
#pragma GCC unroll 6
        for (std::size_t r = 0; r < registers; ++r) {
            const __m256 half = _mm256_cvtph_ps(_mm_loadu_si128(reinterpret_cast<const __m128i*>(block + 8 * r)));
            sum[r] = _mm256_add_ps(sum[r], _mm256_mul_ps(coefficient, _mm256_mul_ps(scale, half)));
        }
    }
#pragma GCC unroll 6
    for (std::size_t r = 0; r < registers; ++r)
        _mm256_storeu_ps(sums + 8 * r, sum[r]);
}

} // namespace neuralWarp
