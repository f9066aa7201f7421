// SPDX-License-Identifier: Apache-2.0
// A stretch of time in the host's profile, from construction to destruction.
#pragma once

#include "openquarn/HApi.h"

#include <memory>

class HString;
namespace OpenQuarn {
struct ProfilingRecord;
}

/// While the application is not recording, one costs two calls and one read of a flag; no text is copied. What is open
/// when recording starts, or still open when it is stopped, is not recorded. Scopes of one thread nest; one is ended by
/// the thread that began it. Profiling changes no result, and nothing is reported when there is no memory for a record.
class OPENQUARN_API HProfilingScope {
public:
    /// `categoryIndex` of HProfiler::getCategoryIndex; with any other number nothing is recorded.
    /// `colorIndex` of the bar; any number, taken round the palette of the trace viewer.
    /// `eventName` what is being done; copied. Null counts as "".
    /// `description` what it is done to, such as the name of a node; copied. May be null. [any]
    HProfilingScope(int categoryIndex, int colorIndex, const char* eventName,
                    const char* description = nullptr) noexcept;
    HProfilingScope(int categoryIndex, int colorIndex, const char* eventName, const HString& description) noexcept;
    ~HProfilingScope();
    HProfilingScope(const HProfilingScope&) = delete;
    HProfilingScope& operator=(const HProfilingScope&) = delete;

private:
    std::unique_ptr<OpenQuarn::ProfilingRecord> record_; // none while nothing is recorded
};
