// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <vector>

// What the machine gives at the moment: a shared machine's cores and bandwidth come and go.
namespace bench {

// Restricts the whole process to its first `count` allowed cores. Before anything starts a thread. Gives the number of
// cores it now has.
std::size_t useCores(std::size_t count);

// How many cores' worth of arithmetic `threads` threads get at once, 0 < result <= threads (about 20 ms).
double coresAtWork(std::size_t threads);

// A STREAM-like triad a[i] = b[i] + s * c[i] over three float arrays that together hold a given number of bytes, in
// the library's own parallel loop: the time that many bytes take at the least.
class Triad {
public:
    explicit Triad(std::size_t bytes);
    void run();

private:
    std::vector<float> a_, b_, c_;
};

// A sum over as many bytes, in large pages: the time that reading them takes at the least.
class ReadProbe {
public:
    explicit ReadProbe(std::size_t bytes);
    void run();

private:
    std::vector<std::uint32_t> values_;
    std::atomic<std::uint32_t> sum_{0}; // so that no compiler leaves the reading out
};

} // namespace bench
