// SPDX-License-Identifier: Apache-2.0
// What wraps the functions that the host calls on a control node: nothing is thrown at it.
#pragma once

#include "openquarn/HProfiler.h"
#include "openquarn/HProfilingScope.h"
#include "openquarn/HPxNode.h"

#include <exception>
#include <new>
#include <string>
#include <utility>

namespace neuralWarp {

/// "node 'NAME', OPERATION: WHAT", as a failing status; without a text where there is no memory for one. [any]
inline HStatus failureOf(const HPxNode& node, const char* operation, const char* what) noexcept {
    try {
        return {HStatus::kFailure, "node '" + node.name().asStdString() + "', " + operation + ": " + what};
    } catch (...) {
        return HStatus::kFailure;
    }
}

/// The status that `body()` returns; for an exception kInsufficientMemory or kFailure. [any]
template <class Body>
HStatus guarded(const HPxNode& node, const char* operation, Body&& body) noexcept {
    try {
        return std::forward<Body>(body)();
    } catch (const std::bad_alloc&) {
        return HStatus::kInsufficientMemory;
    } catch (const std::exception& error) {
        return failureOf(node, operation, error.what());
    } catch (...) {
        return failureOf(node, operation, "unknown exception");
    }
}

/// The same for a compute(), which shows in the host's profile as `operation`, with the node's name. [eval]
template <class Body>
HStatus guardedCompute(const HPxNode& node, const char* operation, Body&& body) noexcept {
    return guarded(node, operation, [&] {
        static const int category = HProfiler::getCategoryIndex("Evaluation");
        constexpr int colorIndex = 10;
        const HProfilingScope scope(category, colorIndex, operation, node.name());
        return std::forward<Body>(body)();
    });
}

} // namespace neuralWarp
