// SPDX-License-Identifier: Apache-2.0
// Commands run by plug-ins.
#include "commands/Results.h"
#include "commands/dispatch.h"
#include "core/Object.h"
#include "core/apiCall.h"
#include "openquarn/HGlobal.h"
#include "openquarn_app/Messages.h"

using OpenQuarn::CommandValue;
using OpenQuarn::Operation;

namespace {

HStatus runLine(const std::string& line, CommandValue& result) {
    std::vector<OpenQuarn::ScriptCommand> commands;
    try {
        commands = OpenQuarn::splitScript(line);
    } catch (const OpenQuarn::ScriptError& error) {
        return {HStatus::kFailure, error.what()};
    }
    for (const OpenQuarn::ScriptCommand& command : commands)
        if (HStatus status = OpenQuarn::dispatch(command.words, result); status.error())
            return status;
    return {};
}

void show(const std::string& line, const CommandValue& result) {
    const std::string printed = OpenQuarn::printedValue(result);
    OpenQuarn::showMessage(OpenQuarn::Severity::info, printed.empty() ? line : line + "\n" + printed);
}

HStatus execute(const HString& command, CommandValue& result, bool displayEnabled) {
    return OpenQuarn::apiCall(Operation::HGlobal_executeCommand, [&]() -> HStatus {
        HStatus status = runLine(command.asStdString(), result);
        if (!status.error() && displayEnabled)
            show(command.asStdString(), result);
        return status;
    });
}

} // namespace

HStatus HGlobal::executeCommand(const HString& command, HCommandResult& result, bool displayEnabled,
                                bool /*undoEnabled*/) {
    CommandValue& value = OpenQuarn::Access::impl(result)->value;
    value = std::monostate();
    return execute(command, value, displayEnabled);
}

HStatus HGlobal::executeCommand(const HString& command, bool displayEnabled, bool /*undoEnabled*/) {
    CommandValue value;
    return execute(command, value, displayEnabled);
}
