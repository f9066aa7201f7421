// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/interrupt.h"

#include "quarn/console/exitCodes.h"

#include <atomic>
#include <csignal>

namespace quarn {
namespace {

volatile std::sig_atomic_t interrupted = 0; // the signal, the first that came
std::atomic<void (*)()> tellOfIt{nullptr};
static_assert(std::atomic<void (*)()>::is_always_lock_free);

void remember(int signal) {
    if (interrupted == 0)
        interrupted = signal;
    if (void (*tell)() = tellOfIt)
        tell();
    std::signal(signal, SIG_DFL);
}

} // namespace

void watchForInterrupt() {
    std::signal(SIGINT, remember);
    std::signal(SIGTERM, remember);
}

void whenInterrupted(void (*tell)()) {
    tellOfIt = tell;
    if (isInterrupted())
        tell();
}

bool isInterrupted() noexcept {
    return interrupted != 0;
}

int interruptStatus() noexcept {
    return interrupted == SIGTERM ? exitCode::terminated : exitCode::interrupted;
}

void throwIfInterrupted() {
    if (isInterrupted())
        throw Interrupted();
}

} // namespace quarn
