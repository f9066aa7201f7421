// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <tbb/blocked_range.h>
#include <tbb/parallel_for.h>
#include <tbb/partitioner.h>

#include <cstddef>
#include <limits>

namespace quill {

/// Calls body(begin, end) over disjoint sub-ranges [begin, end) that together cover the int indices 0 .. count - 1, on
/// oneTBB's workers and the calling thread, and returns when all are done.
///   count  number of elements, at most INT_MAX; a larger count is a caller's error and nothing is done
///   body   callable as void(int, int), safe to call from several threads at once; each index writes only its own
///          element, so that the result does not depend on how the range was cut
/// An exception thrown by body cancels the loop and is rethrown to the caller.
template <typename Body>
void parallelForRange(std::size_t count, const Body& body) {
    const int end = count <= static_cast<std::size_t>(std::numeric_limits<int>::max()) ? static_cast<int>(count) : 0;
    tbb::parallel_for(
        tbb::blocked_range<int>(0, end, 1),
        [&body](const tbb::blocked_range<int>& range) { body(range.begin(), range.end()); }, tbb::auto_partitioner());
}

/// The same, calling body(i) for every index i.
template <typename Body>
void parallelFor(std::size_t count, const Body& body) {
    parallelForRange(count, [&body](int begin, int end) {
        for (int i = begin; i < end; ++i)
            body(static_cast<std::size_t>(i));
    });
}

} // namespace quill
