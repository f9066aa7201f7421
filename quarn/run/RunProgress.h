// SPDX-License-Identifier: Apache-2.0
// progress.json in the folder of a run: where it is, for programs that look on, also those that come later.
#pragma once

#include "quarn/run/StepCounts.h"

#include <chrono>
#include <cstddef>

namespace quarn {

/// Written anew as a whole; docs/run.md has its keys. Thread: one at a time.
class RunProgress {
public:
    static constexpr const char* fileName = "progress.json";

    /// Of a folder that is the run's alone.
    explicit RunProgress(const std::filesystem::path& folder);

    /// A step is done now, or was done before: the `number`th, from 1 on, of `of` that are known. Writes nothing yet.
    void begin(const std::string& step, std::size_t number, std::size_t of);
    /// How far it is. What cannot be written is nothing that a run should end for, here and in end().
    void count(const StepCounts& counts) noexcept;
    /// "done", "failed" with the reason, or "interrupted".
    void end(const char* state, const std::string& error = {}) noexcept;

private:
    using Clock = std::chrono::steady_clock;

    void write(const StepCounts& counts) const;

    std::filesystem::path file_;
    std::string state_ = "running", error_, step_;
    std::size_t number_ = 0, of_ = 0;
    Clock::time_point begin_;
};

} // namespace quarn
