// SPDX-License-Identifier: Apache-2.0
#include "frame/smoothing.h"

#include "quill/WorkWatch.h"

#include <algorithm>

namespace neuralWarp {

void smoothPoints(Points& points, const RestSurface& rest, std::int64_t passes, const IsCancelled& isCancelled) {
    constexpr std::int64_t passesPerLook = 64; // a quarter of a second for a million vertices
    Points scratch;
    for (std::int64_t left = passes; left > 0; left -= passesPerLook) {
        if (isCancelled && isCancelled())
            throw quill::Cancelled();
        rest.connections.mushArray(points, scratch, static_cast<std::size_t>(std::min(left, passesPerLook)), 1.0F,
                                   nullptr, &rest.connectionWeights, false);
    }
}

} // namespace neuralWarp
