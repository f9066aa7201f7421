// SPDX-License-Identifier: Apache-2.0
// The files that a scene is made of: its own, and those that its nodes read.
#pragma once

#include "quarn/scene/Setup.h"

#include <filesystem>
#include <string>

namespace quarn {

/// A sum of what is in the file. Throws std::runtime_error when it cannot be read. Thread: any.
std::string sumOfFile(const std::filesystem::path& path);

/// Which of the files that nodes read a set-up names.
enum class ReadFiles {
    withoutModels, // a training data set has no part of a model in it
    all
};

/// Adds each file that the open scene reads, by its node and attribute: size and time of change stand for what is in
/// it. Thread: main.
void addSceneFiles(Setup& setup, ReadFiles which);

} // namespace quarn
