// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/interrupt.h"

#include <atomic>
#include <csignal>

namespace quarn {
namespace {

volatile std::sig_atomic_t interrupted = 0;
std::atomic<void (*)()> tellOfIt{nullptr};
static_assert(std::atomic<void (*)()>::is_always_lock_free);

void remember(int signal) {
    interrupted = 1;
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

void throwIfInterrupted() {
    if (isInterrupted())
        throw Interrupted();
}

} // namespace quarn
