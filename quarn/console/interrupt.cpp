// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/interrupt.h"

#include <csignal>

namespace quarn {
namespace {

volatile std::sig_atomic_t interrupted = 0;

void remember(int signal) {
    interrupted = 1;
    std::signal(signal, SIG_DFL);
}

} // namespace

void watchForInterrupt() {
    std::signal(SIGINT, remember);
    std::signal(SIGTERM, remember);
}

void throwIfInterrupted() {
    if (interrupted != 0)
        throw Interrupted();
}

} // namespace quarn
