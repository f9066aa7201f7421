// SPDX-License-Identifier: Apache-2.0
// Ctrl-C, and the polite end that a batch system asks for: noticed by the work itself, between two steps.
#pragma once

#include <stdexcept>

namespace quarn {

/// The user has asked for the end. Everything that was half done is undone on its way up; main() ends with
/// interruptStatus().
struct Interrupted : std::runtime_error {
    Interrupted()
        : std::runtime_error("interrupted") {}
};

/// From now on SIGINT and SIGTERM are remembered instead of ending the process; a second one ends it at once.
/// Thread: main.
void watchForInterrupt();

/// Calls `tell` when SIGINT or SIGTERM comes, from the handler of the signal; at once when one has come already. So
/// long work that knows nothing of this file hears of it as well. Thread: main.
void whenInterrupted(void (*tell)());

/// SIGINT or SIGTERM has come. Thread: any.
bool isInterrupted() noexcept;
/// What a process ends with that either has ended, the first of them: exitCode::interrupted or exitCode::terminated.
/// Thread: any.
int interruptStatus() noexcept;
/// Throws Interrupted once SIGINT or SIGTERM has come. Thread: any.
void throwIfInterrupted();

} // namespace quarn
