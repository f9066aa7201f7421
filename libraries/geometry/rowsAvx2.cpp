// SPDX-License-Identifier: Apache-2.0
// Compiled for AVX2: two points are one register.
#include "rowsKernel.h"

#include <immintrin.h>

namespace quill {
namespace {

struct Avx2Lanes {
    struct Four {
        __m256 low, high;
    };

    static Four zero() { return {_mm256_setzero_ps(), _mm256_setzero_ps()}; }
    static __m256 two(const float* a, const float* b) {
        return _mm256_insertf128_ps(_mm256_castps128_ps256(_mm_load_ps(a)), _mm_load_ps(b), 1);
    }
    static const float* row(const float* rows, std::uint32_t index) {
        return rows + 4 * static_cast<std::size_t>(index);
    }
    static Four gather(const float* rows, const std::uint32_t* i) {
        return {two(row(rows, i[0]), row(rows, i[1])), two(row(rows, i[2]), row(rows, i[3]))};
    }
    static Four load(const float* p) { return {_mm256_loadu_ps(p), _mm256_loadu_ps(p + 8)}; }
    static Four spread(const float* p) {
        const __m256 twice = _mm256_broadcast_ps(reinterpret_cast<const __m128*>(p));
        return {_mm256_permutevar_ps(twice, _mm256_setr_epi32(0, 0, 0, 0, 1, 1, 1, 1)),
                _mm256_permutevar_ps(twice, _mm256_setr_epi32(2, 2, 2, 2, 3, 3, 3, 3))};
    }
    static Four add(Four a, Four b) { return {_mm256_add_ps(a.low, b.low), _mm256_add_ps(a.high, b.high)}; }
    static Four multiply(Four a, Four b) { return {_mm256_mul_ps(a.low, b.low), _mm256_mul_ps(a.high, b.high)}; }
    static Four divide(Four a, Four b) { return {_mm256_div_ps(a.low, b.low), _mm256_div_ps(a.high, b.high)}; }
    static Four where(const float* counts, float k, Four yes, Four no) {
        const Four count = spread(counts);
        const __m256 limit = _mm256_set1_ps(k);
        return {_mm256_blendv_ps(no.low, yes.low, _mm256_cmp_ps(count.low, limit, _CMP_GT_OQ)),
                _mm256_blendv_ps(no.high, yes.high, _mm256_cmp_ps(count.high, limit, _CMP_GT_OQ))};
    }
    static void store(float* p, Four a) {
        _mm256_storeu_ps(p, a.low);
        _mm256_storeu_ps(p + 8, a.high);
    }
};

} // namespace

void smoothRowsAvx2(const RowQuad* quads, const NeighbourQuad* neighbours, const PaddedPoint* source,
                    PaddedPoint* destination, std::size_t begin, std::size_t end) {
    smoothRows<Avx2Lanes>(quads, neighbours, source, destination, begin, end);
}

} // namespace quill
