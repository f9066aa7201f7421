// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/Messages.h"

#include "messages/ShownErrors.h"

#include <cstdio>
#include <mutex>

namespace OpenQuarn {
namespace {

void writeToStandardError(const Message& message) {
    std::fprintf(stderr, "%s: %s\n", severityName(message.severity), message.text.c_str());
}

struct SinkHolder {
    std::mutex mutex;
    MessageSink sink = writeToStandardError;
};

SinkHolder& holder() {
    static SinkHolder held;
    return held;
}

thread_local bool showing = false;

} // namespace

const char* severityName(Severity severity) {
    switch (severity) {
    case Severity::info:
        return "info";
    case Severity::warning:
        return "warning";
    case Severity::error:
        return "error";
    case Severity::report:
        return "report";
    }
    return "unknown";
}

MessageSink setMessageSink(MessageSink sink) {
    SinkHolder& held = holder();
    const std::scoped_lock lock(held.mutex);
    MessageSink previous = std::move(held.sink);
    held.sink = sink ? std::move(sink) : MessageSink(writeToStandardError);
    return previous;
}

void showMessage(Severity severity, std::string_view text) noexcept {
    if (showing)
        return;
    showing = true;
    try {
        if (severity == Severity::error || severity == Severity::report)
            ShownErrors::note(std::string(text));
        SinkHolder& held = holder();
        const std::scoped_lock lock(held.mutex);
        held.sink({severity, std::string(text)});
    } catch (...) {
        // the sink failed or there is no memory for the text: standard error is what is left
        std::fprintf(stderr, "%s: %.*s\n", severityName(severity), static_cast<int>(text.size()), text.data());
    }
    showing = false;
}

} // namespace OpenQuarn
