// SPDX-License-Identifier: Apache-2.0
// Records where the time goes.
#pragma once

#include "openquarn/HApi.h"

#include <filesystem>
#include <iosfwd>

namespace OpenQuarn {

/// Records the profiling scopes (HProfilingScope) of the host and its plug-ins, on every thread. One recording a
/// process, off at its start. Thread: any.
class OPENQUARN_API Profiling {
public:
    Profiling() = delete;

    /// Forgets what was recorded, and records from now on.
    static void start();
    /// Ends the recording; what was recorded stays. Does nothing when it is off.
    static void stop() noexcept;
    static bool isRecording() noexcept;

    /// Writes the scopes that were recorded and have ended, in the JSON format that Perfetto and chrome://tracing read:
    /// one complete event a scope, with its category, colour, thread (numbered from 1) and, in "args", its description
    /// and colour index. Times are microseconds since start(). A recording that is on goes on. Of each thread the first
    /// million scopes are kept; "otherData" counts the ones dropped.
    /// The file is there as a whole or not at all. Throws std::runtime_error, naming the path, when it cannot be
    /// written.
    static void writeTrace(const std::filesystem::path& path);
    /// The same into a stream; what goes wrong is in its state.
    static void writeTrace(std::ostream& stream);
};

} // namespace OpenQuarn
