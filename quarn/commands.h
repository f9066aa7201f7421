// SPDX-License-Identifier: Apache-2.0
// The sub-commands of quarn: each adds itself to the command line, with a callback that does the work. What is wrong is
// thrown as std::runtime_error with the sentence that the user reads. Every one has a folder of its own.
#pragma once

namespace CLI {
class App;
}

namespace quarn {

void addImportCommand(CLI::App& app);
void addPoseCommand(CLI::App& app);
void addTargetCommand(CLI::App& app);
void addExportCommand(CLI::App& app);
void addPlayCommand(CLI::App& app);
void addBakeCommand(CLI::App& app);
void addRenderCommand(CLI::App& app);
void addInfoCommand(CLI::App& app);
void addExecCommand(CLI::App& app);
void addListAttrCommand(CLI::App& app);

struct Console;
/// Adds --quiet, and --json where the command has an answer that a program may read. `console` must outlive `command`.
void addConsoleOptions(CLI::App& command, Console& console, bool hasAnswer);

} // namespace quarn
