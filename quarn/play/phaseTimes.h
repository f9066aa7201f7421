// SPDX-License-Identifier: Apache-2.0
// The phases of a recording, read back from its trace.
#pragma once

#include <filesystem>
#include <map>
#include <string>
#include <vector>

namespace quarn {

/// Ends the recording and writes it to `path`, as a whole or not at all. Returns the durations of the deformer's scopes
/// in seconds, by name, in the order in which they were recorded. Throws std::runtime_error that names the path.
/// Thread: main.
std::map<std::string, std::vector<double>> writeTraceAndReadPhases(const std::filesystem::path& path);

} // namespace quarn
