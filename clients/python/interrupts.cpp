// SPDX-License-Identifier: Apache-2.0
#include "python/interrupts.h"

namespace neuralWarp::python {

bool Interrupt::isAsked() {
    if (isAsked_.load(std::memory_order_relaxed))
        return true;
    if (std::this_thread::get_id() != thread_)
        return false;
    const auto now = std::chrono::steady_clock::now();
    if (now - looked_ < std::chrono::milliseconds(100)) // the GIL may take a while
        return false;
    looked_ = now;
    const pybind11::gil_scoped_acquire gil;
    if (PyErr_CheckSignals() == 0)
        return false;
    raised_.emplace();
    isAsked_.store(true, std::memory_order_relaxed);
    return true;
}

} // namespace neuralWarp::python
