// SPDX-License-Identifier: Apache-2.0
// Starting a program for what it says.
#pragma once

#include "quarn/process/runProgram.h"

namespace quarn {

struct ProgramAnswer {
    ProgramEnd end;
    std::string text; ///< standard output and error as they came, the first 64 KiB

    std::string firstLine() const;
    std::string lastLine() const; ///< the last that is not empty
};

/// Runs a program to its end; `call.log` and `call.output` are set here. Throws as runProgram(). Thread: main.
ProgramAnswer askProgram(ProgramCall call, const std::function<void()>& meanwhile = {});

/// The file of the program that runs. Throws std::filesystem::filesystem_error. Thread: any.
std::filesystem::path thisProgram();

} // namespace quarn
