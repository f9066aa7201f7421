// SPDX-License-Identifier: Apache-2.0
// Caches whose vertices are those of the character's file, of which the scene's mesh has some joined.
#pragma once

#include "quarn/console/Console.h"

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <vector>

namespace quarn {

/// Throws std::runtime_error, with both numbers, unless the map has `fileVertices` entries that are each below
/// `sceneVertices` and cover all of them.
void requireFit(const std::vector<std::int32_t>& map, std::size_t fileVertices, std::size_t sceneVertices);

/// Writes the cache at `from` as one of `sceneVertices` vertices to `to`, as a whole or not at all. Where several
/// vertices of the file are one of the scene, the first is taken; returns the largest distance of another from it, in
/// the unit of the cache, over all frames (infinite when a position is no number). The map must fit: see requireFit().
/// Throws std::runtime_error when a file cannot be read or written, and Interrupted. Memory does not grow with frames.
double writeInSceneOrder(const std::filesystem::path& from, const std::filesystem::path& to,
                         const std::vector<std::int32_t>& map, std::size_t sceneVertices, const Console& console);

} // namespace quarn
