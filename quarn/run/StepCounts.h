// SPDX-License-Identifier: Apache-2.0
// How far a step is, as it says itself.
#pragma once

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>

namespace quarn {

/// Of 0 in all where the step counts nothing, or not yet.
struct StepCounts {
    std::string what; ///< "epochs"; empty where it does not say
    std::uint64_t done = 0, total = 0;
    std::optional<double> secondsLeft;
};

/// What the step's own file of progress says (ProgressFile), or else the last "N of M" at the end of its log.
StepCounts countsIn(const std::filesystem::path& progress, const std::filesystem::path& log);

/// "epochs 20 of 400, 31 s left"; empty where nothing is counted.
std::string textOf(const StepCounts& counts);

} // namespace quarn
