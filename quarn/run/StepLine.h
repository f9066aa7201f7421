// SPDX-License-Identifier: Apache-2.0
// The line of a step: on a terminal it counts while the step is at work.
#pragma once

#include "quarn/console/Console.h"

#include <chrono>
#include <filesystem>
#include <string>

namespace quarn {

/// While it lives, a line on standard error with the seconds, and the last "N of M" that the step's log has. Nothing
/// where that is no terminal, or the console is quiet. Thread: main.
class StepLine {
public:
    StepLine(const Console& console, std::string label, std::filesystem::path log);
    ~StepLine();
    StepLine(const StepLine&) = delete;
    StepLine& operator=(const StepLine&) = delete;

    /// Once a second at most, however often it is called.
    void draw();
    /// The line that stays, of a step that is done: "train        12 s".
    static void finish(const Console& console, const std::string& label, double seconds);

private:
    std::string label_;
    std::filesystem::path log_;
    bool isShown_;
    std::chrono::steady_clock::time_point begin_, drawn_;
};

/// The last "N of M" in a text; empty without one.
std::string lastCount(const std::string& text);

} // namespace quarn
