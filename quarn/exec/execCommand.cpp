// SPDX-License-Identifier: Apache-2.0
#include "quarn/exec/commands.h"

#include "openquarn_app/Commands.h"
#include "openquarn_app/Session.h"
#include "quarn/console/Log.h"
#include "quarn/console/printable.h"
#include "quarn/scene/SceneSession.h"

#include <CLI/CLI.hpp>

#include <iostream>
#include <iterator>
#include <stdexcept>

namespace quarn {
namespace {

// what commands print goes to standard output, what the host has to say to standard error
void print(const OpenQuarn::CommandValue& value) {
    std::cout << printable(OpenQuarn::printedValue(value)) << std::endl;
}

OpenQuarn::CommandOutcome runFile(const std::string& file, OpenQuarn::OnShownError onShownError) {
    if (file != "-")
        return OpenQuarn::runScriptFile(file, print, onShownError);
    const std::string text(std::istreambuf_iterator<char>(std::cin), {});
    if (std::cin.bad())
        throw std::runtime_error("standard input could not be read");
    return OpenQuarn::runScript(text, "standard input", print, onShownError);
}

struct Options {
    std::vector<std::string> plugins;
    std::string file;
    bool stops = false;
};

void execute(const Options& options) {
    const SceneFolder folder;
    const OpenQuarn::Session session;
    loadPlugins(options.plugins, false);
    const Stage stage([&] { return "running " + options.file; });
    const OpenQuarn::CommandOutcome outcome =
        runFile(options.file, options.stops ? OpenQuarn::OnShownError::stop : OpenQuarn::OnShownError::goOn);
    const std::string& shown = outcome.shownError;
    if (!outcome)
        throw std::runtime_error((shown.empty() ? "" : "an error was shown in " + shown + "\n") + outcome.error);
    if (!shown.empty())
        throw std::runtime_error("an error was shown in " + shown);
}

} // namespace

void addExecCommand(CLI::App& app) {
    const auto options = std::make_shared<Options>();
    CLI::App* exec = app.add_subcommand("exec", "Run a script of commands");
    exec->add_option("-p,--plugin", options->plugins, "Load a plug-in first; may be repeated")
        ->type_name("PATH")
        ->allow_extra_args(false);
    exec->add_option("FILE", options->file, "The script; - for standard input")->required();
    exec->add_flag("--stop", options->stops,
                   "End at the first command that shows an error, too, not only at one that fails");
    exec->callback([options] { execute(*options); });
}

} // namespace quarn
