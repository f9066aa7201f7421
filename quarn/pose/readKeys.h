// SPDX-License-Identifier: Apache-2.0
// Poses made by hand: a JSON file with keys of plugs. docs/poses.md describes it.
#pragma once

#include "quarn/pose/poseKeys.h"

#include <filesystem>
#include <string>

namespace quarn {

struct PlugKeys {
    HPlug plug;
    PoseKeys keys;
};

/// Reads a text and finds its plugs in the scene; values are in the unit of the plugs afterwards. `name` what errors
/// call the text. Throws std::runtime_error, naming member, plug and key, for anything that is not as described: no
/// JSON, unknown members, unknown or unusable plugs, plugs that are there twice, frames that do not ascend, numbers
/// that are not finite or frames beyond 100 000 000. Thread: main.
std::vector<PlugKeys> parseKeys(const std::string& text, const std::string& name);

/// The same for a file.
std::vector<PlugKeys> readKeys(const std::filesystem::path& file);

} // namespace quarn
