// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HGlobal.h"
#include "openquarn_app/Messages.h"

using OpenQuarn::Severity;
using OpenQuarn::showMessage;

void HGlobal::displayError(const HString& text) noexcept {
    showMessage(Severity::error, text.asStdString());
}

void HGlobal::displayWarning(const HString& text) noexcept {
    showMessage(Severity::warning, text.asStdString());
}

void HGlobal::displayInfo(const HString& text) noexcept {
    showMessage(Severity::info, text.asStdString());
}
