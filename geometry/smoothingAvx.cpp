// SPDX-License-Identifier: Apache-2.0
// Compiled for AVX, which loads a point's three lanes and leaves the fourth alone in one instruction.
#include "smoothingKernel.h"

#include <immintrin.h>

namespace quill {
namespace {

// x, y and z in the low three lanes of a register; the fourth is 0 in a loaded point and never stored.
struct AvxLanes {
    static __m128 load(const float* p) { return _mm_maskload_ps(p, _mm_setr_epi32(-1, -1, -1, 0)); }
    static void store(float* p, __m128 a) {
        _mm_store_sd(reinterpret_cast<double*>(p), _mm_castps_pd(a));
        _mm_store_ss(p + 2, _mm_movehl_ps(a, a));
    }
    static __m128 zero() { return _mm_setzero_ps(); }
    static __m128 add(__m128 a, __m128 b) { return _mm_add_ps(a, b); }
    static __m128 subtract(__m128 a, __m128 b) { return _mm_sub_ps(a, b); }
    static __m128 multiply(__m128 a, float s) { return _mm_mul_ps(a, _mm_set1_ps(s)); }
    static __m128 divide(__m128 a, float s) { return _mm_div_ps(a, _mm_set1_ps(s)); }
};

} // namespace

void smoothAvx(const SmoothingPass& pass, const val3<float>* source, val3<float>* destination, std::size_t begin,
               std::size_t end) {
    smooth<AvxLanes>(pass, source, destination, begin, end);
}

} // namespace quill
