// SPDX-License-Identifier: Apache-2.0
// Where the time of one evaluation goes, for benchmarks.
#pragma once

#include <array>
#include <chrono>
#include <cstddef>

namespace neuralWarp {

/// Steps of an evaluation in which a model is applied.
enum class Phase : std::size_t { prepare, gather, network, points, deltas, apply, fetch, blend, writeBack };
inline constexpr std::size_t phaseCount = 9;

/// Each lap belongs to the phase that it ends. Thread: one at a time.
class PhaseClock {
public:
    void start() {
        seconds = {};
        last_ = Clock::now();
    }
    void lap(Phase phase) {
        const Clock::time_point now = Clock::now();
        seconds[static_cast<std::size_t>(phase)] += std::chrono::duration<double>(now - last_).count();
        last_ = now;
    }

    std::array<double, phaseCount> seconds{};

private:
    using Clock = std::chrono::steady_clock;
    Clock::time_point last_;
};

} // namespace neuralWarp
