// SPDX-License-Identifier: Apache-2.0
#include "quarn/commands.h"

#include "openquarn_app/Commands.h"
#include "openquarn_app/Plugins.h"
#include "openquarn_app/Session.h"

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

} // namespace

void execute(const std::vector<std::string>& plugins, const std::string& file) {
    const OpenQuarn::Session session;
    for (const std::string& path : plugins)
        OpenQuarn::loadPlugin(path);
    const OpenQuarn::CommandOutcome outcome = runFile(file);
    if (!outcome)
        throw std::runtime_error(outcome.error);
}

} // namespace quarn
