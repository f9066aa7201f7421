// SPDX-License-Identifier: Apache-2.0
// What wraps the functions of a node that the host calls.
#pragma once

#include "openquarn/HStatus.h"

#include <exception>
#include <new>
#include <utility>

namespace rig {

/// The status that `body()` returns; what it throws becomes one.
template <class Body>
HStatus guarded(Body&& body) noexcept {
    try {
        return std::forward<Body>(body)();
    } catch (const std::bad_alloc&) {
        return HStatus::kInsufficientMemory;
    } catch (const std::exception& problem) {
        return {HStatus::kFailure, problem.what()};
    } catch (...) {
        return HStatus::kFailure;
    }
}

} // namespace rig
