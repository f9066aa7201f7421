// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HProfilingScope.h"

#include "openquarn/HString.h"
#include "services/ProfilingRecords.h"

#include <utility>

using OpenQuarn::ProfilingRecord;
namespace profiling = OpenQuarn::profiling;

namespace {

/// A record that begins now; none while nothing is recorded, for an unknown category, and without memory.
std::unique_ptr<ProfilingRecord> beginRecord(int category, int colorIndex, const char* eventName,
                                             const char* description) noexcept {
    const std::uint64_t recording = profiling::recording.load(std::memory_order_relaxed);
    if (recording == 0)
        return nullptr;
    try {
        if (!profiling::categoryName(category))
            return nullptr;
        auto record = std::make_unique<ProfilingRecord>();
        record->eventName = eventName ? eventName : "";
        record->description = description ? description : "";
        record->category = category;
        record->colorIndex = colorIndex;
        record->recording = recording;
        record->begin = std::chrono::steady_clock::now();
        return record;
    } catch (...) {
        return nullptr;
    }
}

} // namespace

HProfilingScope::HProfilingScope(int categoryIndex, int colorIndex, const char* eventName,
                                 const char* description) noexcept
    : record_(beginRecord(categoryIndex, colorIndex, eventName, description)) {}

HProfilingScope::HProfilingScope(int categoryIndex, int colorIndex, const char* eventName,
                                 const HString& description) noexcept
    : record_(beginRecord(categoryIndex, colorIndex, eventName, description.asChar())) {}

HProfilingScope::~HProfilingScope() {
    if (!record_)
        return;
    record_->end = std::chrono::steady_clock::now();
    try {
        profiling::keep(std::move(*record_));
    } catch (...) {
        return; // no memory to keep it: a record less changes no result
    }
}
