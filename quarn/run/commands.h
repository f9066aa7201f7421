// SPDX-License-Identifier: Apache-2.0
// All steps from a character to a report, in one command.
#pragma once

#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace quarn {

/// The words of a program that `quarn run` is to start are its own, whatever they look like: of the words of a `quarn
/// run`, those behind --target-command are taken off the end and answered, so that `argc` counts the others. `argv` as
/// main() gets it. Empty where there is no --target-command, which cannot be told from one without a program: that
/// throws UsageError.
std::vector<std::string> takeTargetCommand(int& argc, const char* const* argv);

/// Adds the sub-command, with a callback that does the work. What is wrong is thrown as std::runtime_error with the
/// sentence that the user reads.
void addRunCommand(CLI::App& app, std::vector<std::string> targetCommand);

} // namespace quarn
