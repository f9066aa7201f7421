// SPDX-License-Identifier: Apache-2.0
// A point in a vector register, for the kernels of x86-64. Internal linkage, as in smoothingKernel.h and for its
// reasons: each file that includes this compiles it for an instruction set of its own.
#pragma once

#include <emmintrin.h>

namespace quill {
namespace {

// x, y and z in the low three lanes of a register; the fourth is 0 in a loaded point and never stored.
struct VectorLanes {
    static __m128 load(const float* p) {
        const __m128 xy = _mm_castpd_ps(_mm_load_sd(reinterpret_cast<const double*>(p)));
        return _mm_movelh_ps(xy, _mm_load_ss(p + 2));
    }
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
} // namespace quill
