// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HPxCommand.h"

#include "commands/CommandRegistry.h"
#include "core/Operations.h"
#include "openquarn/HString.h"
#include "openquarn_app/Messages.h"

using OpenQuarn::isRefused;
using OpenQuarn::Operation;

HPxCommand::HPxCommand() noexcept = default;
HPxCommand::~HPxCommand() = default;

HStatus HPxCommand::undoIt() {
    return {HStatus::kNotImplemented, "the command cannot be undone"};
}

HStatus HPxCommand::redoIt() {
    return {HStatus::kNotImplemented, "the command cannot be done again"};
}

bool HPxCommand::isUndoable() const {
    return false;
}

bool HPxCommand::hasSyntax() const {
    return impl_ && impl_->syntax;
}

HSyntax HPxCommand::syntax() const {
    return !isRefused(Operation::HPxCommand_syntax) && hasSyntax() ? *impl_->syntax : HSyntax();
}

void HPxCommand::displayError(const HString& text) noexcept {
    OpenQuarn::showMessage(OpenQuarn::Severity::error, text.asStdString());
}

void HPxCommand::displayWarning(const HString& text) noexcept {
    OpenQuarn::showMessage(OpenQuarn::Severity::warning, text.asStdString());
}

void HPxCommand::displayInfo(const HString& text) noexcept {
    OpenQuarn::showMessage(OpenQuarn::Severity::info, text.asStdString());
}
