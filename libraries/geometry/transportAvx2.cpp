// SPDX-License-Identifier: Apache-2.0
// Compiled for AVX2: eight floats, or four doubles, are one register.
#include "transportKernel.h"

#include <immintrin.h>

namespace quill {
namespace {

struct Avx2Lanes {
    using Floats = __m256;
    struct Doubles {
        __m256d low, high;
    };

    static Floats load(const float* p) { return _mm256_loadu_ps(p); }
    static Doubles load(const double* p) { return {_mm256_loadu_pd(p), _mm256_loadu_pd(p + 4)}; }
    static Floats broadcast(float s) { return _mm256_set1_ps(s); }
    static Floats add(Floats a, Floats b) { return _mm256_add_ps(a, b); }
    static Doubles add(Doubles a, Doubles b) { return {_mm256_add_pd(a.low, b.low), _mm256_add_pd(a.high, b.high)}; }
    static Floats subtract(Floats a, Floats b) { return _mm256_sub_ps(a, b); }
    static Floats multiply(Floats a, Floats b) { return _mm256_mul_ps(a, b); }
    static Doubles multiply(Doubles a, Doubles b) {
        return {_mm256_mul_pd(a.low, b.low), _mm256_mul_pd(a.high, b.high)};
    }
    static Floats reciprocalRoot(Floats a) { return _mm256_div_ps(_mm256_set1_ps(1.0F), _mm256_sqrt_ps(a)); }
    static Floats isAbove(Floats a, float s) { return _mm256_cmp_ps(a, _mm256_set1_ps(s), _CMP_GT_OQ); }
    // counts are below 2^31: that many pairs of a vertex do not fit the tables
    static Floats moreThan(const std::uint32_t* counts, std::uint32_t k) {
        const __m256i all = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(counts));
        return _mm256_castsi256_ps(_mm256_cmpgt_epi32(all, _mm256_set1_epi32(static_cast<int>(k))));
    }
    static Floats select(Floats mask, Floats yes, Floats no) { return _mm256_blendv_ps(no, yes, mask); }
    static Doubles widen(Floats a) {
        return {_mm256_cvtps_pd(_mm256_castps256_ps128(a)), _mm256_cvtps_pd(_mm256_extractf128_ps(a, 1))};
    }
    static Floats narrow(Doubles a) {
        return _mm256_insertf128_ps(_mm256_castps128_ps256(_mm256_cvtpd_ps(a.low)), _mm256_cvtpd_ps(a.high), 1);
    }

    // rows of the lanes i and i + 4, side by side
    static __m256 twoRows(const float* rows, const std::uint32_t* indices, std::size_t i) {
        const __m128 low = _mm_load_ps(rows + 4 * static_cast<std::size_t>(indices[i]));
        return _mm256_insertf128_ps(_mm256_castps128_ps256(low),
                                    _mm_load_ps(rows + 4 * static_cast<std::size_t>(indices[i + 4])), 1);
    }
    static void loadRows(const float* rows, const std::uint32_t* indices, Floats& x, Floats& y, Floats& z) {
        const __m256 r0 = twoRows(rows, indices, 0), r1 = twoRows(rows, indices, 1);
        const __m256 r2 = twoRows(rows, indices, 2), r3 = twoRows(rows, indices, 3);
        const __m256 xy01 = _mm256_unpacklo_ps(r0, r1), xy23 = _mm256_unpacklo_ps(r2, r3);
        x = _mm256_shuffle_ps(xy01, xy23, _MM_SHUFFLE(1, 0, 1, 0));
        y = _mm256_shuffle_ps(xy01, xy23, _MM_SHUFFLE(3, 2, 3, 2));
        z = _mm256_shuffle_ps(_mm256_unpackhi_ps(r0, r1), _mm256_unpackhi_ps(r2, r3), _MM_SHUFFLE(1, 0, 1, 0));
    }

    static __m256 halves(const float* low, const float* high) {
        return _mm256_insertf128_ps(_mm256_castps128_ps256(_mm_loadu_ps(low)), _mm_loadu_ps(high), 1);
    }
    // points 0 to 3 in the low half of every register, 4 to 7 in the high one; within a half the four points are
    // x0 y0 z0 x1 | y1 z1 x2 y2 | z2 x3 y3 z3
    static void loadPoints(const float* p, Floats& x, Floats& y, Floats& z) {
        const __m256 a = halves(p, p + 12), b = halves(p + 4, p + 16), c = halves(p + 8, p + 20);
        const __m256 x2y2x3y3 = _mm256_shuffle_ps(b, c, _MM_SHUFFLE(2, 1, 3, 2));
        const __m256 y0z0y1z1 = _mm256_shuffle_ps(a, b, _MM_SHUFFLE(1, 0, 2, 1));
        x = _mm256_shuffle_ps(a, x2y2x3y3, _MM_SHUFFLE(2, 0, 3, 0));
        y = _mm256_shuffle_ps(y0z0y1z1, x2y2x3y3, _MM_SHUFFLE(3, 1, 2, 0));
        z = _mm256_shuffle_ps(y0z0y1z1, c, _MM_SHUFFLE(3, 0, 3, 1));
    }
    static void storeHalves(float* low, float* high, __m256 v) {
        _mm_storeu_ps(low, _mm256_castps256_ps128(v));
        _mm_storeu_ps(high, _mm256_extractf128_ps(v, 1));
    }
    static void storePoints(float* p, Floats x, Floats y, Floats z) {
        const __m256 x0x2y0y2 = _mm256_shuffle_ps(x, y, _MM_SHUFFLE(2, 0, 2, 0));
        const __m256 y1y3z1z3 = _mm256_shuffle_ps(y, z, _MM_SHUFFLE(3, 1, 3, 1));
        const __m256 z0z2x1x3 = _mm256_shuffle_ps(z, x, _MM_SHUFFLE(3, 1, 2, 0));
        storeHalves(p, p + 12, _mm256_shuffle_ps(x0x2y0y2, z0z2x1x3, _MM_SHUFFLE(2, 0, 2, 0)));
        storeHalves(p + 4, p + 16, _mm256_shuffle_ps(y1y3z1z3, x0x2y0y2, _MM_SHUFFLE(3, 1, 2, 0)));
        storeHalves(p + 8, p + 20, _mm256_shuffle_ps(z0z2x1x3, y1y3z1z3, _MM_SHUFFLE(3, 1, 3, 1)));
    }
};

} // namespace

void transportAvx2(const TransportTables& tables, const float* rows, const val3<float>* deltas, val3<float>* out,
                   std::size_t begin, std::size_t end) {
    transport<Avx2Lanes>(tables, rows, deltas, out, begin, end);
}

} // namespace quill
