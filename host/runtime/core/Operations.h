// SPDX-License-Identifier: Apache-2.0
// The table of the API's operations: those that can be made to fail on demand, which are all that can fail, and those
// that cannot fail and may not be called everywhere. Overloads share a row. A family keeps its rows in a .def file of
// its own: FAULT_POINT(Class, operation) or CANNOT_FAIL(Class, operation), and behind these, unless it is [any], the
// tag that says on which thread the operation may be called: main or eval.
#pragma once

#include "core/threads.h"

#include <atomic>
#include <cstddef>
#include <string_view>

namespace OpenQuarn {

enum class Operation : unsigned {
#define CANNOT_FAIL(type, operation, ...)
#define FAULT_POINT(type, operation, ...) type##_##operation,
#include "core/operations/all.def"
#undef FAULT_POINT
#undef CANNOT_FAIL
    faultPoints, ///< how many they are: the others come behind them
    lastFaultPoint = faultPoints - 1,
#define CANNOT_FAIL(type, operation, ...) type##_##operation,
#define FAULT_POINT(type, operation, ...)
#include "core/operations/all.def"
#undef FAULT_POINT
#undef CANNOT_FAIL
};

namespace detail {
constexpr ThreadTag threadTagNamed(std::string_view name) {
    if (name.empty())
        return ThreadTag::any;
    return name == "main" ? ThreadTag::main : ThreadTag::eval;
}

inline constexpr HostCall operations[] = {
#define CANNOT_FAIL(type, operation, ...)
#define FAULT_POINT(type, operation, ...) {#type "::" #operation, threadTagNamed(#__VA_ARGS__)},
#include "core/operations/all.def"
#undef FAULT_POINT
#undef CANNOT_FAIL
#define CANNOT_FAIL(type, operation, ...) {#type "::" #operation, threadTagNamed(#__VA_ARGS__)},
#define FAULT_POINT(type, operation, ...)
#include "core/operations/all.def"
#undef FAULT_POINT
#undef CANNOT_FAIL
};

extern std::atomic<bool> faultsArmed;
bool countFault(Operation operation) noexcept;
} // namespace detail

/// Its name is "Class::operation".
constexpr const HostCall& callOf(Operation operation) {
    return detail::operations[static_cast<std::size_t>(operation)];
}

constexpr const char* operationName(Operation operation) {
    return callOf(operation).name;
}

inline HStatus threadStatus(Operation operation) noexcept {
    return threadStatus(callOf(operation));
}

inline bool isRefused(Operation operation) noexcept {
    return isRefused(callOf(operation));
}

/// Called by each operation that can fail, once a call, before it does anything: true when this call has to fail. One
/// relaxed load while no fault is armed. Thread: any.
inline bool faultFires(Operation operation) noexcept {
    return detail::faultsArmed.load(std::memory_order_relaxed) && detail::countFault(operation);
}

} // namespace OpenQuarn
