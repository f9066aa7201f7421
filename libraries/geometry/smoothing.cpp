// SPDX-License-Identifier: Apache-2.0
#include "smoothing.h"

namespace quill {

// the same bits from each, so the choice is nobody's concern (decision 0010)
SmoothingKernel smoothingKernel([[maybe_unused]] InstructionSet set) {
#if defined(__x86_64__)
    if (set >= InstructionSet::avx512)
        return smoothAvx512;
    if (set >= InstructionSet::avx)
        return smoothAvx;
#endif
    return smoothScalar;
}

} // namespace quill
