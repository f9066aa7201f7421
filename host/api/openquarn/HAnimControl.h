// SPDX-License-Identifier: Apache-2.0
// What the animation is doing. The application drives it; a plug-in can only look.
#pragma once

#include "openquarn/HTime.h"

class OPENQUARN_API HAnimControl {
public:
    HAnimControl() = delete;

    /// True while the application plays the animation. [any]
    static bool isPlaying() noexcept;
    /// True while the user drags the current time to and fro. [any]
    static bool isScrubbing() noexcept;
    /// The scene's time; 0 while no scene is open. An evaluation at another time has its own in its context
    /// (HDGContext). [eval]
    static HTime currentTime() noexcept;
    /// First frame of the animation; 1 until the application sets another. [any]
    static HTime animationStartTime() noexcept;
    /// Last frame of the animation; 120 until the application sets another. [any]
    static HTime animationEndTime() noexcept;
};
