// SPDX-License-Identifier: Apache-2.0
// The arithmetic of the kernels that hold a point in a vector register: x, y and z in the low three lanes, the fourth 0
// in a loaded point and never stored. Internal linkage, as in smoothingKernel.h and for its reasons: each file that
// includes this compiles it for an instruction set of its own, and adds how that loads and stores a point.
#pragma once

#include <immintrin.h>

namespace quill {
namespace {

struct VectorLanes {
    static __m128 zero() { return _mm_setzero_ps(); }
    static __m128 add(__m128 a, __m128 b) { return _mm_add_ps(a, b); }
    static __m128 subtract(__m128 a, __m128 b) { return _mm_sub_ps(a, b); }
    static __m128 multiply(__m128 a, float s) { return _mm_mul_ps(a, _mm_set1_ps(s)); }
    static __m128 divide(__m128 a, float s) { return _mm_div_ps(a, _mm_set1_ps(s)); }
};

} // namespace
} // namespace quill
