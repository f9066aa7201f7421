// SPDX-License-Identifier: Apache-2.0
// What wraps the body of every operation of the API that can fail: the check of its thread, the fault on demand, and
// exceptions made statuses.
#pragma once

#include "core/Operations.h"
#include "openquarn/HStatus.h"

#include <exception>
#include <new>
#include <string>
#include <utility>

namespace OpenQuarn {

/// The failing status of a fault on demand.
HStatus faultStatus(Operation point) noexcept;

/// The status of an exception that is being handled: kInsufficientMemory for std::bad_alloc, else kFailure with its
/// text. `operation` names what threw.
HStatus statusOfException(const char* operation) noexcept;

/// For an operation that returns a status: `return apiCall(Operation::HPlug_setString, [&] { … });`
template <class Body>
HStatus apiCall(Operation point, Body&& body) noexcept {
    if (!mayCall(callOf(point).tag))
        return misuse(callOf(point));
    if (faultFires(point))
        return faultStatus(point);
    try {
        return std::forward<Body>(body)();
    } catch (...) {
        return statusOfException(operationName(point));
    }
}

/// For an operation that returns a value and writes its status where the caller asks for it. The body gets a status
/// that starts as success, and its value is returned as it is; `fallback` is returned when it does not run or throws.
template <class Value, class Body>
Value apiValue(Operation point, HStatus* status, Value fallback, Body&& body) noexcept {
    HStatus outcome;
    Value value = fallback;
    if (!mayCall(callOf(point).tag)) {
        outcome = misuse(callOf(point));
    } else if (faultFires(point)) {
        outcome = faultStatus(point);
    } else {
        try {
            value = std::forward<Body>(body)(outcome);
        } catch (...) {
            outcome = statusOfException(operationName(point));
        }
    }
    if (status)
        *status = outcome;
    return value;
}

} // namespace OpenQuarn
