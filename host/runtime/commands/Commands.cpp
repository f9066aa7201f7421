// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/Commands.h"

#include "commands/CommandRegistry.h"
#include "commands/ScriptText.h"
#include "commands/WordValues.h"
#include "commands/dispatch.h"
#include "core/apiCall.h"
#include "messages/ShownErrors.h"
#include "openquarn_app/Workspace.h"
#include "storage/FileError.h"
#include "storage/readWholeFile.h"

namespace OpenQuarn {
namespace {

CommandOutcome failed(const std::string& error) {
    return {false, error, {}, {}};
}

std::string place(std::string_view name, int line) {
    return name.empty() ? std::string() : std::string(name) + ", line " + std::to_string(line) + ": ";
}

CommandOutcome runAll(const std::vector<ScriptCommand>& commands, std::string_view name, const ResultSink& results,
                      OnShownError onShownError) {
    CommandOutcome outcome;
    for (const ScriptCommand& command : commands) {
        const ShownErrors shown;
        const HStatus status = dispatch(command.words, outcome.result);
        if (status.error()) {
            outcome.ok = false;
            outcome.error = place(name, command.line) + status.errorString().asStdString();
            return outcome;
        }
        if (results && !std::holds_alternative<std::monostate>(outcome.result))
            results(outcome.result);
        if (const std::string error = shown.first(); !error.empty() && outcome.shownError.empty())
            outcome.shownError = place(name, command.line) + command.words.front().text + ": " + error;
        if (onShownError == OnShownError::stop && !outcome.shownError.empty())
            break;
    }
    return outcome;
}

// owner of the application's commands
const char application = 'a';

constexpr std::uint64_t largestScript = std::uint64_t{256} << 20U;

} // namespace

std::string quotedWord(std::string_view text) {
    return quoteScriptWord(text);
}

CommandOutcome runCommand(std::string_view text) noexcept {
    try {
        return runScript(text, {});
    } catch (...) {
        return {false, {}, {}, {}}; // no memory for the text of the error
    }
}

CommandOutcome runScript(std::string_view text, std::string_view name, const ResultSink& results,
                         OnShownError onShownError) {
    std::vector<ScriptCommand> commands;
    try {
        commands = splitScript(text);
    } catch (const ScriptError& error) {
        return failed(place(name, error.line()) + error.what());
    }
    return runAll(commands, name, results, onShownError);
}

CommandOutcome runScriptFile(const std::string& path, const ResultSink& results, OnShownError onShownError) {
    std::string text;
    try {
        text = storage::readWholeFile(Workspace::callersPath(path), largestScript);
    } catch (const storage::FileError& error) {
        return failed("the script " + inQuotes(path) + " " + error.predicate());
    }
    return runScript(text, path, results, onShownError);
}

HStatus addCommand(const std::string& name, std::function<HPxCommand*()> create,
                   const std::function<HSyntax()>& syntax) {
    return CommandRegistry::instance().add(name, std::move(create), syntax, &application);
}

HStatus removeCommand(const std::string& name) {
    return CommandRegistry::instance().remove(name, &application);
}

std::vector<std::string> commandNames() {
    return CommandRegistry::instance().names();
}

} // namespace OpenQuarn
