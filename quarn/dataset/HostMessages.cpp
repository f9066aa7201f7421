// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/HostMessages.h"

namespace quarn {

using OpenQuarn::Severity;

HostMessages::HostMessages() {
    constexpr std::size_t kept = 3; // the causes; what follows from them comes later
    // the host has this sink before it has given back the one of before, and calls it from one thread at a time
    previous_ = OpenQuarn::setMessageSink([this](const OpenQuarn::Message& message) {
        const bool isFailure = message.severity == Severity::error || message.severity == Severity::report;
        if (!isFailure && previous_)
            previous_(message);
        else if (isFailure && failures_.size() < kept)
            failures_.push_back(message.text);
    });
}

HostMessages::~HostMessages() {
    OpenQuarn::setMessageSink(std::move(previous_));
}

std::string HostMessages::failures() const {
    std::string text;
    for (const std::string& failure : failures_)
        text += (text.empty() ? "" : "; ") + failure;
    return text;
}

} // namespace quarn
