// SPDX-License-Identifier: Apache-2.0
// The kinds of training deltas.
#pragma once

#include <array>
#include <cstdint>
#include <string_view>

namespace neuralWarp {

/// With T the target points, I and R the smoothed input and rest points, and F the frames measured on them:
enum class TargetDeltaType : std::uint32_t {
    targetInInputFrames = 0, ///< "dbs": T in the local coordinates of F(I)
    targetInRestFrames = 1,  ///< "pos": T carried from F(I) to F(R)
    surfaceDelta = 2,        ///< "dos": the same, from the rest points: what Surface mode applies
    offsetDelta = 3,         ///< "dbp": T - I: what Offset mode applies
    restOffset = 4,          ///< "dop": T - R
    invalid = 5,
};

/// The codes of the values 0 to 4, in their order.
inline constexpr std::array<std::string_view, 5> targetDeltaCodes = {"dbs", "pos", "dos", "dbp", "dop"};

/// The value of a code; `invalid` for any other text. Case counts.
constexpr TargetDeltaType targetDeltaTypeOf(std::string_view code) {
    for (std::uint32_t value = 0; value < targetDeltaCodes.size(); ++value)
        if (targetDeltaCodes[value] == code)
            return static_cast<TargetDeltaType>(value);
    return TargetDeltaType::invalid;
}

/// The code of a value; empty for `invalid`.
constexpr std::string_view codeOf(TargetDeltaType type) {
    const auto value = static_cast<std::uint32_t>(type);
    return value < targetDeltaCodes.size() ? targetDeltaCodes[value] : std::string_view();
}

} // namespace neuralWarp
