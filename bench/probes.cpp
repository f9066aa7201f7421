// SPDX-License-Identifier: Apache-2.0
#include "probes.h"

#include "quill/largePages.h"
#include "quill/parallelFor.h"

#include <algorithm>
#include <atomic>
#include <chrono>
#include <sched.h>
#include <stdexcept>
#include <thread>

namespace bench {
namespace {

using Clock = std::chrono::steady_clock;

double secondsSince(Clock::time_point start) {
    return std::chrono::duration<double>(Clock::now() - start).count();
}

// Arithmetic that the compiler can neither drop, nor move out of the measurement, nor speed up.
double spin(std::size_t steps) {
    static volatile double seed = 1.0;
    double x = seed;
    for (std::size_t i = 0; i < steps; ++i)
        x = x * 0.999999 + 1e-6;
    seed = x;
    return x;
}

// Seconds until `threads` threads have each done the same work.
double timeSpinning(std::size_t threads, std::size_t steps) {
    std::atomic<double> sink = 0.0;
    const auto start = Clock::now();
    std::vector<std::thread> others;
    for (std::size_t t = 1; t < threads; ++t)
        others.emplace_back([&] { sink = spin(steps); });
    sink = spin(steps);
    for (auto& other : others)
        other.join();
    return secondsSince(start);
}

} // namespace

std::size_t useCores(std::size_t count) {
    cpu_set_t allowed, wanted;
    CPU_ZERO(&wanted);
    if (sched_getaffinity(0, sizeof allowed, &allowed) != 0)
        throw std::runtime_error("the allowed cores cannot be read");
    std::size_t taken = 0;
    for (std::size_t core = 0; core < CPU_SETSIZE && taken < count; ++core)
        if (CPU_ISSET(core, &allowed)) {
            CPU_SET(core, &wanted);
            ++taken;
        }
    if (sched_setaffinity(0, sizeof wanted, &wanted) != 0)
        throw std::runtime_error("the process cannot be kept on its cores");
    return taken;
}

double coresAtWork(std::size_t threads) {
    constexpr std::size_t steps = 1'000'000;
    // the least time that one thread ever took: the yardstick of an undisturbed core
    static double undisturbed = timeSpinning(1, steps);
    double together = timeSpinning(threads, steps);
    for (int again = 0; again < 3; ++again) {
        undisturbed = std::min(undisturbed, timeSpinning(1, steps));
        together = std::min(together, timeSpinning(threads, steps));
    }
    return static_cast<double>(threads) * undisturbed / together;
}

Triad::Triad(std::size_t bytes)
    : a_(bytes / sizeof(float) / 3 + 1)
    , b_(a_.size(), 1.0F)
    , c_(a_.size(), 2.0F) {}

void Triad::run() {
    quill::parallelForRange(a_.size(), [&](int begin, int end) {
        float* a = a_.data();
        const float *b = b_.data(), *c = c_.data();
        for (int i = begin; i < end; ++i)
            a[i] = b[i] + 0.5F * c[i];
    });
}

ReadProbe::ReadProbe(std::size_t bytes) {
    quill::resizeInLargePages(values_, bytes / sizeof(std::uint32_t));
}

void ReadProbe::run() {
    quill::parallelForRange(values_.size(), [&](int begin, int end) {
        const std::uint32_t* const values = values_.data();
        std::uint32_t sum = 0;
        for (int i = begin; i < end; ++i)
            sum += values[i];
        sum_ += sum;
    });
}

} // namespace bench
