// SPDX-License-Identifier: Apache-2.0
// Everything the host and its plug-ins have to say, in the order they say it.
#pragma once

#include "openquarn/HApi.h"

#include <functional>
#include <string>
#include <string_view>

namespace OpenQuarn {

enum class Severity {
    info,    ///< What a command prints.
    warning, ///< Something the user should look at; the work was done.
    error,   ///< Something could not be done.
    report,  ///< A failed host call, as a plug-in or the host reports it for the one who has to mend it.
};

/// "info", "warning", "error" or "report".
OPENQUARN_API const char* severityName(Severity severity);

struct Message {
    Severity severity;
    std::string text; ///< without a final newline
};

/// Receives the messages, one at a time although they may come from several threads. Must not throw; a message that is
/// shown from inside the sink is dropped.
using MessageSink = std::function<void(const Message&)>;

/// Sends all messages from now on to `sink`; an empty one brings back the first sink, which writes them to standard
/// error as "severity: text". Returns the sink that was in place. Thread: any.
OPENQUARN_API MessageSink setMessageSink(MessageSink sink);

/// Shows a message. Thread: any.
OPENQUARN_API void showMessage(Severity severity, std::string_view text) noexcept;

} // namespace OpenQuarn
