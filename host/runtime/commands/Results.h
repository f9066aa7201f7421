// SPDX-License-Identifier: Apache-2.0
// The results of the commands that are running: one a command, the innermost on top.
#pragma once

#include "openquarn/HCommandResult.h"
#include "openquarn_app/Commands.h"

#include <utility>

namespace OpenQuarn {

/// What an HCommandResult holds.
struct ResultHolder {
    CommandValue value;
};

/// The result of a command while the object lives; the commands that it runs have theirs on top of it. Thread: one
/// stack of them a thread.
class RunningResult {
public:
    RunningResult();
    ~RunningResult();
    RunningResult(const RunningResult&) = delete;
    RunningResult& operator=(const RunningResult&) = delete;

    CommandValue take() { return std::exchange(value_, {}); }
    /// How many commands are running on this thread.
    static int depth();
    /// The innermost command's; null when none runs on this thread.
    static CommandValue* current();

private:
    CommandValue value_;
    RunningResult* outer_;
};

HCommandResult::Type kindOf(const CommandValue& value);
/// "an integer" and so on.
const char* kindName(HCommandResult::Type type);

} // namespace OpenQuarn
