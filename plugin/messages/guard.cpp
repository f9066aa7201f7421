// SPDX-License-Identifier: Apache-2.0
#include "messages/guard.h"

#include <exception>
#include <new>
#include <string>

namespace neuralWarp {
namespace {

/// Without a text where there is no memory for one. `place` says where it happened.
template <class Place>
HStatus failure(const Place& place, const char* reason) noexcept {
    try {
        return {HStatus::kFailure, place() + ": " + reason};
    } catch (...) {
        return HStatus::kFailure;
    }
}

template <class Place>
HStatus statusWithPlace(const Place& place) noexcept {
    try {
        throw;
    } catch (const std::bad_alloc&) {
        return HStatus::kInsufficientMemory;
    } catch (const std::exception& error) {
        return failure(place, error.what());
    } catch (...) {
        return failure(place, "unknown exception");
    }
}

} // namespace

HStatus statusOfException(const HPxNode& node, const char* operation) noexcept {
    return statusWithPlace([&] { return "node '" + node.name().asStdString() + "', " + operation; });
}

HStatus statusOfException(const char* operation) noexcept {
    return statusWithPlace([&] { return std::string(operation); });
}

} // namespace neuralWarp
