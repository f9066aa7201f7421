// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/StdoutAside.h"

#include "storage/Target.h"

#include <cstdio>
#include <iostream>

#include <unistd.h>

namespace quarn {
namespace {

void flushAll() {
    std::cout.flush();
    static_cast<void>(std::fflush(stdout)); // a full disk shows when the answer itself is written
}

} // namespace

StdoutAside::StdoutAside()
    : kept_(::dup(STDOUT_FILENO)) {
    flushAll();
    if (kept_ >= 0)
        ::dup2(STDERR_FILENO, STDOUT_FILENO);
    storage::setStandardOutput(kept_); // what is written to /dev/stdout still goes there
}

StdoutAside::~StdoutAside() {
    flushAll();
    storage::setStandardOutput(-1);
    if (kept_ < 0)
        return;
    ::dup2(kept_, STDOUT_FILENO);
    ::close(kept_);
}

} // namespace quarn
