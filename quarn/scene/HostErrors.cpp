// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/HostErrors.h"

#include "quarn/console/Log.h"

namespace quarn {

using OpenQuarn::Severity;

namespace {

// a failed call that has a sentence, and not only a code
bool saysWhy(const std::string& report) {
    return !report.empty() && !report.ends_with(": failure") && !report.ends_with(": invalid parameter");
}

} // namespace

HostErrors::HostErrors() {
    // the host has this sink before it has given back the one of before, and calls it from one thread at a time
    previous_ = OpenQuarn::setMessageSink([this](const OpenQuarn::Message& message) { take(message); });
}

HostErrors::~HostErrors() {
    OpenQuarn::setMessageSink(std::move(previous_));
}

void HostErrors::take(const OpenQuarn::Message& message) {
    const auto line = [&] { return std::string(OpenQuarn::severityName(message.severity)) + ": " + message.text; };
    constexpr std::size_t kept = 3; // the causes; what follows from them comes later
    switch (message.severity) {
    case Severity::error:
        log(line);
        if (errors_.size() < kept)
            errors_.push_back(message.text);
        break;
    case Severity::report:
        log(line);
        if (report_.empty() || (!saysWhy(report_) && saysWhy(message.text)))
            report_ = message.text;
        break;
    default:
        if (previous_)
            previous_(message);
    }
}

std::string HostErrors::text() const {
    if (errors_.empty())
        return report_;
    std::string all;
    for (const std::string& error : errors_)
        all += (all.empty() ? "" : "; ") + error;
    return saysWhy(report_) ? all + "; " + report_ : all;
}

void HostErrors::clear() {
    errors_.clear();
    report_.clear();
}

} // namespace quarn
