// SPDX-License-Identifier: Apache-2.0
#pragma once

namespace tbb::this_task_arena {

inline int max_concurrency() {
    return 1;
}

template <class Body>
void isolate(const Body& body) {
    body();
}

} // namespace tbb::this_task_arena
