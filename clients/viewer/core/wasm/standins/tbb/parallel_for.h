// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <tbb/blocked_range.h>
#include <tbb/partitioner.h>

#include <algorithm>

namespace tbb {

template <class Range, class Body>
void parallel_for(const Range& range, const Body& body, const auto_partitioner& = {}) {
    if (range.begin() < range.end())
        body(range);
}

/// In pieces of the grain, by which whoever asks for this keeps what a piece writes in the cache.
template <class Value, class Body>
void parallel_for(const blocked_range<Value>& range, const Body& body, const simple_partitioner&) {
    const auto grain = static_cast<Value>(range.grainsize());
    for (Value begin = range.begin(); begin < range.end(); begin += grain)
        body(blocked_range<Value>(begin, std::min(range.end(), begin + grain), range.grainsize()));
}

} // namespace tbb
