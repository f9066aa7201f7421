// SPDX-License-Identifier: Apache-2.0
// A line of the log for each frame.
#pragma once

#include "openquarn_app/Evaluation.h"

#include <chrono>
#include <cstddef>
#include <optional>

namespace quarn {

/// While it lives, one frame is evaluated: at its end the log says what was computed for it, whether models were
/// loaded, and how long that took. Does nothing without a log. One at a time. Thread: main.
class FrameLog {
public:
    explicit FrameLog(int frame);
    ~FrameLog();
    FrameLog(const FrameLog&) = delete;
    FrameLog& operator=(const FrameLog&) = delete;

private:
    int frame_;
    std::optional<OpenQuarn::ComputeWatch> computed_; ///< none without a log
    std::size_t modelsBefore_ = 0;
    std::chrono::steady_clock::time_point begin_;
};

} // namespace quarn
