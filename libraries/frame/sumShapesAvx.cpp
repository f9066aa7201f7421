// SPDX-License-Identifier: Apache-2.0
// Compiled for AVX: the 48 sums of a block are six registers, and the processor's own prefetching follows the one
// stream that is read.
#include "sumShapes.h"

#include <immintrin.h>

namespace neuralWarp {

void sumShapesAvx(float* sums, const float* block, const float* coefficients, std::size_t shapes) {
    constexpr std::size_t registers = 6;
    __m256 sum[registers]; // NOLINT(modernize-avoid-c-arrays): std::array would drop the attributes of the type
    for (__m256& s : sum)
        s = _mm256_setzero_ps();
    for (std::size_t j = 0; j < shapes; ++j, block += 8 * registers) {
        const __m256 coefficient = _mm256_broadcast_ss(coefficients + j);
#pragma GCC unroll 6
        for (std::size_t r = 0; r < registers; ++r)
            sum[r] = _mm256_add_ps(sum[r], _mm256_mul_ps(coefficient, _mm256_loadu_ps(block + 8 * r)));
    }
#pragma GCC unroll 6
    for (std::size_t r = 0; r < registers; ++r)
        _mm256_storeu_ps(sums + 8 * r, sum[r]);
}

} // namespace neuralWarp
