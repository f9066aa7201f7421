// SPDX-License-Identifier: Apache-2.0
// Tells the host what the animation is doing. The current time is set with the scene (Session).
#pragma once

#include "openquarn/HApi.h"

namespace OpenQuarn {

/// What HAnimControl and HTime answer. Setting anything here evaluates nothing. Thread: main.
class OPENQUARN_API Animation {
public:
    Animation() = delete;

    static void setPlaying(bool isPlaying) noexcept;
    static void setScrubbing(bool isScrubbing) noexcept;
    /// Throws std::invalid_argument unless the number is finite and above 0; what was set then stays.
    static void setFramesPerSecond(double framesPerSecond);
    /// First and last frame. Throws std::invalid_argument unless both are finite and in that order; what was set then
    /// stays.
    static void setRange(double startFrame, double endFrame);
};

} // namespace OpenQuarn
