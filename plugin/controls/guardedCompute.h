// SPDX-License-Identifier: Apache-2.0
// What wraps the compute() of a control node.
#pragma once

#include "messages/guard.h"
#include "openquarn/HProfiler.h"
#include "openquarn/HProfilingScope.h"

#include <utility>

namespace neuralWarp {

/// The status that `body()` returns; what it throws becomes one. Shows in the host's profile as `operation`, with the
/// node's name. [eval]
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
