// SPDX-License-Identifier: Apache-2.0
// The table of operations that can be made to fail on demand. One row for each operation of the API that can fail:
// overloads share a row. A family keeps its rows in a .def file of its own: FAULT_POINT(Class, operation), and behind
// these, unless it is [any], the tag that says on which thread the operation may be called: main or eval.
#pragma once

#include "core/threads.h"

#include <atomic>
#include <cstddef>
#include <string_view>

namespace OpenQuarn {

enum class FaultPoint : unsigned {
#define FAULT_POINT(type, operation, ...) type##_##operation,
#include "core/faults/all.def"
#undef FAULT_POINT
    count
};

/// "Class::operation".
const char* faultPointName(FaultPoint point);

namespace detail {
constexpr ThreadTag threadTagNamed(std::string_view name) {
    if (name.empty())
        return ThreadTag::any;
    return name == "main" ? ThreadTag::main : ThreadTag::eval;
}

inline constexpr ThreadTag threadTags[] = {
#define FAULT_POINT(type, operation, ...) threadTagNamed(#__VA_ARGS__),
#include "core/faults/all.def"
#undef FAULT_POINT
};

extern std::atomic<bool> faultsArmed;
bool countFault(FaultPoint point) noexcept;
} // namespace detail

/// On which threads the operation may be called.
constexpr ThreadTag threadTagOf(FaultPoint point) {
    return detail::threadTags[static_cast<std::size_t>(point)];
}

/// Called by each operation, once a call, before it does anything: true when this call has to fail. One relaxed load
/// while no fault is armed. Thread: any.
inline bool faultFires(FaultPoint point) noexcept {
    return detail::faultsArmed.load(std::memory_order_relaxed) && detail::countFault(point);
}

} // namespace OpenQuarn
