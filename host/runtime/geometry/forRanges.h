// SPDX-License-Identifier: Apache-2.0
// Loops over the vertices of a mesh.
#pragma once

#include <oneapi/tbb/blocked_range.h>
#include <oneapi/tbb/parallel_for.h>
#include <oneapi/tbb/task_arena.h>

#include <cstddef>

namespace OpenQuarn {

/// Calls body(begin, end) over sub-ranges that together cover 0 to `count` - 1, on several threads where there are so
/// many that it pays. Whoever waits picks up no other work meanwhile: it may hold a lock.
template <class Body>
void forRanges(std::size_t count, const Body& body) {
    constexpr std::size_t smallest = 8192; // about 10 microseconds of copying
    if (count < 2 * smallest) {
        body(std::size_t{0}, count);
        return;
    }
    using Range = tbb::blocked_range<std::size_t>;
    tbb::this_task_arena::isolate([&] {
        tbb::parallel_for(Range(0, count, smallest), [&](const Range& range) { body(range.begin(), range.end()); });
    });
}

} // namespace OpenQuarn
