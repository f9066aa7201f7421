// SPDX-License-Identifier: Apache-2.0
#include "smoothing.h"

namespace quill {

std::size_t availableSmoothingKernels(SmoothingKernel* out) {
    std::size_t count = 0;
    out[count++] = smoothScalar;
#if defined(__x86_64__)
    if (__builtin_cpu_supports("avx"))
        out[count++] = smoothAvx;
    if (__builtin_cpu_supports("avx512vl"))
        out[count++] = smoothAvx512;
#endif
    return count;
}

// the same bits from each, so the choice is nobody's concern (decision 0010)
SmoothingKernel smoothingKernel() {
    static const SmoothingKernel fastest = [] {
        SmoothingKernel kernels[3];
        return kernels[availableSmoothingKernels(kernels) - 1];
    }();
    return fastest;
}

} // namespace quill
