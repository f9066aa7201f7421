// SPDX-License-Identifier: Apache-2.0
#include "core/threads.h"

#include "graph/evaluation.h"

#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <thread>

namespace OpenQuarn {
namespace {

std::atomic<std::thread::id> mainThread{std::this_thread::get_id()};

} // namespace

void setMainThread() {
    mainThread = std::this_thread::get_id();
}
bool isMainThread() {
    return mainThread == std::this_thread::get_id();
}

#ifndef NDEBUG
namespace {

[[noreturn]] void misuse(const char* function, const char* rule) {
    std::fprintf(stderr, "OpenQuarn: %s was called %s\n", function, rule);
    std::abort();
}

} // namespace

void requireMain(const char* function) {
    if (!isMainThread())
        misuse(function, "on another thread than the main one");
    if (isEvaluating())
        misuse(function, "during an evaluation");
}

void requireEval(const char* function) {
    if (!isMainThread() && !isEvaluating())
        misuse(function, "on a thread that evaluates nothing");
}
#endif

} // namespace OpenQuarn
