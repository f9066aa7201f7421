// SPDX-License-Identifier: Apache-2.0
// Random poses within limits.
#pragma once

#include "quarn/pose/PoseSet.h"

#include <cstdint>
#include <functional>

namespace quarn {

struct DrawSettings {
    std::size_t count = 1000;    ///< of poses that the set is to have
    double activationRate = 1.0; ///< 0 to 1: how likely a value leaves its default
    std::uint64_t seed = 1;
    double limitRate = 0.0; ///< 0 to 1: how likely an active value stands at one of its limits, either alike
};

/// Draws poses into the set until it has `count` of them. A value is active with the probability activationRate, and
/// then with limitRate `least` or `most`, else uniform between them; otherwise it is `rest`. A pose near one of the set
/// is drawn again. Ends early after drawsInVain of those in a row. Returns how many were drawn again. The same settings
/// give the same bits on every machine. `step` is called with 1 for each pose that came in and with 0 for each that did
/// not, and may throw.
std::size_t drawPoses(PoseSet& poses, const DrawSettings& settings, const std::function<void(std::size_t)>& step);

constexpr std::size_t drawsInVain = 10'000;

} // namespace quarn
