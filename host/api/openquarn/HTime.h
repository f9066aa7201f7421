// SPDX-License-Identifier: Apache-2.0
// A point in time of the animation.
#pragma once

#include "openquarn/HApi.h"

/// A time in frames; fractions are times between frames, negative ones are times before frame 0. Seconds follow from
/// the frames per second that the application has set, so that a change of these moves no frame. Any double is a time.
/// `[any]` throughout.
class OPENQUARN_API HTime {
public:
    constexpr HTime() = default;
    constexpr explicit HTime(double frames)
        : frames_(frames) {}

    constexpr double frames() const { return frames_; }
    /// frames() divided by framesPerSecond().
    double seconds() const noexcept;
    static HTime fromSeconds(double seconds) noexcept;
    /// Of the scene; finite and above 0. 24 until the application sets another.
    static double framesPerSecond() noexcept;

    constexpr bool operator==(const HTime& other) const { return frames_ == other.frames_; }
    constexpr bool operator!=(const HTime& other) const { return frames_ != other.frames_; }
    constexpr bool operator<(const HTime& other) const { return frames_ < other.frames_; }

private:
    double frames_ = 0.0;
};
