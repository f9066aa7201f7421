// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HStatus.h"

#include "openquarn/HString.h"
#include "openquarn_app/Messages.h"

HStatus::HStatus(Code code, const std::string& text) noexcept
    : code_(code) {
    if (code == kSuccess || text.empty())
        return;
    try {
        text_ = std::make_shared<const std::string>(text);
    } catch (...) {
        text_ = nullptr; // the code alone still says that it failed
    }
}

namespace {

const char* codeName(HStatus::Code code) {
    switch (code) {
    case HStatus::kSuccess:
        return "";
    case HStatus::kFailure:
        return "failure";
    case HStatus::kInsufficientMemory:
        return "out of memory";
    case HStatus::kInvalidParameter:
        return "invalid parameter";
    case HStatus::kUnknownParameter:
        return "unknown parameter";
    case HStatus::kNotImplemented:
        return "not implemented";
    case HStatus::kNotFound:
        return "not found";
    }
    return "failure";
}

void report(OpenQuarn::Severity severity, const std::string& head, const HStatus& status) {
    OpenQuarn::showMessage(severity, head + ": " + status.errorString().asStdString());
}

} // namespace

HString HStatus::errorString() const {
    return text_ ? HString(*text_) : HString(codeName(code_));
}

void HStatus::perror(const char* text) const noexcept {
    if (!error())
        return;
    try {
        report(OpenQuarn::Severity::error, text ? text : "", *this);
    } catch (...) {
        OpenQuarn::showMessage(OpenQuarn::Severity::error, codeName(code_));
    }
}

void HStatus::pAPIerror(const char* source, int line) const noexcept {
    if (!error())
        return;
    try {
        report(OpenQuarn::Severity::report,
               std::string("API error in ") + (source ? source : "") + ", line " + std::to_string(line), *this);
    } catch (...) {
        OpenQuarn::showMessage(OpenQuarn::Severity::report, codeName(code_));
    }
}
