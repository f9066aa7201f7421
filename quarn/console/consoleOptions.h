// SPDX-License-Identifier: Apache-2.0
// The flags that every sub-command has.
#pragma once

#include <filesystem>

namespace CLI {
class App;
}

namespace quarn {

struct Console;

/// Adds --quiet, and --json where the command has an answer that a program may read. `console` must outlive `command`.
void addConsoleOptions(CLI::App& command, Console& console, bool hasAnswer);
/// --progress FILE, of commands that show a Progress.
void addProgressOption(CLI::App& command, Console& console);

/// What --verbose and --log say.
struct LogOptions {
    bool verbose = false;
    std::filesystem::path file; ///< empty: none
};

/// Adds --verbose and --log, after all others. `options` must outlive `command`.
void addLogOptions(CLI::App& command, LogOptions& options);

} // namespace quarn
