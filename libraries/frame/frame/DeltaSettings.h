// SPDX-License-Identifier: Apache-2.0
// How deltas are meant: on which smoothed surface, and in which space.
#pragma once

#include <cstdint>

namespace neuralWarp {

/// Values of DeltaSettings::deltaMode. Files and scripts may hold others, which apply no deltas.
inline constexpr std::uint32_t kOffsetMode = 0;  ///< plain object-space offsets from the smoothed points
inline constexpr std::uint32_t kSurfaceMode = 1; ///< offsets carried by the frames of the smoothed surface

struct DeltaSettings {
    std::int64_t smoothingIterations = 0; ///< passes over the points; 0 and less: none
    std::uint32_t deltaMode = kSurfaceMode;

    bool isSmoothed() const { return smoothingIterations > 0; }
    bool isSurface() const { return deltaMode == kSurfaceMode; }
};

} // namespace neuralWarp
