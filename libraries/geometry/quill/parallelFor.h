// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <tbb/blocked_range.h>
#include <tbb/parallel_for.h>
#include <tbb/partitioner.h>

#include <algorithm>
#include <cstddef>
#include <limits>

namespace quill {

/// Grain of a loop that does no more than carry the points of vertices from one array to another: some 5 microseconds,
/// about as long as it takes until another thread begins. Found by frames of 1000, 2500 and 5000 vertices on two
/// threads.
inline constexpr std::size_t copyGrain = 4096;

/// Calls body(begin, end) over disjoint sub-ranges [begin, end) that together cover the int indices 0 .. count - 1, on
/// oneTBB's workers and the calling thread, and returns when all are done.
///   count  number of elements, at most INT_MAX; a larger count is a caller's error and nothing is done
///   body   callable as void(int, int), safe to call from several threads at once; each index writes only its own
///          element, so that the result does not depend on how the range was cut
///   grain  how many indices are worth another thread: a loop of no more runs on the calling thread, without a start
/// An exception thrown by body cancels the loop and is rethrown to the caller.
template <typename Body>
void parallelForRange(std::size_t count, const Body& body, std::size_t grain = 1) {
    constexpr auto most = static_cast<std::size_t>(std::numeric_limits<int>::max());
    const int end = count <= most ? static_cast<int>(count) : 0;
    const std::size_t piece = std::clamp<std::size_t>(grain, 1, most);
    if (static_cast<std::size_t>(end) <= piece) {
        if (end > 0)
            body(0, end);
        return;
    }
    tbb::parallel_for(
        tbb::blocked_range<int>(0, end, piece),
        [&body](const tbb::blocked_range<int>& range) { body(range.begin(), range.end()); }, tbb::auto_partitioner());
}

/// The same, calling body(i) for every index i.
template <typename Body>
void parallelFor(std::size_t count, const Body& body, std::size_t grain = 1) {
    parallelForRange(
        count,
        [&body](int begin, int end) {
            for (int i = begin; i < end; ++i)
                body(static_cast<std::size_t>(i));
        },
        grain);
}

} // namespace quill
