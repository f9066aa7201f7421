// SPDX-License-Identifier: Apache-2.0
// The files that a scene is made of: its own, and those that its nodes read.
#pragma once

#include "quarn/scene/Setup.h"

#include <filesystem>
#include <string>
#include <vector>

namespace quarn {

struct Warp;
struct WarpGeometry;

/// A file that a node of the scene reads.
struct SceneFile {
    std::string node;
    std::string key;            ///< names it within its node
    std::string name;           ///< as the scene has it
    std::filesystem::path path; ///< absolute; there need be none
};

/// Those of all nodes, in their order; models are left out. Thread: main.
std::vector<SceneFile> sceneFiles();
/// What is in the directory of a geometry's model, by name; nothing where the model is off for good, or has no name.
/// A directory that is not there stands for its files. Thread: main.
std::vector<SceneFile> filesOfModel(const Warp& warp, const WarpGeometry& geometry);

/// Adds each file, by its node and attribute: size and time of change stand for what is in it. Thread: any.
void addFiles(Setup& setup, const std::vector<SceneFile>& files);

/// A sum of what is in the file. Throws std::runtime_error when it cannot be read. Thread: any.
std::string sumOfFile(const std::filesystem::path& path);

} // namespace quarn
