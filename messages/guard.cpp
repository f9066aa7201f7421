// SPDX-License-Identifier: Apache-2.0
#include "messages/guard.h"

#include <exception>
#include <new>
#include <string>

namespace neuralWarp {
namespace {

/// Without a text where there is no memory for one.
HStatus failure(const HPxNode& node, const char* operation, const char* reason) noexcept {
    try {
        return {HStatus::kFailure, "node '" + node.name().asStdString() + "', " + operation + ": " + reason};
    } catch (...) {
        return HStatus::kFailure;
    }
}

} // namespace

HStatus statusOfException(const HPxNode& node, const char* operation) noexcept {
    try {
        throw;
    } catch (const std::bad_alloc&) {
        return HStatus::kInsufficientMemory;
    } catch (const std::exception& error) {
        return failure(node, operation, error.what());
    } catch (...) {
        return failure(node, operation, "unknown exception");
    }
}

} // namespace neuralWarp
