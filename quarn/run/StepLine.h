// SPDX-License-Identifier: Apache-2.0
// What can be seen of a step while it is at work: a line on a terminal, and the progress of the run.
#pragma once

#include "quarn/console/Console.h"
#include "quarn/run/RunProgress.h"

#include <chrono>
#include <filesystem>
#include <string>

namespace quarn {

/// While it lives, a line on standard error with the seconds and what the step counts; none where that is no terminal,
/// or the console is quiet. The run's progress has the same. The step's file of progress goes with it. Thread: main.
class StepLine {
public:
    /// What the step counts stands in one of these files, if anywhere; see countsIn().
    struct Files {
        std::filesystem::path progress, log;
    };

    StepLine(const Console& console, RunProgress& run, std::string label, Files files);
    ~StepLine();
    StepLine(const StepLine&) = delete;
    StepLine& operator=(const StepLine&) = delete;

    /// Twice a second at most, however often it is called.
    void draw();
    /// The line that stays, of a step that is done: "train        12 s".
    static void finish(const Console& console, const std::string& label, double seconds);

private:
    RunProgress& run_;
    std::string label_;
    Files files_;
    bool isShown_;
    std::chrono::steady_clock::time_point begin_, drawn_;
};

} // namespace quarn
