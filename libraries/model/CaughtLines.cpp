// SPDX-License-Identifier: Apache-2.0
#include "nw_model/CaughtLines.h"

#include "printLine.h"

#include <cstdio>
#include <new>

namespace neuralWarp {
namespace {

thread_local CaughtLines* listener = nullptr;

} // namespace

CaughtLines::CaughtLines()
    : outer_(listener) {
    listener = this;
}

CaughtLines::~CaughtLines() {
    listener = outer_;
}

void printLine(const char* line) noexcept {
    if (listener == nullptr) {
        std::fputs(line, stdout);
        return;
    }
    try {
        listener->text_ += line;
    } catch (const std::bad_alloc&) { // what it is about is reported all the same
    }
}

void printLine(std::initializer_list<const char*> parts) noexcept {
    for (const char* part : parts)
        printLine(part);
}

} // namespace neuralWarp
