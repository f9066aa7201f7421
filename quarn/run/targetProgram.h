// SPDX-License-Identifier: Apache-2.0
// A program of somebody else that makes the shapes of poses: asked, watched and checked.
#pragma once

#include "quarn/run/Step.h"

#include <functional>

namespace quarn {

/// How it is run.
struct TargetPlace {
    std::filesystem::path folder; ///< of the run
    int log = -1;                 ///< an open file, for what it says
    std::string digest;           ///< of the step: frames that an earlier run of another one was given do not count
    std::chrono::milliseconds grace{10'000};
    std::function<void()> meanwhile; ///< as of runProgram()
};

/// The file that the program is told the path of: what there is, and what is asked for. `frames` of them, from `first`
/// on, to be written to `output`. JSON, version 1; docs/run.md describes it.
std::string textOf(const TargetRequest& request, const std::filesystem::path& folder, int first, std::size_t frames,
                   const std::filesystem::path& output);

/// Asks for all frames, `request.part` of them at once, and puts what comes, when it is all there and finite, into
/// `output`, in one step. Parts that are there are kept for the next run when one fails. Throws std::runtime_error with
/// what the program did not do; TimedOut and Interrupted as runProgram() does. Thread: main.
void runTargetProgram(const Step& step, const TargetPlace& place);

} // namespace quarn
