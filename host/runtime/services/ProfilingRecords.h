// SPDX-License-Identifier: Apache-2.0
// What the profiler keeps: a buffer for each thread, and the names of the categories.
#pragma once

#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace OpenQuarn {

struct ProfilingRecord {
    std::string eventName;
    std::string description;
    int category = 0;
    int colorIndex = 0;
    std::uint64_t recording = 0; // of the recording it belongs to
    std::chrono::steady_clock::time_point begin;
    std::chrono::steady_clock::time_point end;
};

struct ThreadRecords {
    unsigned thread = 0; // numbered from 1 in the order of their first records
    std::size_t dropped = 0;
    std::vector<ProfilingRecord> records;
};

namespace profiling {

/// Number of the recording that is on; 0 when none is. Relaxed reads will do: a record says which one it belongs to.
extern std::atomic<std::uint64_t> recording;

/// The name of a category, or null for an index that is none. Valid for good.
const std::string* categoryName(int index) noexcept;

/// Keeps a record that has ended, unless its recording has ended too. Thread: any.
void keep(ProfilingRecord record);

/// When the recording that is on, or was last, began.
std::chrono::steady_clock::time_point recordingBegin() noexcept;

/// A copy of what has been kept, by thread. Thread: any.
std::vector<ThreadRecords> keptRecords();

} // namespace profiling
} // namespace OpenQuarn
