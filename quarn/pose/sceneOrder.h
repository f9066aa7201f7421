// SPDX-License-Identifier: Apache-2.0
// Caches whose vertices are those of the character's file, of which the scene's mesh has some joined.
#pragma once

#include "quarn/console/Console.h"

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <vector>

namespace quarn {

class SceneFrames;

/// Throws std::runtime_error, with both numbers, unless the map has `fileVertices` entries that are each below
/// `sceneVertices` and cover all of them.
void requireFit(const std::vector<std::int32_t>& map, std::size_t fileVertices, std::size_t sceneVertices);

/// Writes all frames to `to`, an .npy, as a whole or not at all. Throws std::runtime_error when a file cannot be read
/// or written, naming frame and vertex for a position that is no finite number, and Interrupted.
void writeSceneFrames(SceneFrames& frames, const std::filesystem::path& to, const Console& console);

} // namespace quarn
