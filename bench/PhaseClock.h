// SPDX-License-Identifier: Apache-2.0
// Where the time of one frame goes.
#pragma once

#include "frame/FrameObserver.h"

#include <array>
#include <chrono>
#include <cstddef>

namespace bench {

// The time between two steps counts to the one that follows.
class PhaseClock final : public neuralWarp::FrameObserver {
public:
    void beginFrame() override {
        seconds = {};
        last_ = Clock::now();
    }
    void endStep(neuralWarp::FrameStep step) override {
        const Clock::time_point now = Clock::now();
        seconds[static_cast<std::size_t>(step)] += std::chrono::duration<double>(now - last_).count();
        last_ = now;
    }

    std::array<double, neuralWarp::frameStepCount> seconds{};

private:
    using Clock = std::chrono::steady_clock;
    Clock::time_point last_;
};

} // namespace bench
