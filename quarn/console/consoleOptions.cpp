// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/consoleOptions.h"

#include "quarn/console/Console.h"

#include <CLI/CLI.hpp>

namespace quarn {

void addConsoleOptions(CLI::App& command, Console& console, bool hasAnswer) {
    command.add_flag("-q,--quiet", console.quiet, "No progress and no notes");
    if (hasAnswer)
        command.add_flag("--json", console.json, "Answer in JSON");
}

void addProgressOption(CLI::App& command, Console& console) {
    command
        .add_option("--progress", console.progress,
                    "Keep this file at what is done, as JSON, for programs that look on")
        ->type_name("FILE")
        ->transform([](const std::string& file) { return std::filesystem::absolute(file).string(); });
}

void addLogOptions(CLI::App& command, LogOptions& options) {
    CLI::Option* verbose =
        command.add_flag("-v,--verbose", options.verbose, "Say on standard error what is done, and how long it takes");
    if (CLI::Option* quiet = command.get_option_no_throw("--quiet"))
        verbose->excludes(quiet);
    command.add_option("--log", options.file, "Write the same to a file, behind what it holds")->type_name("FILE");
}

} // namespace quarn
