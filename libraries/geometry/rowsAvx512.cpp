// SPDX-License-Identifier: Apache-2.0
// Compiled for AVX-512F: four points are one register.
#include "rowsKernel.h"

#include <immintrin.h>

namespace quill {
namespace {

struct Avx512Lanes {
    // of every lane: the forms without a mask read, for GCC 12, an uninitialised register
    static constexpr __mmask16 all = 0xFFFF;

    static __m512 zero() { return _mm512_setzero_ps(); }
    static __m128 row(const float* rows, std::uint32_t index) {
        return _mm_load_ps(rows + 4 * static_cast<std::size_t>(index));
    }
    static __m512 gather(const float* rows, const std::uint32_t* i) {
        const __m256 low = _mm256_insertf128_ps(_mm256_castps128_ps256(row(rows, i[0])), row(rows, i[1]), 1);
        const __m256 high = _mm256_insertf128_ps(_mm256_castps128_ps256(row(rows, i[2])), row(rows, i[3]), 1);
        return _mm512_castpd_ps(
            _mm512_maskz_insertf64x4(0xFF, _mm512_castps_pd(_mm512_castps256_ps512(low)), _mm256_castps_pd(high), 1));
    }
    static __m512 load(const float* p) { return _mm512_loadu_ps(p); }
    static __m512 spread(const float* p) {
        const __m512i places = _mm512_setr_epi32(0, 0, 0, 0, 1, 1, 1, 1, 2, 2, 2, 2, 3, 3, 3, 3);
        return _mm512_maskz_permutevar_ps(all, _mm512_maskz_broadcast_f32x4(all, _mm_loadu_ps(p)), places);
    }
    static __m512 add(__m512 a, __m512 b) { return _mm512_add_ps(a, b); }
    static __m512 multiply(__m512 a, __m512 b) { return _mm512_mul_ps(a, b); }
    static __m512 divide(__m512 a, __m512 b) { return _mm512_div_ps(a, b); }
    static __m512 where(const float* counts, float k, __m512 yes, __m512 no) {
        return _mm512_mask_blend_ps(_mm512_cmp_ps_mask(spread(counts), _mm512_set1_ps(k), _CMP_GT_OQ), no, yes);
    }
    static void store(float* p, __m512 a) { _mm512_storeu_ps(p, a); }
};

} // namespace

void smoothRowsAvx512(const RowQuad* quads, const NeighbourQuad* neighbours, const PaddedPoint* source,
                      PaddedPoint* destination, std::size_t begin, std::size_t end) {
    smoothRows<Avx512Lanes>(quads, neighbours, source, destination, begin, end);
}

} // namespace quill
