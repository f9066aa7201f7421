// SPDX-License-Identifier: Apache-2.0
// The end of every exception: nothing is thrown at the host. Wraps the functions of a plug-in that the host calls.
// [any] throughout.
#pragma once

#include "openquarn/HGlobal.h"
#include "openquarn/HPxNode.h"
#include "openquarn/HStatus.h"

#include <exception>
#include <new>
#include <string>
#include <utility>

namespace openquarn_helpers {
namespace detail {

/// `prefix()` gives what stands before the reason; without memory for a text, there is none.
template <class Prefix>
HStatus statusOfException(const Prefix& prefix) noexcept {
    const auto failure = [&](const char* reason) noexcept -> HStatus {
        try {
            return {HStatus::kFailure, prefix() + reason};
        } catch (...) {
            return HStatus::kFailure;
        }
    };
    try {
        throw;
    } catch (const std::bad_alloc&) {
        return HStatus::kInsufficientMemory;
    } catch (const std::exception& error) {
        return failure(error.what());
    } catch (...) {
        return failure("unknown exception");
    }
}

} // namespace detail

/// The status of the exception that is being handled, for an operation of a node: kInsufficientMemory for a lack of
/// memory, else kFailure with "node 'NAME', OPERATION: WHAT".
inline HStatus statusOfException(const HPxNode& node, const char* operation) noexcept {
    return detail::statusOfException([&] { return "node '" + node.name().asStdString() + "', " + operation + ": "; });
}

/// The same for an operation of something that is no node: "OPERATION: WHAT".
inline HStatus statusOfException(const char* operation) noexcept {
    return detail::statusOfException([&] { return std::string(operation) + ": "; });
}

/// Runs `body`, which returns a status; what it throws becomes one.
template <class Body>
HStatus guarded(const HPxNode& node, const char* operation, Body&& body) noexcept {
    try {
        return std::forward<Body>(body)();
    } catch (...) {
        return statusOfException(node, operation);
    }
}

/// The same where the host says what was running: the text is that of the exception alone.
template <class Body>
HStatus guarded(Body&& body) noexcept {
    try {
        return std::forward<Body>(body)();
    } catch (...) {
        return detail::statusOfException([] { return std::string(); });
    }
}

/// The same for an operation that has no status to return: it shows an error.
template <class Body>
void guardedAndShown(const HPxNode& node, const char* operation, Body&& body) noexcept {
    try {
        std::forward<Body>(body)();
    } catch (...) {
        HGlobal::displayError(statusOfException(node, operation).errorString());
    }
}

} // namespace openquarn_helpers
