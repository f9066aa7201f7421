// SPDX-License-Identifier: Apache-2.0
#include "services/ProfilingRecords.h"

#include "openquarn/HProfiler.h"
#include "openquarn_app/Profiling.h"

#include <deque>
#include <memory>
#include <mutex>
#include <utility>

namespace OpenQuarn {
namespace {

using Clock = std::chrono::steady_clock;

constexpr std::size_t maxRecordsPerThread = 1'000'000;

struct ThreadBuffer {
    std::mutex mutex; // taken by its own thread at each record, by others only when they read or clear
    ThreadRecords kept;
};

struct Profiler {
    std::mutex mutex;
    std::vector<std::shared_ptr<ThreadBuffer>> buffers;
    std::deque<std::string> categories{"Evaluation"}; // a deque leaves its names where they are
    Clock::time_point begin;
    std::uint64_t recordingsStarted = 0;
    unsigned threadsSeen = 0;
};

/// Never destroyed: threads may end their last scopes while the process ends.
Profiler& profiler() {
    static auto& theProfiler = *new Profiler;
    return theProfiler;
}

std::shared_ptr<ThreadBuffer> makeBuffer() {
    auto buffer = std::make_shared<ThreadBuffer>();
    const std::scoped_lock lock(profiler().mutex);
    profiler().buffers.push_back(buffer);
    buffer->kept.thread = ++profiler().threadsSeen;
    return buffer;
}

ThreadBuffer& bufferOfThisThread() {
    thread_local const std::shared_ptr<ThreadBuffer> buffer = makeBuffer();
    return *buffer;
}

void clear(ThreadBuffer& buffer) {
    const std::scoped_lock lock(buffer.mutex);
    buffer.kept.records = {};
    buffer.kept.dropped = 0;
}

} // namespace

std::atomic<std::uint64_t> profiling::recording{0};

const std::string* profiling::categoryName(int index) noexcept {
    const std::scoped_lock lock(profiler().mutex);
    const auto& categories = profiler().categories;
    const bool isCategory = index >= 0 && static_cast<std::size_t>(index) < categories.size();
    return isCategory ? &categories[static_cast<std::size_t>(index)] : nullptr;
}

void profiling::keep(ProfilingRecord record) {
    ThreadBuffer& buffer = bufferOfThisThread();
    const std::scoped_lock lock(buffer.mutex);
    // looked at under the lock, so that nothing is kept once start() has cleared this buffer for the next recording
    if (record.recording != recording)
        return;
    if (buffer.kept.records.size() < maxRecordsPerThread)
        buffer.kept.records.push_back(std::move(record));
    else
        ++buffer.kept.dropped;
}

Clock::time_point profiling::recordingBegin() noexcept {
    const std::scoped_lock lock(profiler().mutex);
    return profiler().begin;
}

std::vector<ThreadRecords> profiling::keptRecords() {
    const std::scoped_lock lock(profiler().mutex);
    std::vector<ThreadRecords> all;
    all.reserve(profiler().buffers.size());
    for (const auto& buffer : profiler().buffers) {
        const std::scoped_lock bufferLock(buffer->mutex);
        all.push_back(buffer->kept);
    }
    return all;
}

void Profiling::start() {
    Profiler& all = profiler();
    const std::scoped_lock lock(all.mutex);
    profiling::recording = 0;
    std::erase_if(all.buffers, [](const auto& buffer) { return buffer.use_count() == 1; }); // their threads have ended
    for (const auto& buffer : all.buffers)
        clear(*buffer);
    all.begin = Clock::now();
    profiling::recording = ++all.recordingsStarted;
}

void Profiling::stop() noexcept {
    profiling::recording = 0;
}

bool Profiling::isRecording() noexcept {
    return profiling::recording != 0;
}

} // namespace OpenQuarn

int HProfiler::getCategoryIndex(const char* name) noexcept {
    if (!name || !*name)
        return -1;
    try {
        const std::scoped_lock lock(OpenQuarn::profiler().mutex);
        auto& categories = OpenQuarn::profiler().categories;
        for (std::size_t i = 0; i < categories.size(); ++i)
            if (categories[i] == name)
                return static_cast<int>(i);
        categories.emplace_back(name);
        return static_cast<int>(categories.size() - 1);
    } catch (...) {
        return -1; // no memory: what is profiled under it is not recorded
    }
}
