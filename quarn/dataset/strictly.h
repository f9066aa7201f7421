// SPDX-License-Identifier: Apache-2.0
// A frame in which nothing may go wrong.
#pragma once

#include "quarn/scene/HostErrors.h"

#include <stdexcept>
#include <string>

namespace quarn {

/// Does the work of a frame. Whatever it throws as std::runtime_error, or the host says against it, is thrown with the
/// frame before it. Thread: main.
template <class Work>
void strictly(int frame, Work work) {
    const HostErrors errors;
    std::string error;
    try {
        work();
    } catch (const std::runtime_error& thrown) {
        error = thrown.what();
    }
    // what the host says is nearer to the cause
    if (const std::string said = errors.text(); !said.empty())
        error = said;
    if (!error.empty())
        throw std::runtime_error("frame " + std::to_string(frame) + ": " + error);
}

} // namespace quarn
