// SPDX-License-Identifier: Apache-2.0
// Compiled for AVX-512VL, whose loads and stores take a mask for free and whose arithmetic repeats a float from memory.
// Registers stay 128 bits wide.
#include "smoothingKernel.h"
#include "smoothingVectorLanes.h"

namespace quill {
namespace {

struct Avx512Lanes : VectorLanes {
    static constexpr __mmask8 xyz = 0b0111;

    static __m128 load(const float* p) { return _mm_maskz_loadu_ps(xyz, p); }
    static void store(float* p, __m128 a) { _mm_mask_storeu_ps(p, xyz, a); }
};

} // namespace

void smoothAvx512(const SmoothingPass& pass, const val3<float>* source, val3<float>* destination, std::size_t begin,
                  std::size_t end) {
    smooth<Avx512Lanes>(pass, source, destination, begin, end);
}

} // namespace quill
