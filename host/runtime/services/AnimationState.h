// SPDX-License-Identifier: Apache-2.0
// What the animation is doing, for everybody in the runtime.
#pragma once

#include <atomic>

namespace OpenQuarn {

/// Plain values; the current time is the graph's. Thread: set on the main thread, read on any.
struct AnimationState {
    std::atomic<bool> isPlaying{false};
    std::atomic<bool> isScrubbing{false};
    std::atomic<double> framesPerSecond{24.0}; // finite and above 0
    std::atomic<double> startFrame{1.0};
    std::atomic<double> endFrame{120.0};
};

/// The one of this process.
AnimationState& animationState() noexcept;

} // namespace OpenQuarn
