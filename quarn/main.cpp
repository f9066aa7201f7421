// SPDX-License-Identifier: Apache-2.0
// quarn: the host without a screen.
#include "nw_model/ModelSession.h"
#include "openquarn_app/Messages.h"
#include "quarn/console/Log.h"
#include "quarn/console/UsageError.h"
#include "quarn/console/build.h"
#include "quarn/console/consoleOptions.h"
#include "quarn/console/exitCodes.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/printable.h"
#include "quarn/dataset/commands.h"
#include "quarn/exec/commands.h"
#include "quarn/import/commands.h"
#include "quarn/info/commands.h"
#include "quarn/play/commands.h"
#include "quarn/pose/commands.h"
#include "quarn/process/ownVariable.h"
#include "quarn/render/commands.h"
#include "quarn/report/commands.h"
#include "quarn/run/commands.h"
#include "quarn/view/commands.h"
#include "storage/LockedByAnother.h"

#include <CLI/CLI.hpp>

#include <exception>
#include <iostream>
#include <string>
#include <vector>

namespace {

// the library would say that a command is missing
void requireCommand(const CLI::App& app, int argc, char** argv) {
    const std::string first = argc > 1 ? argv[1] : "";
    if (first.empty() || first.front() == '-')
        return;
    std::string names;
    for (const CLI::App* command : app.get_subcommands({})) {
        if (command->get_name() == first)
            return;
        names += (names.empty() ? "" : ", ") + command->get_name();
    }
    throw quarn::UsageError("there is no command \"" + first + "\"; there are " + names);
}

// as the host does it, but for control characters in names that come from files
void print(const OpenQuarn::Message& message) {
    const std::string line = std::string(OpenQuarn::severityName(message.severity)) + ": " + message.text;
    std::cerr << quarn::printable(line) + "\n";
    quarn::Log::keep(line);
}

// answers with the status to end with
int fail(const std::string& why, int status, const char* advice = "") {
    std::cerr << "quarn: " << quarn::printable(why) << '\n' << advice;
    quarn::Log::keep("failed with " + std::to_string(status) + ": " + why);
    return status;
}

int run(int argc, char** argv) {
    const int allWords = argc;
    const std::vector<std::string> targetCommand = quarn::takeTargetCommand(argc, argv);
    CLI::App app("quarn: the host without a screen");
    app.set_version_flag("--version", "quarn " QUARN_VERSION);
    app.require_subcommand(1);
    quarn::addImportCommand(app);
    quarn::addExportCommand(app);
    quarn::addMergeCommand(app);
    quarn::addPlayCommand(app);
    quarn::addBakeCommand(app);
    quarn::addExecCommand(app);
    quarn::addInfoCommand(app);
    quarn::addListAttrCommand(app);
    quarn::addPoseCommand(app);
    quarn::addTargetCommand(app);
    quarn::addRenderCommand(app);
    quarn::addViewCommand(app);
    quarn::addReportCommand(app);
    quarn::addRunCommand(app, targetCommand);

    quarn::LogOptions log;
    for (CLI::App* command : app.get_subcommands({}))
        quarn::addLogOptions(*command, log);
    app.parse_complete_callback([&] {
        neuralWarp::checkModelOptionsVariable();
        if (log.verbose || !log.file.empty())
            quarn::Log::begin(log.verbose, log.file, allWords, argv);
        quarn::log([] {
            return "quarn " QUARN_VERSION ", built from " + quarn::buildId() + ", instruction set " +
                   quarn::instructionSet();
        });
    });

    requireCommand(app, argc, argv);
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        return app.exit(error) == 0 ? quarn::exitCode::done
                                    : quarn::exitCode::usage; // help and version are no failures
    }
    if (!std::cout.flush())
        throw std::runtime_error("standard output could not be written");
    quarn::log([] { return std::string("done"); });
    return quarn::exitCode::done;
}

} // namespace

int main(int argc, char** argv) {
    try {
        quarn::setBuildId(quarn::commit);
        quarn::setOwnVariable(neuralWarp::modelOptionsVariable, "1"); // decision 0060
        OpenQuarn::setMessageSink(print);
        return run(argc, argv);
    } catch (const quarn::UsageError& error) {
        return fail(error.what(), quarn::exitCode::usage, "Run with --help for more information.\n");
    } catch (const std::exception& error) {
        // an evaluation that was given up on request fails with a sentence of its own
        if (quarn::isInterrupted())
            return fail(quarn::Interrupted().what(), quarn::interruptStatus());
        const bool isLocked = dynamic_cast<const storage::LockedByAnother*>(&error) != nullptr;
        return fail(error.what(), isLocked ? quarn::exitCode::locked : quarn::exitCode::failed);
    }
}
