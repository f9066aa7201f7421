// SPDX-License-Identifier: Apache-2.0
// Long work without the GIL, which Ctrl-C ends.
#pragma once

#include "frame/smoothing.h"
#include "quill/WorkWatch.h"

#include <pybind11/pybind11.h>

#include <atomic>
#include <chrono>
#include <optional>
#include <thread>

namespace neuralWarp::python {

/// Whether a signal has come whose handler raised an exception; looks ten times a second, on the thread that made this.
class Interrupt {
public:
    /// Any thread, several at once, without the GIL.
    bool isAsked();
    /// Throws what the handler raised. With the GIL, after isAsked() was true.
    [[noreturn]] void raise() { throw pybind11::error_already_set(*raised_); }

private:
    const std::thread::id thread_ = std::this_thread::get_id();
    std::chrono::steady_clock::time_point looked_ = std::chrono::steady_clock::now();
    std::atomic<bool> isAsked_ = false;
    std::optional<pybind11::error_already_set> raised_;
};

/// Calls body(isCancelled) with the GIL released. What it throws passes through, and quill::Cancelled as the exception
/// of whoever interrupted it.
template <class Body>
void withoutGil(const Body& body) {
    Interrupt interrupt;
    try {
        const pybind11::gil_scoped_release released;
        body(IsCancelled([&interrupt] { return interrupt.isAsked(); }));
    } catch (const quill::Cancelled&) {
        interrupt.raise();
    }
}

} // namespace neuralWarp::python
