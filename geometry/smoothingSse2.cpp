// SPDX-License-Identifier: Apache-2.0
#include "smoothingKernel.h"
#include "smoothingVectorLanes.h"

namespace quill {

void smoothSse2(const SmoothingPass& pass, const val3<float>* source, val3<float>* destination, std::size_t begin,
                std::size_t end) {
    smooth<VectorLanes>(pass, source, destination, begin, end);
}

} // namespace quill
