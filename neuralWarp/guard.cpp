// SPDX-License-Identifier: Apache-2.0
#include "neuralWarp/guard.h"

#include <exception>
#include <new>
#include <string>

namespace neuralWarp {
namespace {

std::string sentence(const HPxNode& node, const char* operation, const char* reason) {
    return "'" + node.name().asStdString() + "': " + operation + " failed: " + reason;
}

} // namespace

HStatus statusOfException(const HPxNode& node, const char* operation) noexcept {
    try {
        throw;
    } catch (const std::bad_alloc&) {
        return HStatus::kInsufficientMemory; // a text would need memory
    } catch (const std::exception& error) {
        try {
            return {HStatus::kFailure, sentence(node, operation, error.what())};
        } catch (...) {
            return HStatus::kFailure;
        }
    } catch (...) {
        return HStatus::kFailure;
    }
}

} // namespace neuralWarp
