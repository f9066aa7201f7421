// SPDX-License-Identifier: Apache-2.0
#pragma once

namespace quarn {

/// What is known of a value that is sampled. All finite, least <= most, and most - least finite.
struct ValueLimits {
    double least = 0.0;
    double most = 1.0;
    double rest = 0.0; ///< its default; may lie outside of the limits
};

} // namespace quarn
