// SPDX-License-Identifier: Apache-2.0
// The end of every exception: nothing is thrown at the host.
#pragma once

#include "openquarn/HGlobal.h"
#include "openquarn/HPxNode.h"
#include "openquarn/HStatus.h"

#include <utility>

namespace neuralWarp {

/// The status of the exception that is being handled, for an operation of a node: kInsufficientMemory for a lack of
/// memory, else kFailure with "node 'NAME', OPERATION: WHAT". [any]
HStatus statusOfException(const HPxNode& node, const char* operation) noexcept;
/// The same for an operation of something that is no node: "OPERATION: WHAT". [any]
HStatus statusOfException(const char* operation) noexcept;

/// Runs `body`, which returns a status; what it throws becomes one. [any]
template <class Body>
HStatus guarded(const HPxNode& node, const char* operation, Body&& body) noexcept {
    try {
        return std::forward<Body>(body)();
    } catch (...) {
        return statusOfException(node, operation);
    }
}

/// The same for an operation that has no status to return: it shows an error. [any]
template <class Body>
void guardedAndShown(const HPxNode& node, const char* operation, Body&& body) noexcept {
    try {
        std::forward<Body>(body)();
    } catch (...) {
        HGlobal::displayError(statusOfException(node, operation).errorString());
    }
}

} // namespace neuralWarp
