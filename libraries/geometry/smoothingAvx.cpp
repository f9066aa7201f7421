// SPDX-License-Identifier: Apache-2.0
// Compiled for AVX, which loads a point's three lanes and leaves the fourth alone in one instruction.
#include "smoothingKernel.h"
#include "smoothingVectorLanes.h"

namespace quill {
namespace {

struct AvxLanes : VectorLanes {
    static __m128 load(const float* p) { return _mm_maskload_ps(p, _mm_setr_epi32(-1, -1, -1, 0)); }
    static void store(float* p, __m128 a) {
        _mm_store_sd(reinterpret_cast<double*>(p), _mm_castps_pd(a));
        _mm_store_ss(p + 2, _mm_movehl_ps(a, a));
    }
};

} // namespace

void smoothAvx(const SmoothingPass& pass, const val3<float>* source, val3<float>* destination, std::size_t begin,
               std::size_t end) {
    smooth<AvxLanes>(pass, source, destination, begin, end);
}

} // namespace quill
