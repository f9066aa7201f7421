// SPDX-License-Identifier: Apache-2.0
#include "nw_deform/BasisSink.h"

namespace neuralWarp {

void BasisSink::begin(std::uint64_t shapeCount, std::uint64_t vertCount, std::span<const float> scales) {
    const auto slots = static_cast<std::size_t>(vertCount);
    if (scales.empty())
        basis_.resize(slots, static_cast<std::size_t>(shapeCount));
    else
        basis_.resizeHalves(slots, scales);
    filled_ = 0;
}

} // namespace neuralWarp
