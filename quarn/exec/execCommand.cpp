// SPDX-License-Identifier: Apache-2.0
#include "quarn/commands.h"

#include "openquarn_app/Commands.h"
#include "openquarn_app/Session.h"
#include "quarn/scene/SceneSession.h"

#include <CLI/CLI.hpp>

#include <iostream>
#include <iterator>
#include <stdexcept>

namespace quarn {
namespace {

// what commands print goes to standard output, what the host has to say to standard error
void print(const OpenQuarn::CommandValue& value) {
    std::cout << OpenQuarn::printedValue(value) << std::endl;
}

OpenQuarn::CommandOutcome runFile(const std::string& file) {
    if (file != "-")
        return OpenQuarn::runScriptFile(file, print);
    const std::string text(std::istreambuf_iterator<char>(std::cin), {});
    if (std::cin.bad())
        throw std::runtime_error("standard input could not be read");
    return OpenQuarn::runScript(text, "standard input", print);
}

struct Options {
    std::vector<std::string> plugins;
    std::string file;
};

void execute(const Options& options) {
    const OpenQuarn::Session session;
    loadPlugins(options.plugins, false);
    const OpenQuarn::CommandOutcome outcome = runFile(options.file);
    if (!outcome)
        throw std::runtime_error(outcome.error);
}

} // namespace

void addExecCommand(CLI::App& app) {
    const auto options = std::make_shared<Options>();
    CLI::App* exec = app.add_subcommand("exec", "Run a script of commands");
    exec->add_option("-p,--plugin", options->plugins, "Load a plug-in first; may be repeated")
        ->type_name("PATH")
        ->allow_extra_args(false);
    exec->add_option("FILE", options->file, "The script; - for standard input")->required();
    exec->callback([options] { execute(*options); });
}

} // namespace quarn
