// SPDX-License-Identifier: Apache-2.0
// `planted_race race` sums into one element from every task of a parallel loop, which the thread sanitizer must report;
// `planted_race disjoint` is the same loop with one element for each index, which it must not.
#include <tbb/global_control.h>
#include <tbb/parallel_for.h>
#include <tbb/task_arena.h>

#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdio>
#include <string_view>
#include <thread>
#include <vector>

namespace {

// Holds the calling thread, for a bounded time, until a second one has come: on a busy machine one thread may otherwise
// have run the whole loop before another wakes up. Relaxed, so that it orders nothing the sanitizer looks at.
void waitForSecondThread() {
    static std::atomic<int> threads = 0;
    thread_local bool counted = false;
    if (counted)
        return;
    counted = true;
    threads.fetch_add(1, std::memory_order_relaxed);
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
    while (threads.load(std::memory_order_relaxed) < 2 && std::chrono::steady_clock::now() < deadline)
        std::this_thread::yield();
}

} // namespace

int main(int argc, char** argv) {
    const bool race = argc > 1 && std::string_view(argv[1]) == "race";
    const std::vector<int> a(100000, 1);
    std::vector<int> b(a.size());
    const tbb::global_control twoThreads(tbb::global_control::max_allowed_parallelism, 2);
    tbb::task_arena arena(2); // also on one core
    arena.execute([&] {
        tbb::parallel_for(std::size_t{0}, a.size(), [&](std::size_t i) {
            waitForSecondThread();
            b[race ? 0 : i] += a[i];
        });
    });
    std::printf("%d\n", b[0]);
    return 0;
}
