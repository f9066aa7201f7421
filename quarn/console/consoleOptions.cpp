// SPDX-License-Identifier: Apache-2.0
#include "quarn/commands.h"
#include "quarn/console/Console.h"

#include <CLI/CLI.hpp>

namespace quarn {

void addConsoleOptions(CLI::App& command, Console& console, bool hasAnswer) {
    command.add_flag("-q,--quiet", console.quiet, "No progress and no notes");
    if (hasAnswer)
        command.add_flag("--json", console.json, "Answer in JSON");
}

} // namespace quarn
