// SPDX-License-Identifier: Apache-2.0
// A file that says what a run is asked for.
#pragma once

#include "quarn/run/RunSettings.h"

#include <functional>

namespace quarn {

/// Reads a JSON object whose keys are the flags of `quarn run` without their dashes, and "character". A path in it
/// counts from its folder. Settings for which `isGiven` answers true stay as they are: flags come before a recipe.
/// Throws std::runtime_error, naming the file, the key and the value, for what is no recipe; for a "target-command"
/// unless `allowCommands`.
void readRecipe(const std::filesystem::path& file, RunSettings& settings,
                const std::function<bool(const std::string& name)>& isGiven, bool allowCommands);

} // namespace quarn
