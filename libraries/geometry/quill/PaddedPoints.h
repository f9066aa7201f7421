// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/val3.h"

#include <vector>

namespace quill {

/// A point in a row of four floats, which one load takes; what the fourth holds is nobody's concern.
struct alignas(16) PaddedPoint {
    float x = 0.0F, y = 0.0F, z = 0.0F, unused = 0.0F;
};

using PaddedPoints = std::vector<PaddedPoint>;

} // namespace quill
