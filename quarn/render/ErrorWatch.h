// SPDX-License-Identifier: Apache-2.0
// Errors that nodes show while they are evaluated: a deformer without its model passes its mesh through, says so, and
// computes without failing. A picture of that is not what was asked for.
#pragma once

#include "openquarn_app/Messages.h"

#include <stdexcept>
#include <string>

namespace quarn {

/// While it lives, keeps the first message of severity "error" instead of showing it; the others are shown as before.
/// Thread: main; messages come from any.
class ErrorWatch {
public:
    ErrorWatch() {
        previous_ = OpenQuarn::setMessageSink([this](const OpenQuarn::Message& message) { take(message); });
        if (!previous_)
            throw std::logic_error("the host has no message sink");
    }
    ~ErrorWatch() { OpenQuarn::setMessageSink(previous_); }
    ErrorWatch(const ErrorWatch&) = delete;
    ErrorWatch& operator=(const ErrorWatch&) = delete;

    /// Throws std::runtime_error with the first error, if there was one, and the frame.
    void throwIfAny(int frame) const {
        if (!first_.empty())
            throw std::runtime_error(first_ + " (at frame " + std::to_string(frame) + ")");
    }

private:
    void take(const OpenQuarn::Message& message) {
        if (message.severity == OpenQuarn::Severity::error && first_.empty())
            first_ = message.text;
        else
            previous_(message);
    }
    std::string first_;
    OpenQuarn::MessageSink previous_;
};

} // namespace quarn
