// SPDX-License-Identifier: Apache-2.0
// quarn: the host without a screen.
#include "quarn/commands.h"
#include "quarn/console/interrupt.h"

#include <CLI/CLI.hpp>

#include <exception>
#include <iostream>

namespace {

constexpr int endedBySignal = 130; // what shells expect of a program that Ctrl-C has ended

int run(int argc, char** argv) {
    CLI::App app("quarn: the host without a screen");
    app.set_version_flag("--version", "quarn " QUARN_VERSION);
    app.require_subcommand(1);
    quarn::addImportCommand(app);
    quarn::addExportCommand(app);
    quarn::addPlayCommand(app);
    quarn::addBakeCommand(app);
    quarn::addExecCommand(app);
    quarn::addInfoCommand(app);
    quarn::addListAttrCommand(app);
    quarn::addPoseCommand(app);
    quarn::addTargetCommand(app);
    quarn::addRenderCommand(app);

    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        return app.exit(error); // help and version are no failures
    }
    if (!std::cout.flush())
        throw std::runtime_error("standard output could not be written");
    return 0;
}

} // namespace

int main(int argc, char** argv) {
    try {
        return run(argc, argv);
    } catch (const quarn::Interrupted& interrupted) {
        std::cerr << "quarn: " << interrupted.what() << '\n';
        return endedBySignal;
    } catch (const std::exception& error) {
        std::cerr << "quarn: " << error.what() << '\n';
        return 1;
    }
}
