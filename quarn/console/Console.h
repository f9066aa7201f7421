// SPDX-License-Identifier: Apache-2.0
// What a user sees of a command while it works: progress, notes, and its answer.
//
// The answer goes to standard output; everything else to standard error, so that the answer can be piped. With
// `quiet` only the answer and errors are left.
#pragma once

#include "quarn/console/ProgressFile.h"

#include <chrono>
#include <cstddef>
#include <filesystem>
#include <string>

namespace quarn {

/// How a command speaks. A sub-command binds these to its flags with addConsoleOptions().
struct Console {
    bool quiet = false;               ///< no progress, no notes
    bool json = false;                ///< the answer as JSON; only where the command has such an answer
    std::filesystem::path progress{}; ///< a ProgressFile that says what Progress shows; whole, or empty for none

    /// A line on standard error, unless quiet. Thread: any.
    void note(const std::string& sentence) const;
    /// "warning: SENTENCE" on standard error, also when quiet. Thread: any.
    void warn(const std::string& sentence) const;
};

/// "1 min 5 s"
std::string durationText(double seconds);

/// A bar on standard error while a long work runs, when that is a terminal and the console is not quiet, and the
/// console's file of progress; otherwise nothing. Redrawn at most ten times a second; gone with its owner, where the
/// file stays. Thread: one at a time.
class Progress {
public:
    /// `what` is done, as in "sampling poses"; `total` steps, above 0. Throws what ProgressFile does.
    Progress(const Console& console, std::string what, std::size_t total);
    ~Progress();
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;

    /// Throws Interrupted when the user has asked for the end, so that every loop that shows its progress can be
    /// stopped between two steps.
    void advance(std::size_t steps = 1);

private:
    void draw();
    std::string what_;
    std::size_t total_;
    std::size_t done_ = 0;
    ProgressFile file_;
    bool shown_;
    std::chrono::steady_clock::time_point started_;
    std::chrono::steady_clock::time_point drawn_;
};

} // namespace quarn
